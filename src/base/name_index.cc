#include "base/name_index.h"

#include <cstdint>
#include <cstdlib>
#include <cstring>

static const size_t FIRST_CAPACITY = 64;

// FNV-1a.
static size_t hash_text(const char *text) {
    uint64_t hash = 14695981039346656037u;
    for (const unsigned char *at = reinterpret_cast<const unsigned char *>(text); *at; ++at)
        hash = (hash ^ *at) * 1099511628211u;
    return static_cast<size_t>(hash);
}

// The slot that holds `key`, or the empty slot where it would go.
static size_t slot_of(const NameIndex *index, const char *key) {
    size_t mask = index->capacity - 1;
    size_t slot = hash_text(key) & mask;
    while (index->keys[slot] != nullptr && strcmp(index->keys[slot], key) != 0)
        slot = (slot + 1) & mask;
    return slot;
}

void name_index_init(NameIndex *index) { memset(index, 0, sizeof *index); }

void *name_index_find(const NameIndex *index, const char *key) {
    if (index->count == 0) return nullptr;
    size_t slot = slot_of(index, key);
    return index->keys[slot] != nullptr ? index->values[slot] : nullptr;
}

static int grow(NameIndex *index) {
    NameIndex bigger = {};
    bigger.capacity = index->capacity == 0 ? FIRST_CAPACITY : 2 * index->capacity;
    bigger.keys = static_cast<const char **>(calloc(bigger.capacity, sizeof *bigger.keys));
    bigger.values = static_cast<void **>(calloc(bigger.capacity, sizeof *bigger.values));
    if (bigger.keys == nullptr || bigger.values == nullptr) {
        name_index_free(&bigger);
        return -1;
    }
    for (size_t slot = 0; slot < index->capacity; ++slot) {
        if (index->keys[slot] == nullptr) continue;
        size_t target = slot_of(&bigger, index->keys[slot]);
        bigger.keys[target] = index->keys[slot];
        bigger.values[target] = index->values[slot];
    }
    bigger.count = index->count;
    name_index_free(index);
    *index = bigger;
    return 0;
}

int name_index_add(NameIndex *index, const char *key, void *value) {
    if (2 * (index->count + 1) > index->capacity && grow(index) != 0) return -1;
    size_t slot = slot_of(index, key);
    if (index->keys[slot] != nullptr) return 1;
    index->keys[slot] = key;
    index->values[slot] = value;
    ++index->count;
    return 0;
}

void name_index_clear(NameIndex *index) {
    if (index->count == 0) return;
    // A slot without a key is empty whatever its value.
    memset(index->keys, 0, index->capacity * sizeof *index->keys);
    index->count = 0;
}

void name_index_free(NameIndex *index) {
    free(index->keys);
    free(index->values);
    name_index_init(index);
}
