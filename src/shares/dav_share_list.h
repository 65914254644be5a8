// WebDAV share lists. One list file per data volume ("lighty.xml") plus the
// iso list ("lighty_iso.xml", a copy on every volume), kept in the volumes'
// hidden data locations. In memory the entries of all lists form one
// DavShareEntry list with full paths; in the files a path is stored without
// its 13-character volume prefix. An entry with an empty path publishes
// nothing and is skipped by every writer.
#ifndef DAVSYNC_SHARES_DAV_SHARE_LIST_H
#define DAVSYNC_SHARES_DAV_SHARE_LIST_H

#include "shares/path_list.h"
#include "shares/share_catalogue.h"
#include "shares/volume_table.h"

constexpr int DAV_TEXT_WIDTH = 256;
constexpr int XML_ESCAPE_INPUT_MAX = 512;
constexpr int XML_ESCAPE_WIDTH = 1024;

struct DavShareEntry {
    char shared_name[DAV_TEXT_WIDTH];
    char path[DAV_TEXT_WIDTH];
    int RW;
    int enable;
    DavShareEntry *next;
};

DavShareEntry *new_dav_share_entry();
void free_dav_share_list(DavShareEntry *head);

// Reads one list file of one volume into the list at `entry` (its next is
// reset first). 0 also for a list without items; -1 when the file is not
// readable or well-formed, its first children are not count and allen, or
// memory runs out (entries read so far stay linked).
int read_volume_share_list(DavShareEntry *entry, const VolumeEntry *volume,
                           const char *list_name, int *allen_out);
// All volume lists in mount-table order, then the first readable iso list,
// into the empty `head`. 0, or -1 when no data volume is mounted. allen_out
// gets the allen of the last file read that far (0 when none was).
int load_dav_share_lists(DavShareEntry *head, int *allen_out);
// The do/merge input file (full paths, count and allen ignored). 0 or -1.
int read_share_list_file(DavShareEntry *head, const char *file_path);
// Writes and stores the list of every directory in `directories` ("/mnt/isoMount"
// selects the iso list, stored on every mounted volume); only entries whose
// path lies in that directory and exists are written.
void write_dav_share_lists(const DavShareEntry *entries, const PathNode *directories, int allen);
// Writes and stores the volume list of every mounted data volume; no iso list.
void write_volume_share_lists(const DavShareEntry *entries, int allen);
// The catalogue share of an entry: the first whose path begins with the
// entry's path and, with `match_name`, whose name begins the entry's shared
// name. Null when none is.
const ShareRecord *find_entry_share(const DavShareEntry *entry, const ShareRecord *catalogue,
                                    bool match_name);
// XML-escapes & < > " into `out` (XML_ESCAPE_WIDTH characters). -1 when text
// is longer than 512 characters or the result would not fit; out unchanged.
int escape_xml_text(const char *text, char *out);

#endif
