// A WebDAV share entry: a folder published under a name. In memory the
// entries of all share lists form one singly linked list with full paths;
// its head is made by the caller and filled first. An entry whose path is
// empty publishes nothing and is skipped by every user of the list.
#ifndef DAVSYNC_SHARES_DAV_SHARE_ENTRY_H
#define DAVSYNC_SHARES_DAV_SHARE_ENTRY_H

constexpr int DAV_TEXT_WIDTH = 256;

struct DavShareEntry {
    char shared_name[DAV_TEXT_WIDTH];
    char path[DAV_TEXT_WIDTH];
    int RW;
    int enable;
    DavShareEntry *next;
};

// Zero-filled, or null when memory is exhausted.
[[nodiscard]] DavShareEntry *new_dav_share_entry();
void free_dav_share_list(DavShareEntry *head);
// The first entry whose path is exactly `path` (never an empty one), or null.
DavShareEntry *find_entry_by_path(const DavShareEntry *entries, const char *path);
// Empties an entry in place: it stays in the list and publishes nothing.
void empty_entry(DavShareEntry *entry);
// The last entry of the list.
DavShareEntry *last_entry(DavShareEntry *entries);

#endif
