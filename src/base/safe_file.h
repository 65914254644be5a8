// Files the tool writes. /tmp is writable by every user and a USB volume
// belongs to whoever plugged it in, so nothing planted there (a link, a FIFO,
// a folder, another user's file) is followed or used, and a file that
// replaces another only appears once it is complete. Every write, flush,
// sync and close is checked.
#ifndef DAVSYNC_BASE_SAFE_FILE_H
#define DAVSYNC_BASE_SAFE_FILE_H

#include <cstddef>
#include <sys/types.h>

// open(2) that never follows a link at the last step, never blocks on a FIFO
// and gives -1 unless the result is a regular file owned by this process's
// user (errno EPERM for one that is not). The descriptor is blocking again.
[[nodiscard]] int open_own_regular(const char *path, int flags, mode_t mode);
// Same, relative to the directory `dir_fd`.
[[nodiscard]] int open_own_regular_at(int dir_fd, const char *name, int flags, mode_t mode);

// Writes all `length` bytes, resuming after short writes. 0, or -1 (errno).
int write_all(int fd, const void *data, size_t length);
// fsync(2) of the directory `dir_fd` (which may be an O_PATH descriptor),
// so that a rename in it outlives a crash. 0, or -1 (errno).
int sync_dir(int dir_fd);

// Writes the staged sibling of `path` (see staged_path_of in
// commit_record.h): anything left at that name goes first, then a new file
// is written whole and synced. The folder is the appliance's own, never a
// place other users can write. 0, or -1 (errno) with nothing left behind.
[[nodiscard]] int stage_file(const char *path, const char *data, size_t length, mode_t mode);

// Replaces `path` by a file holding `length` bytes of `data`: written to an
// unnamed file in the same folder (synced unless below /tmp), which gets a
// hidden name ".<name>.XXXXXX" only once complete and is renamed over `path`
// at once. It stays under flock(LOCK_EX) while it has that name, so that
// remove_stale_temporaries never takes a live one. -1 (errno) when any step
// fails; the old file is then untouched.
[[nodiscard]] int replace_file(const char *path, const char *data, size_t length, mode_t mode);
// Removes what killed writers left in `dir`: this user's entries named by
// one of `prefixes` and six more characters (replace_file's hidden names,
// staging folders with the files in them) that nobody holds a flock on.
// Only for callers that hold the node lock. Returns how many it removed, -1
// (errno) when the folder could not be read (a missing one has none).
int remove_stale_temporaries(const char *dir, const char *const *prefixes, int count);

// An O_PATH descriptor of the directory `path`, resolved component by
// component without following any link; "." and ".." are refused. -1
// (errno; ELOOP for a link on the way, EINVAL for a dot name) on failure.
[[nodiscard]] int open_dir_no_links(const char *path);
// Whether open_dir_no_links failed for what stands on the way (nothing
// there, no folder, a link, a dot name) rather than for the system.
bool is_not_reachable(int error);
// Removes whatever is at `name` in `dir_fd`: a folder with everything in it,
// never following a link inside. 0, or -1 (errno).
int remove_tree_at(int dir_fd, const char *name);

#endif
