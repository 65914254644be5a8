#include "base/safe_file.h"

#include <cstring>
#include <fcntl.h>
#include <unistd.h>

int open_no_follow(const char *path, int flags, mode_t mode) {
    return open(path, flags | O_NOFOLLOW | O_CLOEXEC, mode);
}

static int open_flags_for(const char *mode) {
    bool update = strchr(mode, '+') != nullptr;
    switch (mode[0]) {
    case 'r': return update ? O_RDWR : O_RDONLY;
    case 'w': return (update ? O_RDWR : O_WRONLY) | O_CREAT | O_TRUNC;
    case 'a': return (update ? O_RDWR : O_WRONLY) | O_CREAT | O_APPEND;
    default: return -1;
    }
}

FILE *fopen_no_follow(const char *path, const char *mode) {
    int flags = open_flags_for(mode);
    if (flags == -1) return nullptr;
    int fd = open_no_follow(path, flags, 0644);
    if (fd == -1) return nullptr;
    FILE *file = fdopen(fd, mode);
    if (file == nullptr) close(fd);
    return file;
}
