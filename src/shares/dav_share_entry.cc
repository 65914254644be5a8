#include "shares/dav_share_entry.h"

#include <cstring>

#include "base/record_list.h"

DavShareEntry *new_dav_share_entry() { return new_zeroed_record<DavShareEntry>(); }

void free_dav_share_list(DavShareEntry *head) { free_record_list(head); }

DavShareEntry *find_entry_by_path(const DavShareEntry *entries, const char *path) {
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next)
        if (entry->path[0] != '\0' && strcmp(entry->path, path) == 0) return const_cast<DavShareEntry *>(entry);
    return nullptr;
}

void empty_entry(DavShareEntry *entry) {
    DavShareEntry *next = entry->next;
    memset(entry, 0, sizeof *entry);
    entry->next = next;
}

DavShareEntry *last_entry(DavShareEntry *entries) {
    while (entries->next != nullptr) entries = entries->next;
    return entries;
}
