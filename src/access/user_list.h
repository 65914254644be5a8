// Access lists of the share catalogue ("#alice#,#@staff#") expanded into user
// names. Tokens are cut at '#' and ','; "@group" names a system group (only
// its listed members count), "@allaccount" stands for "All Account". Groups
// never add a name already in the list; user entries are not de-duplicated.
// Names of 64 characters or more are skipped, and text beyond 12,799
// characters is not read (a token cut there is dropped whole).
#ifndef DAVSYNC_ACCESS_USER_LIST_H
#define DAVSYNC_ACCESS_USER_LIST_H

#include <cstddef>

#include "base/name_index.h"

constexpr int USER_NAME_WIDTH = 64;
constexpr int GROUP_NAME_WIDTH = 128;

struct NameNode {
    char name[USER_NAME_WIDTH];  // empty: no entry, skipped by every consumer
    NameNode *next;
};

[[nodiscard]] NameNode *new_name_node();
void free_name_list(NameNode *head);

// The system's group database, read whole on the first look-up, for a run
// that expands many lists. Every name the run meets gets a number once, so
// that an expansion tells a name it took already by a mark on its number
// rather than by hashing the name again.
struct GroupTable {
    bool loaded;
    NameIndex groups;     // group name -> its record (members and their numbers)
    NameIndex numbers;    // name -> its number + 1
    const char **texts;   // number -> the name
    bool *owned;          // number -> the text is the table's own copy
    unsigned *marks;      // number -> the last mark put on it
    size_t count;
    size_t capacity;
    unsigned mark;        // the latest mark
};
void group_table_init(GroupTable *table);
void group_table_free(GroupTable *table);

// An expansion's names in order, with their numbers. The names are
// borrowed from the group table.
struct NameArray {
    const char **names;
    size_t *numbers;
    size_t count;
    size_t capacity;
};

// A fresh mark, to put on the numbers of a set of names.
unsigned new_name_mark(GroupTable *table);

// Expands `list_text` (unchanged) with the groups of `table`. 0, or -1 when
// memory runs out (what was gathered stays, and is the caller's to free).
int expand_user_names(GroupTable *table, const char *list_text, NameArray *names);
void free_name_array(NameArray *names);
// The same as a chain of nodes that ends with one empty node, the open slot.
// The head is stored first; on -1 it holds what was gathered.
int expand_user_list(const char *list_text, NameNode **list_out);

#endif
