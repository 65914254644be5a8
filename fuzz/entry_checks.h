// Checks on a read DavShareEntry list, shared by the two share list targets.
#ifndef DAVSYNC_FUZZ_ENTRY_CHECKS_H
#define DAVSYNC_FUZZ_ENTRY_CHECKS_H

#include "fuzz_input.h"
#include "shares/dav_share_list.h"

// Texts terminated within their width; a path, when read, starts with `prefix`.
inline void check_entries(int result, const DavShareEntry *head, const char *prefix) {
    FUZZ_CHECK(result == 0 || result == -1);
    for (const DavShareEntry *entry = head; entry != nullptr; entry = entry->next) {
        FUZZ_CHECK(strnlen(entry->shared_name, DAV_TEXT_WIDTH) < DAV_TEXT_WIDTH);
        FUZZ_CHECK(strnlen(entry->path, DAV_TEXT_WIDTH) < DAV_TEXT_WIDTH);
        FUZZ_CHECK(entry->path[0] == '\0' || strncmp(entry->path, prefix, strlen(prefix)) == 0);
    }
}

#endif
