// The regeneration cycle every changing command ends in: load the WebDAV
// share lists and the catalogue, reconcile them, write the lists back,
// build the configuration, the note file and the USB sections, bring the
// link directory in line, place the configuration, release the marks,
// restart or stop the server.
//
// A command runs cycle_begin (marks, lists, loading, enable flag), makes its
// own change to run->entries, then cycle_finish. Its CycleVariant says where
// it differs from "start"; variants are made from start_variant() by
// changing named fields. Any failure takes the failure exit: what exists is
// freed, the marks are released, nothing is written or restarted.
#ifndef DAVSYNC_CYCLE_REGENERATION_H
#define DAVSYNC_CYCLE_REGENERATION_H

#include "shares/dav_share_list.h"
#include "shares/path_list.h"
#include "shares/share_catalogue.h"
#include "shares/share_lookup.h"

enum ReconcileRule {
    RECONCILE_PATH,           // an entry takes the name of the first share below its path
    RECONCILE_NAME_AND_PATH,  // an entry stays only when a share matches name and path
};

enum AllenValue { ALLEN_ONE, ALLEN_ZERO, ALLEN_ENABLE_FLAG };

enum ListWriter {
    WRITE_FIXED_DIRECTORIES,  // the four data volume directories and the iso list
    WRITE_CHOSEN_DIRECTORIES, // only what the command put in run->volume_dirs
    WRITE_ALL_VOLUMES,        // every mounted volume's list, no iso list
};

struct CycleVariant {
    bool lock_taken_first;  // the command holds the node lock before the cycle
    bool wait_start_lock;   // wait for and mark the start lock first
    bool clear_start_lock;  // remove the start-lock file at the end
    bool read_enable_flag;  // otherwise WebDAV counts as disabled
    ReconcileRule rule;
    AllenValue allen;
    ListWriter writer;
};

// The start command's variant, from which every other is made.
CycleVariant start_variant();
// What the editing commands share: no start lock, the name-and-path rule,
// allen from the enable flag.
CycleVariant editing_variant();

struct CycleRun {
    CycleVariant variant;
    int node_lock;
    bool lock_taken;  // node_lock still to be released
    DavShareEntry *entries;
    ShareRecord *catalogue;
    ShareLookup shares;       // the catalogue by path
    PathNode *volume_dirs;
    PathNode *unreadable;     // stored lists to keep as they are
    int webdav_enable;
};

// Start lock (if the variant says so), volume directory list, node lock (the
// caller's `node_lock` when the variant says it took the lock first; else it
// is ignored), entry list loaded from all volumes, enable flag. 0, or -1
// after the failure exit.
[[nodiscard]] int cycle_begin(CycleRun *run, const CycleVariant &variant, int node_lock);
// Catalogue, reconciliation, share lists, configuration, note file, USB
// sections, links, placing, marks released, server restarted or stopped,
// everything freed. 0, or -1 after the failure exit.
int cycle_finish(CycleRun *run);
// The failure exit for a command that gives up between the two halves.
int cycle_abort(CycleRun *run);

#endif
