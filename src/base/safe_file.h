// Files the tool writes under /tmp. The directory is writable by others, so a
// symbolic link planted at one of our names must make the open fail rather
// than redirect the write.
#ifndef DAVSYNC_BASE_SAFE_FILE_H
#define DAVSYNC_BASE_SAFE_FILE_H

#include <cstdio>
#include <sys/types.h>

// open(2) with O_NOFOLLOW added; -1 on failure (a link in place included).
int open_no_follow(const char *path, int flags, mode_t mode);
// fopen(3) modes "r", "w", "w+", "a" over open_no_follow; new files get 0644
// before the umask. Null on failure.
FILE *fopen_no_follow(const char *path, const char *mode);

#endif
