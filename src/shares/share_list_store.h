// Writing the share lists back as part of one change (see
// base/commit_record.h). Each list is built whole in memory; a list whose
// stored text is already exactly that is left alone; any other is handed to
// the volume library under its staged name (".lighty.xml.davsync" beside
// "lighty.xml"), and the step that makes it real is added to the change.
// A stored list that was refused when it was loaded is kept: it is never
// replaced, and a run that would store entries in its place fails instead
// (they would be published without being stored).
#ifndef DAVSYNC_SHARES_SHARE_LIST_STORE_H
#define DAVSYNC_SHARES_SHARE_LIST_STORE_H

#include "base/commit_record.h"
#include "base/diagnostics.h"
#include "shares/dav_share_entry.h"
#include "shares/path_list.h"
#include "shares/share_lists.h"
#include "shares/volume_table.h"

struct ListWrite {
    const DavShareEntry *entries;
    int allen;
    const VolumeEntry *volumes;  // where the iso list goes
    const StoredList *stored;    // as loaded
    ChangeSet *changes;
    const char *command;         // as logged
    RunFailure *failure;
    char staging_dir[32];        // this run's folder in /tmp, "" until made
};

// Stages the list of every directory in `directories` ("/mnt/isoMount"
// selects the iso list, stored on every mounted volume; any other directory
// must exist to get a list). An entry goes to the list of the directory its
// path begins with, when its path exists. 0, or -1 with the failure noted;
// what was staged stays for the caller to commit or discard.
int stage_share_lists(ListWrite *write, const PathNode *directories);
// Removes the run's folder in /tmp.
void end_list_staging(ListWrite *write);
// Removes what a killed run left in the hidden data location of each
// directory: staged lists, the volume library's temporaries of them, and
// what older versions left at "lighty.xml.XXXXXX". Returns how many it
// removed, -1 with the failure noted.
int discard_staged_lists(const PathNode *directories, RunFailure *failure);

#endif
