#include "cycle/run_locks.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"

// A planted object that cannot be removed (a folder) ends the attempts.
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

// Our lock files are always this user's regular files; anything else at
// the name was planted and goes. Our own file is never removed here: another
// run may hold it.
static bool is_planted(const char *path) {
    struct stat status;
    return lstat(path, &status) == 0 &&
           (!S_ISREG(status.st_mode) || status.st_uid != geteuid());
}

static int open_node_lock_file() {
    for (int attempt = 0; attempt < PLANTED_OBJECT_ATTEMPTS; ++attempt) {
        int fd = open_own_regular(NODE_LOCK_FILE, O_RDWR | O_CREAT, 0644);
        if (fd != -1) return fd;
        if (!is_planted(NODE_LOCK_FILE) || unlink(NODE_LOCK_FILE) != 0) return -1;
    }
    return -1;
}

int lock_node_file() {
    for (;;) {
        int fd = open_node_lock_file();
        if (fd == -1) return -1;
        if (set_whole_file_lock(fd, F_WRLCK) == -1) {
            close(fd);
            return -1;
        }
        if (still_named_by_path(fd)) return fd;
        close(fd);
    }
}

void unlock_node_file(int fd) {
    // Unlinking while the lock is still held keeps the file and the lock in step
    // for the runs that wait on it.
    unlink(NODE_LOCK_FILE);
    if (fd == -1) return;
    set_whole_file_lock(fd, F_UNLCK);
    close(fd);
}

void start_lock_wait_and_mark() {
    if (access(START_LOCK_FILE, F_OK) == 0) {
        sleep(1);
        sleep(1);
    }
    touch_own_file(START_LOCK_FILE);
}

void start_lock_clear() { unlink(START_LOCK_FILE); }
