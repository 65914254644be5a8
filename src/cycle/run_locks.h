// Run marks. The node lock (a waiting fcntl write lock on /tmp/corvane.node)
// is the only mutual exclusion between runs; the start-lock file
// /tmp/corvane_start_lock only delays start and chg by two seconds. Both
// live in /tmp, so something planted at their names is never used.
#ifndef DAVSYNC_CYCLE_RUN_LOCKS_H
#define DAVSYNC_CYCLE_RUN_LOCKS_H

// Blocks until this run holds the node lock and returns the descriptor.
// Something planted at the name (a link, a FIFO, another user's file) is
// removed and the file made anew. -1 when no lock could be had: the file
// cannot be made, or the lock call failed; the run then goes on unlocked.
[[nodiscard]] int lock_node_file();
// Removes the lock file while still holding the lock, then unlocks and closes.
void unlock_node_file(int fd);
// Sleeps two seconds when the start-lock file exists, then creates it or
// updates its times.
void start_lock_wait_and_mark();
void start_lock_clear();

#endif
