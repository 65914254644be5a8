// A stream into memory for a file built whole before it is written, so that
// every write failure shows once, at the end. Its buffer grows in place
// where the system can (a large one is remapped, not copied), so a text of
// many megabytes is never held twice while it grows.
#ifndef DAVSYNC_BASE_MEMORY_FILE_H
#define DAVSYNC_BASE_MEMORY_FILE_H

#include <cstddef>
#include <cstdio>

struct MemoryFile {
    FILE *stream;
    char *text;      // `length` bytes and a terminating NUL once closed
    size_t length;
    size_t capacity;
    bool failed;     // memory ran out: what was written since is lost
};
// 0, or -1 when no stream could be made (nothing is then held). The record
// must stay where it is while the stream is open.
[[nodiscard]] int memory_file_open(MemoryFile *file);
// Closes the stream; 0 when everything written is in file->text.
[[nodiscard]] int memory_file_close(MemoryFile *file);
void memory_file_free(MemoryFile *file);

#endif
