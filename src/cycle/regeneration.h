// The regeneration cycle every changing command runs, made one change that
// happens whole or not at all (see base/commit_record.h and docs/design.md).
//
//   cycle_begin   start lock (start, chg); node lock; the change an
//                 interrupted run left, rolled forward or discarded; the mount
//                 table; every share list; the WebDAV switch.
//   the command   its own change to run->entries; the lists it touched in
//                 run->volume_dirs; USB marks as steps in run->changes.
//   cycle_finish  the catalogue, the directory-service switch and the USB
//                 volumes (every input read whole before anything is
//                 written); reconciliation; the lists, configuration, note
//                 and links built in memory; lists and configuration staged;
//                 the change committed; links and note placed; marks
//                 released; the server restarted or stopped.
//
// Any failure takes the failure exit, which logs one line: what was staged
// is discarded and nothing on disk has changed, or (past the commit point)
// the change is stored and what is left (links, note) is done by the next
// run; the server is not told either way.
#ifndef DAVSYNC_CYCLE_REGENERATION_H
#define DAVSYNC_CYCLE_REGENERATION_H

#include "base/commit_record.h"
#include "base/diagnostics.h"
#include "base/mount_table.h"
#include "shares/dav_share_entry.h"
#include "shares/path_list.h"
#include "shares/share_catalogue.h"
#include "shares/share_lists.h"
#include "shares/share_lookup.h"
#include "shares/usb_volumes.h"

enum ReconcileRule {
    RECONCILE_PATH,           // an entry takes the name of the first share below its path
    RECONCILE_NAME_AND_PATH,  // an entry stays only when a share matches name and path
};

enum AllenValue { ALLEN_ONE, ALLEN_ZERO, ALLEN_ENABLE_FLAG };

enum ListWriter {
    WRITE_FIXED_DIRECTORIES,   // the four data volume directories and the iso list
    WRITE_CHOSEN_DIRECTORIES,  // only what the command put in run->volume_dirs
    WRITE_ALL_VOLUMES,         // every mounted volume's list, no iso list
};

enum CycleCommand { CYCLE_START, CYCLE_STOP, CYCLE_CHG, CYCLE_DO, CYCLE_MERGE, CYCLE_DEL,
                    CYCLE_DU, CYCLE_P2PEN, CYCLE_AMULEN };

// How a command's cycle differs from start's; one row per command.
struct CycleVariant {
    const char *command;     // its word, as logged
    bool start_lock;         // waits for and marks the start lock first
    bool clears_start_lock;  // removes the start-lock file at the end
    bool reads_switch;       // reads the WebDAV switch; otherwise WebDAV is off
    ReconcileRule rule;
    AllenValue allen;
    ListWriter writer;
};

const CycleVariant &cycle_variant(CycleCommand command);

struct CycleRun {
    const CycleVariant *variant;
    RunFailure failure;
    int node_lock;             // -1 when not held
    MountPoint *mounts;
    VolumeEntry *volumes;
    DavShareEntry *entries;
    StoredList *stored;        // the lists as loaded
    PathNode *volume_dirs;     // the lists the command touched
    ChangeSet changes;
    bool committed;            // past the commit point
    ShareRecord *catalogue;
    ShareLookup shares;        // the catalogue by path
    UsbScan usb;
    int webdav_enable;
};

// Everything up to the command's own change. 0, or -1 after the failure exit.
[[nodiscard]] int cycle_begin(CycleRun *run, CycleCommand command);
// Everything after it. 0, or -1 after the failure exit.
int cycle_finish(CycleRun *run);
// The failure exit for a command that gives up between the two halves, with
// its reason noted in run->failure. -1.
int cycle_abort(CycleRun *run);

#endif
