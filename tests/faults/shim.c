// Preloaded into one davsync run: counts the calls through which a file
// operation can fail and makes the k-th fail or kills the process there.
//   DAVSYNC_FAULT=count    every call is reported, "call K NAME", on stderr
//   DAVSYNC_FAULT=K:ERRNO  the K-th call fails with ERRNO ("fault K NAME")
//   DAVSYNC_FAULT=K:kill   SIGKILL just before the K-th call ("kill K NAME")
//   DAVSYNC_FAULT=short    nothing fails, but every read and write moves at
//                          most 3 bytes, as a pipe or a proc file may
// Only the first process counts; the shells it starts do not see the shim.
#define _GNU_SOURCE
#include <dirent.h>
#include <dlfcn.h>
#include <errno.h>
#include <fcntl.h>
#include <mntent.h>
#include <signal.h>
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/syscall.h>
#include <unistd.h>

static long target, counted;
static int fault_errno, kill_at, report_all, short_io;
static pid_t own_pid;

__attribute__((constructor)) static void setup(void) {
    const char *setting = getenv("DAVSYNC_FAULT");
    own_pid = (pid_t)syscall(SYS_getpid);
    if (setting != NULL) {
        char *rest;
        report_all = strcmp(setting, "count") == 0;
        short_io = strcmp(setting, "short") == 0;
        target = strtol(setting, &rest, 10);
        if (*rest == ':') kill_at = strcmp(rest + 1, "kill") == 0, fault_errno = atoi(rest + 1);
    }
    unsetenv("LD_PRELOAD");
    unsetenv("DAVSYNC_FAULT");
}

static void say(const char *what, const char *name) {
    char line[128];
    int length = snprintf(line, sizeof line, "%s %ld %s\n", what, counted, name);
    if (length > 0) syscall(SYS_write, 2, line, (size_t)length < sizeof line ? (size_t)length : sizeof line - 1);
}

// True when this call is to fail; errno is set then.
static int strikes(const char *name) {
    if ((pid_t)syscall(SYS_getpid) != own_pid) return 0;
    ++counted;
    if (report_all) say("call", name);
    if (counted != target) return 0;
    if (kill_at) say("kill", name), syscall(SYS_kill, own_pid, SIGKILL);
    say("fault", name);
    errno = fault_errno;
    return 1;
}

static size_t cut(size_t size) { return short_io && size > 3 && (pid_t)syscall(SYS_getpid) == own_pid ? 3 : size; }

#define REAL(name) static __typeof__(name) *real; if (!real) real = (__typeof__(name) *)dlsym(RTLD_NEXT, #name)

