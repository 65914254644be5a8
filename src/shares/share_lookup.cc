#include "shares/share_lookup.h"

#include <cstdlib>
#include <cstring>

static int by_path_then_order(const void *left, const void *right) {
    const ShareByPath *a = static_cast<const ShareByPath *>(left);
    const ShareByPath *b = static_cast<const ShareByPath *>(right);
    int paths = strcmp(a->share->path, b->share->path);
    if (paths != 0) return paths;
    return a->order < b->order ? -1 : a->order > b->order ? 1 : 0;
}

int share_lookup_build(ShareLookup *lookup, const ShareRecord *catalogue) {
    lookup->shares = nullptr;
    lookup->count = 0;
    size_t count = 0;
    for (const ShareRecord *share = catalogue; share != nullptr; share = share->next) ++count;
    if (count == 0) return 0;
    lookup->shares = static_cast<ShareByPath *>(malloc(count * sizeof *lookup->shares));
    if (lookup->shares == nullptr) return -1;
    for (const ShareRecord *share = catalogue; share != nullptr; share = share->next) {
        lookup->shares[lookup->count] = {share, lookup->count};
        ++lookup->count;
    }
    qsort(lookup->shares, count, sizeof *lookup->shares, by_path_then_order);
    return 0;
}

// The first share whose path is not below `path` in byte order.
static size_t lower_bound(const ShareLookup *lookup, const char *path) {
    size_t low = 0;
    size_t high = lookup->count;
    while (low < high) {
        size_t middle = low + (high - low) / 2;
        if (strcmp(lookup->shares[middle].share->path, path) < 0)
            low = middle + 1;
        else
            high = middle;
    }
    return low;
}

const ShareRecord *find_entry_share(const ShareLookup *lookup, const DavShareEntry *entry,
                                    bool match_name) {
    size_t path_length = strlen(entry->path);
    const ShareByPath *best = nullptr;
    // Paths that begin with the entry's path sort together from its own place.
    for (size_t at = lower_bound(lookup, entry->path); at < lookup->count; ++at) {
        const ShareByPath &candidate = lookup->shares[at];
        if (strncmp(candidate.share->path, entry->path, path_length) != 0) break;
        if (best != nullptr && candidate.order > best->order) continue;
        const char *name = candidate.share->name;
        if (!match_name || strncmp(entry->shared_name, name, strlen(name)) == 0) best = &candidate;
    }
    return best != nullptr ? best->share : nullptr;
}

void share_lookup_free(ShareLookup *lookup) {
    free(lookup->shares);
    lookup->shares = nullptr;
    lookup->count = 0;
}
