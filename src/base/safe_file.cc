#include "base/safe_file.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/random.h>
#include <sys/stat.h>
#include <unistd.h>

#include "base/commit_record.h"
#include "base/text_field.h"

static const int NO_SURPRISES = O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;

static int keep_if_own_regular(int fd) {
    if (fd == -1) return -1;
    struct stat status;
    int error = 0;
    if (fstat(fd, &status) != 0) error = errno;
    else if (!S_ISREG(status.st_mode) || status.st_uid != geteuid()) error = EPERM;
    else if (fcntl(fd, F_SETFL, fcntl(fd, F_GETFL) & ~O_NONBLOCK) != 0) error = errno;
    if (error == 0) return fd;
    close(fd);
    errno = error;
    return -1;
}

int open_own_regular(const char *path, int flags, mode_t mode) {
    return keep_if_own_regular(open(path, flags | NO_SURPRISES, mode));
}

int open_own_regular_at(int dir_fd, const char *name, int flags, mode_t mode) {
    return keep_if_own_regular(openat(dir_fd, name, flags | NO_SURPRISES, mode));
}

// Closes `fd`; -1 when the close or `result` failed, with the first error.
static int close_keeping(int fd, int result) {
    int error = errno;
    if (close(fd) != 0 && result == 0) return -1;
    errno = error;
    return result;
}

int write_all(int fd, const void *data, size_t length) {
    const char *at = static_cast<const char *>(data);
    while (length > 0) {
        ssize_t put = write(fd, at, length);
        if (put < 0 && errno == EINTR) continue;
        if (put <= 0) {
            if (put == 0) errno = EIO;
            return -1;
        }
        at += put;
        length -= static_cast<size_t>(put);
    }
    return 0;
}

