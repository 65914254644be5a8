// The WebDAV share lists as stored: one volume list "lighty.xml" per data
// volume and the iso list "lighty_iso.xml", of which every data volume holds
// a copy, each in the volume's hidden data location (the volume library
// names it). Loading reads every list whole; a list the reader refuses (or
// something that is no regular file at its name) contributes nothing, is
// told in the log and is kept: it is never replaced. A file that cannot be
// read is no state of the data: the load fails.
#ifndef DAVSYNC_SHARES_SHARE_LISTS_H
#define DAVSYNC_SHARES_SHARE_LISTS_H

#include "base/diagnostics.h"
#include "base/file_read.h"
#include "shares/dav_share_entry.h"
#include "shares/volume_table.h"

constexpr char VOLUME_LIST[] = "lighty.xml";
constexpr char ISO_LIST[] = "lighty_iso.xml";

// Where the volume library keeps a list of a volume: 0, or -1 when memory ran
// out or the place does not fit.
int list_location(const char *volume_dir, bool iso, char (&location)[4096]);

// A list file as the load found it.
struct StoredList {
    char location[4096];
    char volume_dir[MOUNT_DIR_WIDTH];
    bool iso;
    FileState state;  // read, absent or not_regular
    bool kept;        // refused: never replaced
    FileBytes bytes;  // its text, when read
    StoredList *next;
};

// The volume lists in table order, then the entries of the first iso copy
// that reads, into the empty `head` (the head is never filled from the iso
// list). Every file looked at is noted in `*stored` (the later iso copies
// are read but not parsed: they are copies of the one read). Refusals are
// logged under `command`. 0, or -1 with the failure noted: no data volume is
// mounted, a file could not be read, or memory ran out.
int load_share_lists(const VolumeEntry *volumes, DavShareEntry *head, StoredList **stored,
                     const char *command, RunFailure *failure);
// The same for a look-up: only the lists that can hold an entry with exactly
// `path` (those of the volumes it lies on, and the iso list for a path below
// /mnt/isoMount), keeping only the entries with that path; nothing is noted.
int load_share_lists_for(const VolumeEntry *volumes, DavShareEntry *head, const char *path,
                         const char *command, RunFailure *failure);
// The note of the list at `location`, or null.
const StoredList *find_stored_list(const StoredList *stored, const char *location);
void free_stored_lists(StoredList *stored);

#endif
