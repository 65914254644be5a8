#include "base/memory_file.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <sys/types.h>

// Room for `more` bytes and a NUL.
static bool make_room(MemoryFile *file, size_t more) {
    if (more < file->capacity - file->length) return true;
    size_t capacity = file->capacity < 4096 ? 4096 : file->capacity;
    while (more >= capacity - file->length) {
        if (capacity > SIZE_MAX / 2) return false;
        capacity *= 2;
    }
    char *grown = static_cast<char *>(realloc(file->text, capacity));
    if (grown == nullptr) return false;
    file->text = grown;
    file->capacity = capacity;
    return true;
}

static ssize_t write_to_memory(void *cookie, const char *data, size_t size) {
    MemoryFile *file = static_cast<MemoryFile *>(cookie);
    if (file->failed || !make_room(file, size)) {
        file->failed = true;
        return -1;
    }
    memcpy(file->text + file->length, data, size);
    file->length += size;
    file->text[file->length] = '\0';
    return static_cast<ssize_t>(size);
}

int memory_file_open(MemoryFile *file) {
    *file = MemoryFile{};
    if (!make_room(file, 0)) return -1;
    file->text[0] = '\0';
    cookie_io_functions_t functions = {nullptr, write_to_memory, nullptr, nullptr};
    file->stream = fopencookie(file, "w", functions);
    if (file->stream != nullptr) return 0;
    memory_file_free(file);
    return -1;
}

int memory_file_close(MemoryFile *file) {
    if (file->stream == nullptr) return -1;
    bool failed = ferror(file->stream) != 0;
    failed = fclose(file->stream) != 0 || failed || file->failed;
    file->stream = nullptr;
    return failed ? -1 : 0;
}

void memory_file_free(MemoryFile *file) {
    if (file->stream != nullptr) fclose(file->stream);
    free(file->text);
    *file = MemoryFile{};
}
