// A hash index from texts to records, so that look-ups over thousands of
// shares and users stay linear in the whole run. Keys are borrowed: each
// must stay unchanged and alive as long as the index.
#ifndef DAVSYNC_BASE_NAME_INDEX_H
#define DAVSYNC_BASE_NAME_INDEX_H

#include <cstddef>

struct NameIndex {
    const char **keys;
    void **values;
    size_t capacity;  // a power of two, never more than half full
    size_t count;
};

// An empty index; a zero-filled NameIndex is one too.
void name_index_init(NameIndex *index);
// The value of `key`, or null when it is not in the index.
void *name_index_find(const NameIndex *index, const char *key);
// Adds `key` unless it is there already. 0 when added, 1 when present, -1
// when memory runs out.
[[nodiscard]] int name_index_add(NameIndex *index, const char *key, void *value);
// Empties the index, keeping its room for the next use.
void name_index_clear(NameIndex *index);
void name_index_free(NameIndex *index);

#endif
