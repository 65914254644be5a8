// What every fuzz target shares: a failed check that libFuzzer reports as a
// crash, and the input as a text or as a file in this process's scratch
// folder (removed at exit).
#ifndef DAVSYNC_FUZZ_INPUT_H
#define DAVSYNC_FUZZ_INPUT_H

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <string>

#define FUZZ_CHECK(condition) \
    ((condition) ? (void)0 : (fprintf(stderr, "check failed: %s\n", #condition), abort()))

// Up to the first NUL, as the tool's texts are.
inline std::string input_text(const uint8_t *data, size_t size) {
    return std::string(reinterpret_cast<const char *>(data), strnlen((const char *)data, size));
}

inline const char *scratch_folder() {
    static char folder[] = "/tmp/davsync-fuzz.XXXXXX";
    static bool made = mkdtemp(folder) && atexit([] { std::filesystem::remove_all(folder); }) == 0;
    if (!made) abort();
    return folder;
}

// Writes the input to `name` below the scratch folder; returns its path.
inline std::string write_input(const std::string &name, const uint8_t *data, size_t size) {
    std::filesystem::path path = std::filesystem::path(scratch_folder()) / name;
    std::filesystem::create_directories(path.parent_path());
    FILE *file = fopen(path.c_str(), "w");
    if (file == nullptr || fwrite(data, 1, size, file) != size || fclose(file) != 0) abort();
    return path.string();
}

#endif
