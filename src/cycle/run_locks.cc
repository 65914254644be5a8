#include "cycle/run_locks.h"

#include <cerrno>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "base/safe_file.h"
#include "base/shell_command.h"

static const char NODE_LOCK_FILE[] = "/tmp/corvane.node";
static const char START_LOCK_FILE[] = "/tmp/corvane_start_lock";

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
    if (fstat(fd, &held) != 0 || stat(NODE_LOCK_FILE, &named) != 0) return false;
    return held.st_dev == named.st_dev && held.st_ino == named.st_ino;
}

int lock_node_file() {
    for (;;) {
        int fd = open_no_follow(NODE_LOCK_FILE, O_RDWR | O_CREAT, 0644);
        if (fd == -1) return -1;
        if (set_whole_file_lock(fd, F_WRLCK) == -1) return fd;
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
    run_shell_command("touch /tmp/corvane_start_lock");
}

void start_lock_clear() { unlink(START_LOCK_FILE); }
