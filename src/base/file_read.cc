#include "base/file_read.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

void free_file_bytes(FileBytes *bytes) {
    free(bytes->data);
    bytes->data = nullptr;
    bytes->length = 0;
}

static bool is_absent_error(int error) { return error == ENOENT || error == ENOTDIR; }

// Reads to the end of `fd` into bytes; false (errno set) on any error.
static bool read_to_end(int fd, size_t size_hint, FileBytes *bytes) {
    size_t capacity = size_hint + 1 > 4096 ? size_hint + 1 : 4096;
    char *data = static_cast<char *>(malloc(capacity + 1));
    if (data == nullptr) return false;
    size_t length = 0;
    for (;;) {
        if (length == capacity) {
            char *grown = static_cast<char *>(realloc(data, 2 * capacity + 1));
            if (grown == nullptr) {
                free(data);
                errno = ENOMEM;
                return false;
            }
            data = grown;
            capacity *= 2;
        }
        ssize_t got = read(fd, data + length, capacity - length);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) {
            int error = errno;
            free(data);
            errno = error;
            return false;
        }
        if (got == 0) break;
        length += static_cast<size_t>(got);
    }
    data[length] = '\0';
    bytes->data = data;
    bytes->length = length;
    return true;
}

static FileState read_open_file(int fd, FileBytes *bytes, int flags) {
    struct stat status;
    FileState state = FileState::failed;
    if (fstat(fd, &status) != 0) {
    } else if (!S_ISREG(status.st_mode)) {
        state = FileState::not_regular;
    } else if ((flags & READ_LOCKED) != 0 && flock(fd, LOCK_EX) != 0) {
    } else if (read_to_end(fd, static_cast<size_t>(status.st_size), bytes)) {
        state = FileState::read;
    }
    int error = errno;
    // Closing a file only read loses nothing, but a failure still says the
    // system is in trouble.
    if (close(fd) != 0 && state == FileState::read) {
        error = errno;
        free_file_bytes(bytes);
        state = FileState::failed;
    }
    errno = error;
    return state;
}

FileState read_whole_file_at(int dir_fd, const char *name, FileBytes *bytes, int flags) {
    free_file_bytes(bytes);
    int open_flags = O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY;
    if ((flags & READ_NO_LINK) != 0) open_flags |= O_NOFOLLOW;
    int fd = openat(dir_fd, name, open_flags);
    if (fd == -1) {
        if (is_absent_error(errno)) return FileState::absent;
        if (errno == ELOOP && (flags & READ_NO_LINK) != 0) return FileState::not_regular;
        return FileState::failed;
    }
    return read_open_file(fd, bytes, flags);
}

FileState read_whole_file(const char *path, FileBytes *bytes, int flags) {
    return read_whole_file_at(AT_FDCWD, path, bytes, flags);
}

int path_exists(const char *path) {
    struct stat status;
    if (stat(path, &status) == 0) return 1;
    if (is_absent_error(errno) || errno == ELOOP || errno == ENAMETOOLONG) return 0;
    return -1;
}

bool file_holds(const char *path, const char *data, size_t length) {
    int fd = open(path, O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY | O_NOFOLLOW);
    if (fd == -1) return false;
    struct stat status;
    bool same = fstat(fd, &status) == 0 && S_ISREG(status.st_mode) && static_cast<size_t>(status.st_size) == length;
    char piece[65536];
    size_t compared = 0;
    while (same && compared < length) {
        ssize_t got = read(fd, piece, sizeof piece);
        if (got < 0 && errno == EINTR) continue;
        same = got > 0 && static_cast<size_t>(got) <= length - compared && memcmp(piece, data + compared, static_cast<size_t>(got)) == 0;
        if (same) compared += static_cast<size_t>(got);
    }
    if (same) {  // nothing past the size it had
        ssize_t got;
        do got = read(fd, piece, 1); while (got < 0 && errno == EINTR);
        same = got == 0;
    }
    close(fd);
    return same;
}
