// Which catalogue share a WebDAV share entry belongs to: the first share, in
// catalogue order, whose path begins with the entry's whole path and, when
// names are matched too, whose name begins the entry's shared name. The
// shares are indexed by path once per run, so each look-up costs a binary
// search and a scan of the shares below the entry's path.
#ifndef DAVSYNC_SHARES_SHARE_LOOKUP_H
#define DAVSYNC_SHARES_SHARE_LOOKUP_H

#include <cstddef>

#include "shares/dav_share_entry.h"
#include "shares/share_catalogue.h"

struct ShareByPath {
    const ShareRecord *share;
    size_t order;  // place in the catalogue
};

struct ShareLookup {
    ShareByPath *shares;  // sorted by path, then by order
    size_t count;
};

// 0, or -1 when memory runs out (the lookup is then empty).
[[nodiscard]] int share_lookup_build(ShareLookup *lookup, const ShareRecord *catalogue);
// Null when no share matches.
const ShareRecord *find_entry_share(const ShareLookup *lookup, const DavShareEntry *entry,
                                    bool match_name);
void share_lookup_free(ShareLookup *lookup);

#endif
