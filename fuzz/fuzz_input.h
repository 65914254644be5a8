// What every fuzz target shares: a failed check that libFuzzer reports as a
// crash, and the input as a text.
#ifndef DAVSYNC_FUZZ_INPUT_H
#define DAVSYNC_FUZZ_INPUT_H

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#define FUZZ_CHECK(condition) \
    ((condition) ? (void)0 : (fprintf(stderr, "check failed: %s\n", #condition), abort()))

// Up to the first NUL, as the tool's texts are.
inline std::string input_text(const uint8_t *data, size_t size) {
    return std::string(reinterpret_cast<const char *>(data), strnlen((const char *)data, size));
}

#endif
