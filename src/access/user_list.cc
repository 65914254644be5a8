#include "access/user_list.h"

#include <cstdlib>
#include <cstring>
#include <grp.h>

#include "base/appliance_paths.h"
#include "base/record_list.h"
#include "base/text_field.h"
#include "platform/smb_strtok.h"

static const char LIST_DELIMITERS[] = "#,";
static const char ALL_ACCOUNTS[] = "All Account";

NameNode *new_name_node() { return new_zeroed_record<NameNode>(); }

void free_name_list(NameNode *head) { free_record_list(head); }

static bool fits_name_node(const char *name) { return strlen(name) < sizeof(NameNode::name); }

// One record per group name: its name (the key) and its member chain.
struct GroupRecord {
    char name[GROUP_NAME_WIDTH];
    NameNode *members;
};

// Members too long for a node are left out rather than cut: a cut name could
// be somebody else's. -1 when memory runs out.
static int collect_members(char *const *members, NameNode **chain) {
    NameNode **tail = chain;
    for (; members != nullptr && *members != nullptr; ++members) {
        if (!fits_name_node(*members)) continue;
        NameNode *node = new_name_node();
        if (node == nullptr) return -1;
        copy_text(node->name, *members);
        *tail = node;
        tail = &node->next;
    }
    return 0;
}

static void add_group_record(GroupTable *table, const struct group *group) {
    GroupRecord *record = new_zeroed_record<GroupRecord>();
    if (record == nullptr) return;
    // The first entry of a name counts, as for getgrnam.
    if (collect_members(group->gr_mem, &record->members) != 0 || copy_text(record->name, group->gr_name) != 0 ||
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

void group_table_init(GroupTable *table) {
    table->loaded = false;
    name_index_init(&table->groups);
    name_index_init(&table->seen);
}

void group_table_free(GroupTable *table) {
    for (size_t slot = 0; slot < table->groups.capacity; ++slot) {
        GroupRecord *record = static_cast<GroupRecord *>(table->groups.values[slot]);
        if (record == nullptr) continue;
        free_name_list(record->members);
        free(record);
    }
    name_index_free(&table->groups);
    name_index_free(&table->seen);
    table->loaded = false;
}

// Appends `name`; a group member only when it is not in the list yet.
static int append_name(GroupTable *table, NameArray *names, const char *name, bool if_new) {
    int added = name_index_add(&table->seen, name, const_cast<char *>(name));
    if (added < 0) return -1;
    if (added == 1 && if_new) return 0;
    if (names->count == names->capacity) {
        size_t capacity = names->capacity == 0 ? 64 : 2 * names->capacity;
        const char **grown = static_cast<const char **>(realloc(names->names, capacity * sizeof *grown));
        if (grown == nullptr) return -1;
        names->names = grown;
        names->capacity = capacity;
    }
    names->names[names->count++] = name;
    return 0;
}

static int add_group(GroupTable *table, NameArray *names, const char *group_name) {
    if (strcmp(group_name, "allaccount") == 0) return append_name(table, names, ALL_ACCOUNTS, false);
    if (!table->loaded) load_group_table(table);
    const GroupRecord *record = static_cast<const GroupRecord *>(name_index_find(&table->groups, group_name));
    for (const NameNode *member = record != nullptr ? record->members : nullptr; member != nullptr; member = member->next)
        if (append_name(table, names, member->name, true) != 0) return -1;
    return 0;
}

static int add_token(GroupTable *table, NameArray *names, const char *token) {
    if (token[0] != '@') return fits_name_node(token) ? append_name(table, names, token, false) : 0;
    char group_name[GROUP_NAME_WIDTH];
    if (copy_text(group_name, token + 1) < 0) return 0;
    return add_group(table, names, group_name);
}

static bool is_delimiter(char c) { return c == '#' || c == ','; }

// A text cut at the width of the working copy loses its last, partial token
// too, so that no name is read shortened.
static char *whole_tokens(const char *text) {
    size_t length = strnlen(text, LINE_BUFFER_WIDTH);
    bool cut = length == LINE_BUFFER_WIDTH;
    if (cut) length = LINE_BUFFER_WIDTH - 1;
    char *work = static_cast<char *>(malloc(length + 1));
    if (work == nullptr) return nullptr;
    copy_text_field(work, length + 1, text);
    if (cut && !is_delimiter(text[length])) {
        size_t keep = strlen(work);
        while (keep > 0 && !is_delimiter(work[keep - 1])) --keep;
        work[keep] = '\0';
    }
    return work;
}

int expand_user_names(GroupTable *table, const char *list_text, NameArray *names) {
    *names = NameArray{};
    name_index_clear(&table->seen);
    names->work = whole_tokens(list_text);
    if (names->work == nullptr) return -1;
    int result = 0;
    for (char *token = smb_strtok(names->work, LIST_DELIMITERS); token != nullptr && result == 0;
         token = smb_strtok(nullptr, LIST_DELIMITERS))
        result = add_token(table, names, token);
    return result;
}

void free_name_array(NameArray *names) {
    free(names->names);
    free(names->work);
    *names = NameArray{};
}

int expand_user_list(const char *list_text, NameNode **list_out) {
    NameNode *head = new_name_node();
    *list_out = head;
    if (head == nullptr) return -1;
    GroupTable table;
    group_table_init(&table);
    NameArray names;
    int result = expand_user_names(&table, list_text, &names);
    NameNode *open_slot = head;
    for (size_t i = 0; i < names.count && result == 0; ++i) {
        NameNode *fresh = new_name_node();
        if (fresh == nullptr) result = -1;
        else copy_text(open_slot->name, names.names[i]), open_slot->next = fresh, open_slot = fresh;
    }
    free_name_array(&names);
    group_table_free(&table);
    return result;
}