int sync_dir(int dir_fd) {
    int fd = openat(dir_fd, ".", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (fd == -1) return -1;
    return close_keeping(fd, fsync(fd));
}

static int write_synced(int fd, const char *data, size_t length, mode_t mode, bool sync) {
    int result = fchmod(fd, mode) == 0 && write_all(fd, data, length) == 0 &&
                         (!sync || fsync(fd) == 0)
                     ? 0
                     : -1;
    return close_keeping(fd, result);
}

int stage_file(const char *path, const char *data, size_t length, mode_t mode) {
    char staged[4096];
    if (staged_path_of(path, staged, sizeof staged) != 0) return errno = ENAMETOOLONG, -1;
    if (unlink(staged) != 0 && errno != ENOENT) return -1;
    int fd = open(staged, O_WRONLY | O_CREAT | O_EXCL | NO_SURPRISES, mode);
    if (fd == -1) return -1;
    if (write_synced(fd, data, length, mode, true) == 0) return 0;
    int error = errno;
    unlink(staged);
    errno = error;
    return -1;
}

// The folder of `path` ("." for a bare name) and where its name starts.
static int folder_of(const char *path, char (&dir)[4096], const char **name) {
    const char *slash = strrchr(path, '/');
    *name = slash == nullptr ? path : slash + 1;
    if (slash == nullptr) return copy_text(dir, ".");
    return copy_text_prefix(dir, sizeof dir, path, slash == path ? 1 : static_cast<size_t>(slash - path));
}

// /tmp does not outlive a restart, so a file there needs no sync: the rename
// alone keeps readers from a half-written one.
static bool outlives_restart(const char *path) { return strncmp(path, "/tmp/", 5) != 0; }

// An unnamed file in `dir`, or (on a file system without them) a named
// temporary; either is under flock before anyone can see it by name.
static int open_unnamed(const char *dir, char (&named)[4096], const char *name, mode_t mode) {
    named[0] = '\0';
    int fd = open(dir, O_TMPFILE | O_WRONLY | O_CLOEXEC, mode);
    if (fd == -1 && (errno == EOPNOTSUPP || errno == EISDIR)) {
        if (format_text_field(named, sizeof named, "%s/.%s.XXXXXX", dir, name) != 0)
            return errno = ENAMETOOLONG, -1;
        fd = mkostemp(named, O_CLOEXEC);
        if (fd == -1) named[0] = '\0';
    }
    if (fd != -1 && flock(fd, LOCK_EX) != 0) {
        int error = errno;
        if (named[0] != '\0') unlink(named);
        close(fd);
        errno = error;
        return -1;
    }
    return fd;
}

// Gives the unnamed file `fd` the hidden name ".<name>.XXXXXX" in `dir`.
static int link_unnamed(int fd, const char *dir, const char *name, char (&named)[4096]) {
    static const char LETTERS[] = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789";
    char proc_path[64];
    format_text_field(proc_path, sizeof proc_path, "/proc/self/fd/%d", fd);
    for (int attempt = 0; attempt < 100; ++attempt) {
        unsigned char noise[6];
        if (getrandom(noise, sizeof noise, 0) != sizeof noise) return -1;
        char suffix[7] = {};
        for (size_t i = 0; i < sizeof noise; ++i) suffix[i] = LETTERS[noise[i] % (sizeof LETTERS - 1)];
        if (format_text_field(named, sizeof named, "%s/.%s.%s", dir, name, suffix) != 0)
            return errno = ENAMETOOLONG, -1;
        if (linkat(fd, "", AT_FDCWD, named, AT_EMPTY_PATH) == 0) return 0;
        // Linking by descriptor needs a capability; through /proc it does not.
        if ((errno == ENOENT || errno == EPERM) &&
            linkat(AT_FDCWD, proc_path, AT_FDCWD, named, AT_SYMLINK_FOLLOW) == 0)
            return 0;
        if (errno != EEXIST) return -1;
    }
    return errno = EEXIST, -1;
}

int replace_file(const char *path, const char *data, size_t length, mode_t mode) {
    char dir[4096];
    const char *name;
    char named[4096];
    if (folder_of(path, dir, &name) != 0) return errno = ENAMETOOLONG, -1;
    int fd = open_unnamed(dir, named, name, mode);
    if (fd == -1) return -1;
    bool whole = fchmod(fd, mode) == 0 && write_all(fd, data, length) == 0 &&
                 (!outlives_restart(path) || fsync(fd) == 0) &&
                 (named[0] != '\0' || link_unnamed(fd, dir, name, named) == 0) &&
                 rename(named, path) == 0;
    int error = errno;
    if (!whole && named[0] != '\0') unlink(named);
    // The lock goes with the last descriptor, after the rename.
    if (close(fd) != 0 && whole) return -1;
    errno = error;
    return whole ? 0 : -1;
}

static bool is_temporary_name(const char *name, const char *prefix) {
    size_t length = strlen(prefix);
    return strncmp(name, prefix, length) == 0 && strlen(name) == length + 6;
}

// Whether nobody holds `name`: a live writer keeps a flock on its file.
static bool is_abandoned(int dir_fd, const char *name) {
    int fd = openat(dir_fd, name, O_RDONLY | NO_SURPRISES);
    if (fd == -1) return false;
    bool free = flock(fd, LOCK_EX | LOCK_NB) == 0;
    close(fd);
    return free;
}

int remove_stale_temporaries(const char *dir, const char *const *prefixes, int count) {
    DIR *listing = opendir(dir);
    if (listing == nullptr) return errno == ENOENT || errno == ENOTDIR ? 0 : -1;
    int dir_fd = dirfd(listing);
    int removed = 0;
    for (;;) {
        errno = 0;
        const struct dirent *entry = readdir(listing);
        if (entry == nullptr) break;
        bool named = false;
        for (int i = 0; i < count && !named; ++i) named = is_temporary_name(entry->d_name, prefixes[i]);
        struct stat status;
        if (!named || fstatat(dir_fd, entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0 ||
            status.st_uid != geteuid() || !(S_ISDIR(status.st_mode) || S_ISREG(status.st_mode)) ||
            !is_abandoned(dir_fd, entry->d_name))
            continue;
        if (remove_tree_at(dir_fd, entry->d_name) == 0) ++removed;
    }
    int error = errno;
    closedir(listing);
    errno = error;
    return error != 0 ? -1 : removed;
}

int remove_tree_at(int dir_fd, const char *name) {
    if (unlinkat(dir_fd, name, 0) == 0) return 0;
    if (errno != EISDIR && errno != EPERM) return -1;
    int fd = openat(dir_fd, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    DIR *folder = fd == -1 ? nullptr : fdopendir(fd);
    if (folder == nullptr) {
        if (fd != -1) close(fd);
        return -1;
    }
    // What cannot be removed inside shows when the folder itself cannot be.
    while (const struct dirent *entry = readdir(folder))
        if (strcmp(entry->d_name, ".") != 0 && strcmp(entry->d_name, "..") != 0)
            remove_tree_at(dirfd(folder), entry->d_name);
    closedir(folder);
    return unlinkat(dir_fd, name, AT_REMOVEDIR);
}

int open_dir_no_links(const char *path) {
    if (path[0] != '/') return errno = EINVAL, -1;
    int dir_fd = open("/", O_PATH | O_DIRECTORY | O_CLOEXEC);
    for (const char *at = path + 1; dir_fd != -1 && *at != '\0';) {
        size_t length = strcspn(at, "/");
        char name[256];
        if (copy_text_prefix(name, sizeof name, at, length) != 0 || strcmp(name, ".") == 0 ||
            strcmp(name, "..") == 0) {
            close(dir_fd);
            return errno = EINVAL, -1;
        }
        at += length;
        while (*at == '/') ++at;
        if (name[0] == '\0') continue;
        int next = openat(dir_fd, name, O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
        int error = errno;
        struct stat status;
        if (next == -1 && error == ENOTDIR &&
            fstatat(dir_fd, name, &status, AT_SYMLINK_NOFOLLOW) == 0 && S_ISLNK(status.st_mode))
            error = ELOOP;
        close(dir_fd);
        errno = error;
        dir_fd = next;
    }
    return dir_fd;
}

bool is_not_reachable(int error) {
    return error == ENOENT || error == ENOTDIR || error == ELOOP || error == EINVAL;
}
