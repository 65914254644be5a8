// One change to files on several volumes, made whole or not at all, like a
// redo log. The run first stages every new file beside its place under the
// name staged_path_of() gives (hidden, synced), then commit_change_set()
// writes the record of the change (the list of what becomes real, synced and
// renamed into place: the commit point), applies it in order and removes the
// record. A run killed before the record exists leaves only staged files,
// which the next run discards; one killed after it leaves the record, which
// the next run rolls forward: every step is idempotent (a staged file that is
// gone was renamed already; a marker removed already is not there). Only runs
// that hold the node lock may call these.
#ifndef DAVSYNC_BASE_COMMIT_RECORD_H
#define DAVSYNC_BASE_COMMIT_RECORD_H

#include <cstddef>

#include "base/diagnostics.h"

enum ChangeKind : char {
    CHANGE_REPLACE = 'R',  // the staged sibling of path is renamed over it
    // The same two in a folder of whoever plugged a USB volume in: no link on
    // the way is followed, and what a user put in the way (a folder, a link)
    // is told and passed over rather than failing the change for good.
    CHANGE_MARK = 'M',     // as CHANGE_REPLACE
    CHANGE_UNMARK = 'U',   // path is removed
};

struct ChangeStep {
    char kind;
    char path[4096];
    ChangeStep *next;
};

struct ChangeSet {
    ChangeStep *first;
    ChangeStep *last;
    int count;
};

// "<dir>/.<name>.davsync" beside "<dir>/<name>" (a name that starts with a
// dot keeps its one dot). -1 when it does not fit `width`.
int staged_path_of(const char *path, char *staged, size_t width);
// Appends a step. 0, or -1 when memory runs out or the path is too long.
[[nodiscard]] int change_set_add(ChangeSet *set, char kind, const char *path);
void change_set_free(ChangeSet *set);

// Records the change, applies it and removes the record. 0, or -1 with the
// failure noted. `*committed` tells whether the record was written: if not,
// nothing has changed (the caller discards what it staged); if so, the
// record stays after a failure for the next run to roll forward.
// What is passed over is logged under `command`.
int commit_change_set(const ChangeSet *set, const char *command, RunFailure *failure, bool *committed);
// Rolls forward the change an interrupted run recorded, if any, and logs it.
// 0 when there was none or it is done; -1 with the failure noted (the record
// stays).
int roll_forward_recorded_change(const char *command, RunFailure *failure);

// Removes the staged sibling of `path` if one is there. 1 when one was
// removed, 0 when none was there, -1 when it could not be removed.
int remove_staged(const char *path);

#endif
