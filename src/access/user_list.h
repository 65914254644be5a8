// Access lists of the share catalogue ("#alice#,#@staff#") expanded into user
// names. Tokens are cut at '#' and ','; "@group" names a system group (only
// its listed members count), "@allaccount" stands for "All Account". Groups
// never add a name already in the list; user entries are not de-duplicated.
#ifndef DAVSYNC_ACCESS_USER_LIST_H
#define DAVSYNC_ACCESS_USER_LIST_H

#include "base/name_index.h"

constexpr int USER_NAME_WIDTH = 64;
constexpr int GROUP_NAME_WIDTH = 128;

struct NameNode {
    char name[USER_NAME_WIDTH];  // empty: no entry, skipped by every consumer
    NameNode *next;
};

[[nodiscard]] NameNode *new_name_node();
void free_name_list(NameNode *head);
// Members of group `group_name` in database order, no open slot; an unknown
// or memberless group gives one empty node. 0, or -1 when memory runs out
// (nothing stored).
int get_group_members(const char *group_name, NameNode **members_out);

// The system's group database, read whole once, on the first look-up, for a
// run that expands many lists.
struct GroupTable {
    bool loaded;
    NameIndex groups;  // group name -> its member chain (NameNode, no open slot)
};
void group_table_init(GroupTable *table);
void group_table_free(GroupTable *table);

// Expands `list_text` (unchanged) into a list that ends with one empty node,
// the open slot. The head is stored first. 0, or -1 when memory runs out
// (the stored head, if any, holds what was gathered and is the caller's).
// Names of 64 characters or more are skipped; text beyond 12,799 characters
// is not read. The _with form takes groups from `table`.
int expand_user_list(const char *list_text, NameNode **list_out);
int expand_user_list_with(GroupTable *table, const char *list_text, NameNode **list_out);

#endif
