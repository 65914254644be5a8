// Files the tool writes. /tmp is writable by every user and a USB volume
// belongs to whoever plugged it in, so nothing planted there (a link, a FIFO,
// a folder, another user's file) may be followed or used, and a file that
// replaces another only appears once it is complete.
#ifndef DAVSYNC_BASE_SAFE_FILE_H
#define DAVSYNC_BASE_SAFE_FILE_H

#include <cstddef>
#include <cstdio>
#include <sys/types.h>

// open(2) that never follows a link at the last step, never blocks on a FIFO
// and gives -1 unless the result is a regular file owned by this process's
// user. The descriptor is blocking again when returned.
[[nodiscard]] int open_own_regular(const char *path, int flags, mode_t mode);
// Same, relative to the directory `dir_fd`.
[[nodiscard]] int open_own_regular_at(int dir_fd, const char *name, int flags, mode_t mode);
// Creates the file or updates its times, like touch(1), with the checks above.
int touch_own_file(const char *path);

// Replaces `path` by a file holding `length` bytes of `data`: written to a
// new hidden file beside it, synced (unless below /tmp), then renamed over it. -1 when any step
// fails; the old file is then untouched.
[[nodiscard]] int replace_file(const char *path, const char *data, size_t length, mode_t mode);
// The same in steps, for a caller that writes a stream or has work to do
// before the rename: open, write, close (flushed and synced; -1 and
// abandoned when anything failed), then commit or abandon.
struct Replacement {
    char temporary[4096];
    const char *path;
};
[[nodiscard]] FILE *replacement_open(Replacement *replacement, const char *path);
[[nodiscard]] int replacement_close(Replacement *replacement, FILE *file, mode_t mode);
[[nodiscard]] int replacement_write(Replacement *replacement, const char *path, const char *data,
                                    size_t length, mode_t mode);
[[nodiscard]] int replacement_commit(Replacement *replacement);
void replacement_abandon(Replacement *replacement);

// Removes what a killed run left of its temporary files and folders in
// `dir`: this user's entries named `prefix` and six more characters (a
// folder with the files in it). Only for callers that hold the node lock.
void remove_stale_temporaries(const char *dir, const char *prefix);
// The same for the temporary files of replace_file and replacement_write.
void remove_stale_replacements(const char *path);

// An O_PATH descriptor of the directory `path`, resolved component by
// component without following any link; "." and ".." are refused. -1 on
// failure.
[[nodiscard]] int open_dir_no_links(const char *path);

// A system file read under an exclusive flock, as its other users expect.
// Null when it cannot be opened or locked.
FILE *open_locked_for_reading(const char *path);
void close_locked(FILE *file);

// A stream into memory for a file built whole before it is written, so that
// every write failure shows once, at the end.
struct MemoryFile {
    FILE *stream;
    char *text;
    size_t length;
};
[[nodiscard]] int memory_file_open(MemoryFile *file);
// Closes the stream; 0 when everything written is in file->text.
[[nodiscard]] int memory_file_close(MemoryFile *file);
void memory_file_free(MemoryFile *file);

#endif