// A call that fails without taking effect.
#define FAILS(ret, name, params, args, failed) \
    ret name params { REAL(name); return strikes(#name) ? failed : real args; }
// A call whose effect takes place although it reports failure (close releases the descriptor).
#define FAILS_AFTER(ret, name, params, args, failed) \
    ret name params { REAL(name); if (strikes(#name)) { real args; return failed; } return real args; }

#define MODE_ARG(flags) mode_t mode = 0; \
    if ((flags) & (O_CREAT | O_TMPFILE)) { va_list list; va_start(list, flags); mode = va_arg(list, mode_t); va_end(list); }
#define OPEN(name) int name(const char *path, int flags, ...) { \
    MODE_ARG(flags) REAL(name); return strikes(#name) ? -1 : real(path, flags, mode); }
#define OPENAT(name) int name(int dir, const char *path, int flags, ...) { \
    MODE_ARG(flags) REAL(name); return strikes(#name) ? -1 : real(dir, path, flags, mode); }
OPEN(open) OPEN(open64) OPENAT(openat) OPENAT(openat64)
FAILS(int, __open_2, (const char *path, int flags), (path, flags), -1)
FAILS(int, __open64_2, (const char *path, int flags), (path, flags), -1)
FAILS(int, __openat_2, (int dir, const char *path, int flags), (dir, path, flags), -1)
FAILS(int, __openat64_2, (int dir, const char *path, int flags), (dir, path, flags), -1)
FAILS(FILE *, fopen, (const char *path, const char *mode), (path, mode), NULL)
FAILS(FILE *, fopen64, (const char *path, const char *mode), (path, mode), NULL)
FAILS(DIR *, opendir, (const char *path), (path), NULL)
FAILS(DIR *, fdopendir, (int fd), (fd), NULL)
FAILS(ssize_t, read, (int fd, void *buffer, size_t size), (fd, buffer, cut(size)), -1)
FAILS(ssize_t, __read_chk, (int fd, void *buffer, size_t size, size_t room), (fd, buffer, cut(size), room), -1)
FAILS(ssize_t, pread, (int fd, void *buffer, size_t size, off_t at), (fd, buffer, cut(size), at), -1)
FAILS(ssize_t, pread64, (int fd, void *buffer, size_t size, off_t at), (fd, buffer, cut(size), at), -1)
FAILS(ssize_t, write, (int fd, const void *buffer, size_t size), (fd, buffer, cut(size)), -1)
FAILS(int, fsync, (int fd), (fd), -1)
FAILS(int, fdatasync, (int fd), (fd), -1)
FAILS_AFTER(int, close, (int fd), (fd), -1)
FAILS(int, fflush, (FILE *file), (file), EOF)
FAILS_AFTER(int, fclose, (FILE *file), (file), EOF)
FAILS(int, rename, (const char *from, const char *to), (from, to), -1)
FAILS(int, renameat, (int from_dir, const char *from, int to_dir, const char *to), (from_dir, from, to_dir, to), -1)
FAILS(int, renameat2, (int from_dir, const char *from, int to_dir, const char *to, unsigned flags),
      (from_dir, from, to_dir, to, flags), -1)
FAILS(int, mkdir, (const char *path, mode_t mode), (path, mode), -1)
FAILS(int, mkdirat, (int dir, const char *path, mode_t mode), (dir, path, mode), -1)
FAILS(char *, mkdtemp, (char *pattern), (pattern), NULL)
FAILS(int, mkstemp, (char *pattern), (pattern), -1)
FAILS(int, mkstemp64, (char *pattern), (pattern), -1)
FAILS(int, mkostemp, (char *pattern, int flags), (pattern, flags), -1)
FAILS(int, mkostemp64, (char *pattern, int flags), (pattern, flags), -1)
FAILS(int, symlink, (const char *target, const char *path), (target, path), -1)
FAILS(int, symlinkat, (const char *target, int dir, const char *path), (target, dir, path), -1)
FAILS(int, linkat, (int from_dir, const char *from, int to_dir, const char *to, int flags),
      (from_dir, from, to_dir, to, flags), -1)
FAILS(int, unlink, (const char *path), (path), -1)
FAILS(int, unlinkat, (int dir, const char *path, int flags), (dir, path, flags), -1)
FAILS(int, rmdir, (const char *path), (path), -1)
FAILS(int, ftruncate, (int fd, off_t size), (fd, size), -1)
FAILS(int, ftruncate64, (int fd, off_t size), (fd, size), -1)
FAILS(int, flock, (int fd, int operation), (fd, operation), -1)
FAILS(int, fchmod, (int fd, mode_t mode), (fd, mode), -1)
FAILS(int, chmod, (const char *path, mode_t mode), (path, mode), -1)
FAILS(ssize_t, readlink, (const char *path, char *buffer, size_t size), (path, buffer, size), -1)
FAILS(ssize_t, readlinkat, (int dir, const char *path, char *buffer, size_t size), (dir, path, buffer, size), -1)

// Stdio and the mount table read through libc's own read: a failed read
// ends the stream with its error flag set, as a real one does.
#define STREAM_READ(ret, name, params, args, file) \
    ret name params { REAL(name); if (strikes(#name)) { (file)->_flags |= _IO_ERR_SEEN; return NULL; } return real args; }
STREAM_READ(char *, fgets, (char *line, int size, FILE *file), (line, size, file), file)
STREAM_READ(struct mntent *, getmntent, (FILE *file), (file), file)
FAILS(FILE *, setmntent, (const char *path, const char *mode), (path, mode), NULL)
FAILS(struct dirent *, readdir, (DIR *folder), (folder), NULL)
FAILS(struct dirent64 *, readdir64, (DIR *folder), (folder), NULL)

// Only the lock commands count.
#define FCNTL(name) int name(int fd, int command, ...) { \
    va_list list; va_start(list, command); void *arg = va_arg(list, void *); va_end(list); \
    REAL(name); \
    int locks = command == F_SETLK || command == F_SETLKW || command == F_OFD_SETLK || command == F_OFD_SETLKW; \
    return locks && strikes(#name) ? -1 : real(fd, command, arg); }
FCNTL(fcntl) FCNTL(fcntl64)
