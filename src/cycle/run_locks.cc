#include "cycle/run_locks.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"

// Something planted again as soon as it is cleared ends the attempts.
static const int PLANTED_OBJECT_ATTEMPTS = 3;

static int set_whole_file_lock(int fd, short type) {
    struct flock lock = {};
    lock.l_type = type;
    lock.l_whence = SEEK_SET;
    lock.l_start = 0;
    lock.l_len = 0;
    int result;
    do {
        result = fcntl(fd, F_SETLKW, &lock);
    } while (result == -1 && errno == EINTR);
    return result;
}

// Every release unlinks the file, so a run that waited on the old file may be
// granted a lock on a file nobody else will ever look at again.
static bool still_named_by_path(int fd) {
    struct stat held, named;
    if (fstat(fd, &held) != 0 || lstat(NODE_LOCK_FILE, &named) != 0) return false;
    return held.st_dev == named.st_dev && held.st_ino == named.st_ino;
}

// Our mark files are always this user's regular files; anything else at the
// name was planted and goes, a folder with everything in it (nothing in it
// followed).
static int clear_planted(int tmp_fd, const char *name, const char *command) {
    if (remove_tree_at(tmp_fd, name) != 0) return errno == ENOENT ? 0 : -1;
    log_event(LOG_WARNING, "%s: cleared what another user planted at /tmp/%s", command, name);
    return 0;
}

// Makes the mark file, clearing what was planted at its name. Runs do this
// one at a time (under a flock on /tmp itself), so that no run ever clears a
// mark file another has just made.
static int make_mark_file(const char *path, int flags, const char *command) {
    int tmp_fd = open("/tmp", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (tmp_fd == -1) return -1;
    int fd = -1;
    if (flock(tmp_fd, LOCK_EX) == 0) {
        const char *name = path + sizeof "/tmp";
        for (int attempt = 0; attempt < PLANTED_OBJECT_ATTEMPTS && fd == -1; ++attempt) {
            fd = open_own_regular(path, flags | O_CREAT, 0644);
            if (fd == -1 && (errno == EIO || errno == ENOSPC || clear_planted(tmp_fd, name, command) != 0)) break;
        }
    }
    int error = errno;
    close(tmp_fd);  // and with it the flock
    errno = error;
    return fd;
}

// The mark file as it is, or made anew.
static int open_mark_file(const char *path, int flags, const char *command) {
    int fd = open_own_regular(path, flags, 0);
    return fd != -1 ? fd : make_mark_file(path, flags, command);
}

int lock_node_file(const char *command, RunFailure *failure) {
    for (;;) {
        int fd = open_mark_file(NODE_LOCK_FILE, O_RDWR, command);
        if (fd == -1) return note_failure(failure, "cannot take the run lock", NODE_LOCK_FILE, errno);
        if (set_whole_file_lock(fd, F_WRLCK) == -1) {
            int error = errno;
            close(fd);
            return note_failure(failure, "cannot take the run lock", NODE_LOCK_FILE, error);
        }
        if (still_named_by_path(fd)) return fd;
        close(fd);
    }
}

void unlock_node_file(int fd, const char *command) {
    if (fd == -1) return;
    // Unlinking while the lock is still held keeps the file and the lock in step
    // for the runs that wait on it.
    if (unlink(NODE_LOCK_FILE) != 0) log_event(LOG_WARNING, "%s: cannot remove %s: %m", command, NODE_LOCK_FILE);
    set_whole_file_lock(fd, F_UNLCK);
    close(fd);
}

void start_lock_wait_and_mark(const char *command) {
    if (access(START_LOCK_FILE, F_OK) == 0) {
        sleep(1);
        sleep(1);
    }
    int fd = open_mark_file(START_LOCK_FILE, O_WRONLY, command);
    if (fd == -1 || futimens(fd, nullptr) != 0)
        log_event(LOG_WARNING, "%s: cannot mark %s: %m", command, START_LOCK_FILE);
    if (fd != -1) close(fd);
}

void start_lock_clear(const char *command) {
    if (unlink(START_LOCK_FILE) != 0 && errno != ENOENT)
        log_event(LOG_WARNING, "%s: cannot remove %s: %m", command, START_LOCK_FILE);
}
