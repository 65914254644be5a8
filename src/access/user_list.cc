#include "access/user_list.h"

#include <cstdlib>
#include <cstring>
#include <grp.h>

#include "base/appliance_paths.h"
#include "base/record_list.h"
#include "base/text_field.h"
#include "platform/smb_strtok.h"

static const char LIST_DELIMITERS[] = "#,";

NameNode *new_name_node() { return new_zeroed_record<NameNode>(); }

void free_name_list(NameNode *head) { free_record_list(head); }

static bool fits_name_node(const char *name) { return strlen(name) < sizeof(NameNode::name); }

// Names too long for a node are left out rather than cut: a cut name could
// be somebody else's. The chain starts at `head`; -1 when memory runs out.
static int collect_members(char *const *members, NameNode *head) {
    NameNode *last = nullptr;
    for (; members != nullptr && *members != nullptr; ++members) {
        if (!fits_name_node(*members)) continue;
        NameNode *node = head;
        if (last != nullptr) {
            node = new_name_node();
            if (node == nullptr) return -1;
            last->next = node;
        }
        copy_text(node->name, *members);
        last = node;
    }
    return 0;
}

// A fresh member chain of `group`, or null when memory runs out.
static NameNode *member_chain(const struct group *group) {
    NameNode *head = new_name_node();
    if (head != nullptr && group != nullptr && collect_members(group->gr_mem, head) != 0) {
        free_name_list(head);
        return nullptr;
    }
    return head;
}

int get_group_members(const char *group_name, NameNode **members_out) {
    NameNode *head = member_chain(getgrnam(group_name));
    endgrent();
    if (head == nullptr) return -1;
    *members_out = head;
    return 0;
}

void group_table_init(GroupTable *table) {
    table->loaded = false;
    name_index_init(&table->groups);
}

// One record per group name: its name (the key) and its member chain.
struct GroupRecord {
    char name[GROUP_NAME_WIDTH];
    NameNode *members;
};

static void add_group_record(GroupTable *table, const struct group *group) {
    GroupRecord *record = new_zeroed_record<GroupRecord>();
    if (record == nullptr) return;
    record->members = member_chain(group);
    // The first entry of a name counts, as for getgrnam.
    if (record->members == nullptr || copy_text(record->name, group->gr_name) != 0 ||
        name_index_add(&table->groups, record->name, record) != 0) {
        free_name_list(record->members);
        free(record);
    }
}

static void load_group_table(GroupTable *table) {
    table->loaded = true;
    setgrent();
    while (const struct group *group = getgrent()) add_group_record(table, group);
    endgrent();
}

void group_table_free(GroupTable *table) {
    for (size_t slot = 0; slot < table->groups.capacity; ++slot) {
        GroupRecord *record = static_cast<GroupRecord *>(table->groups.values[slot]);
        if (record == nullptr) continue;
        free_name_list(record->members);
        free(record);
    }
    name_index_free(&table->groups);
    table->loaded = false;
}

// The list being built: its open slot, and an index of every name in it.
struct Expansion {
    GroupTable *table;
    NameNode *open_slot;
    NameIndex names;
};

// Writes `name` into the open slot and appends a fresh one behind it.
static int fill_open_slot(Expansion *expansion, const char *name) {
    NameNode *fresh = new_name_node();
    if (fresh == nullptr) return -1;
    NameNode *slot = expansion->open_slot;
    copy_text(slot->name, name);
    slot->next = fresh;
    expansion->open_slot = fresh;
    return name_index_add(&expansion->names, slot->name, slot) < 0 ? -1 : 0;
}

// Members not yet in the list; an empty name equals the open slot's.
static int add_members(Expansion *expansion, const NameNode *members) {
    for (const NameNode *member = members; member != nullptr; member = member->next) {
        if (member->name[0] == '\0' || name_index_find(&expansion->names, member->name)) continue;
        if (fill_open_slot(expansion, member->name) != 0) return -1;
    }
    return 0;
}

static int add_group(Expansion *expansion, const char *group_name) {
    if (strcmp(group_name, "allaccount") == 0) return fill_open_slot(expansion, "All Account");
    if (expansion->table != nullptr) {
        if (!expansion->table->loaded) load_group_table(expansion->table);
        const GroupRecord *record =
            static_cast<const GroupRecord *>(name_index_find(&expansion->table->groups, group_name));
        return record != nullptr ? add_members(expansion, record->members) : 0;
    }
    NameNode *members = nullptr;
    if (get_group_members(group_name, &members) < 0) return 0;
    int result = add_members(expansion, members);
    free_name_list(members);
    return result;
}

static int add_token(Expansion *expansion, const char *token) {
    if (token[0] != '@') return fits_name_node(token) ? fill_open_slot(expansion, token) : 0;
    char group_name[GROUP_NAME_WIDTH];
    if (copy_text(group_name, token + 1) < 0) return 0;
    return add_group(expansion, group_name);
}

static bool is_delimiter(char c) { return c == '#' || c == ','; }

// A text cut at the width of the working copy loses its last, partial token
// too, so that no name is read shortened.
static void copy_whole_tokens(char (&work)[LINE_BUFFER_WIDTH], const char *text) {
    if (copy_text(work, text) == 0) return;
    if (is_delimiter(text[LINE_BUFFER_WIDTH - 1])) return;
    size_t keep = strlen(work);
    while (keep > 0 && !is_delimiter(work[keep - 1])) --keep;
    work[keep] = '\0';
}

int expand_user_list_with(GroupTable *table, const char *list_text, NameNode **list_out) {
    NameNode *head = new_name_node();
    *list_out = head;
    if (head == nullptr) return -1;
    char work[LINE_BUFFER_WIDTH];
    copy_whole_tokens(work, list_text);
    Expansion expansion = {table, head, {}};
    int result = 0;
    for (char *token = smb_strtok(work, LIST_DELIMITERS); token != nullptr && result == 0;
         token = smb_strtok(nullptr, LIST_DELIMITERS))
        result = add_token(&expansion, token);
    name_index_free(&expansion.names);
    return result;
}

int expand_user_list(const char *list_text, NameNode **list_out) {
    return expand_user_list_with(nullptr, list_text, list_out);
}
