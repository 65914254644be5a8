// The one way lists are kept. A list is a chain of records through their
// `next` field, held by a pointer to its first record (null for none).
// Where a caller makes the first record itself and hands it to a filler
// (the entry list, the catalogue, the volume table), that record is simply
// the first one; a record whose key text is empty (an emptied entry, the
// empty first node of a path list, the open slot of a name list) is a record
// like any other that every walker passes over. Records are added at the
// tail (or the head, where order does not matter) and freed with
// free_record_list, or with the list's own free function when a record owns
// more. Arrays with a count (a sorted index, the names of one expansion) are
// indexes over data, never lists.
#ifndef DAVSYNC_BASE_RECORD_LIST_H
#define DAVSYNC_BASE_RECORD_LIST_H

#include <cstdlib>

// A zero-filled record (next null), or null when memory is exhausted.
template <typename Record> [[nodiscard]] Record *new_zeroed_record() {
    return static_cast<Record *>(calloc(1, sizeof(Record)));
}

// Frees every record from head along next; null does nothing.
template <typename Record> void free_record_list(Record *head) {
    while (head != nullptr) {
        Record *next = head->next;
        free(head);
        head = next;
    }
}

#endif
