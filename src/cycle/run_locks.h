// Run marks. The node lock (a waiting fcntl write lock on /tmp/corvane.node)
// is the only mutual exclusion between runs, and a run changes nothing
// without it. The start-lock file /tmp/corvane_start_lock only delays start
// and chg by two seconds. Both live in /tmp, which every user can write:
// whatever is planted at their names is cleared (nothing in it followed) and
// told, never used.
#ifndef DAVSYNC_CYCLE_RUN_LOCKS_H
#define DAVSYNC_CYCLE_RUN_LOCKS_H

#include "base/diagnostics.h"

// Blocks until this run holds the node lock and returns the descriptor; -1
// with the failure noted when the lock cannot be had (the run must then stop).
[[nodiscard]] int lock_node_file(const char *command, RunFailure *failure);
// Removes the lock file while still holding the lock, then unlocks and
// closes. A descriptor of -1 (no lock held) does nothing.
void unlock_node_file(int fd, const char *command);
// Sleeps two seconds when the start-lock file exists, then creates it or
// updates its times. A mark that cannot be made only loses the delay; it is
// told.
void start_lock_wait_and_mark(const char *command);
void start_lock_clear(const char *command);

#endif
