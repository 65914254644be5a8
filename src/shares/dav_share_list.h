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

[[nodiscard]] DavShareEntry *new_dav_share_entry();
void free_dav_share_list(DavShareEntry *head);

// Reads one list file of one volume into the list at `entry` (its next is
// reset first). 0 also for a list without items; -1 when the file is not
// readable or well-formed, its first children are not count and allen, or
// memory runs out; the entry is then as it was. A NUL byte ends the text, and
// the file is read as UTF-8 whatever its declaration says.
int read_volume_share_list(DavShareEntry *entry, const VolumeEntry *volume,
                           const char *list_name, int *allen_out);
// The same; a list file that exists but does not parse is added (by its
// location) to `unreadable`, unless that is null.
int read_volume_share_list_noting(DavShareEntry *entry, const VolumeEntry *volume,
                                  const char *list_name, int *allen_out, PathNode *unreadable);
// All volume lists in mount-table order, then the first readable iso list,
// into the empty `head`. 0, or -1 when no data volume is mounted. allen_out
// gets the allen of the last file read that far (0 when none was).
int load_dav_share_lists(DavShareEntry *head, int *allen_out);
// The same, noting the lists whose entries could not be read: every volume
// list that does not parse, and the iso copies that do not when none does.
int load_dav_share_lists_noting(DavShareEntry *head, int *allen_out, PathNode *unreadable);
// The same, reading only the lists that can hold an entry with exactly
// `path`: those of the volumes it lies on, and the iso list for a path below
// /mnt/isoMount. Only the entries with that path are kept (others are
// cleared), in the same order.
int load_dav_share_lists_for(DavShareEntry *head, int *allen_out, const char *path);
// The do/merge input file (full paths, count and allen ignored). 0 or -1.
int read_share_list_file(DavShareEntry *head, const char *file_path);
// Writes and stores the list of every directory in `directories` ("/mnt/isoMount"
// selects the iso list, stored on every mounted volume); only entries whose
// path lies in that directory and exists are written. A list is stored only
// when its text came out whole and parses, and never over a stored list
// named in `unreadable` (see load_dav_share_lists_noting).
void write_dav_share_lists(const DavShareEntry *entries, const PathNode *directories, int allen,
                           const PathNode *unreadable);
// Writes and stores the volume list of every mounted data volume; no iso list.
void write_volume_share_lists(const DavShareEntry *entries, int allen,
                              const PathNode *unreadable);
// XML-escapes & < > " into `out` (XML_ESCAPE_WIDTH characters). -1 when text
// is longer than 512 characters or the result would not fit; out unchanged.
int escape_xml_text(const char *text, char *out);

#endif
