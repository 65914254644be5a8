// Inputs read whole before anything is decided from them. What a reader sees
// is one of three states of the data (the file is there and was read whole,
// there is no file, or something that is no regular file stands at its name)
// or a failure of the system; a failure is never taken for "empty" or "off".
#ifndef DAVSYNC_BASE_FILE_READ_H
#define DAVSYNC_BASE_FILE_READ_H

#include <cstddef>

enum class FileState { read, absent, not_regular, failed };

struct FileBytes {
    char *data;     // `length` bytes and a terminating NUL; null until read
    size_t length;
};

enum FileReadFlags {
    READ_PLAIN = 0,
    // The last step of the path is never followed if it is a link: for files
    // in places other users can write.
    READ_NO_LINK = 1,
    // Held under an exclusive flock while it is read, as its writers expect.
    READ_LOCKED = 2,
};

// Reads `path` into `bytes` (freed first). absent: ENOENT or ENOTDIR;
// not_regular: a folder, FIFO, device or (READ_NO_LINK) link; failed: any
// other error, with errno set and `bytes` empty. A FIFO is never waited on.
FileState read_whole_file(const char *path, FileBytes *bytes, int flags);
// The same for `name` in the directory `dir_fd`.
FileState read_whole_file_at(int dir_fd, const char *name, FileBytes *bytes, int flags);
void free_file_bytes(FileBytes *bytes);

// Whether `path` is a regular file (its last step not a link) holding
// exactly `length` bytes equal to `data`. Compared piece by piece, so that a
// large file is never held twice; any failure answers false.
bool file_holds(const char *path, const char *data, size_t length);

// Whether `path` names something: 1 yes, 0 no (ENOENT, ENOTDIR, ELOOP,
// ENAMETOOLONG: states of the data), -1 when the system could not tell
// (errno set). Links are followed.
int path_exists(const char *path);

#endif
