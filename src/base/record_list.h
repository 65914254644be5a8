// Allocation and release shared by every record type kept in a singly
// linked list through its `next` field.
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
