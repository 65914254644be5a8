#include "access/user_list.h"

#include <cstdint>
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

// One record per group name: its name (the key), its member chain and the
// members' numbers.
struct GroupRecord {
    char name[GROUP_NAME_WIDTH];
    NameNode *members;
    size_t *numbers;
    size_t count;
};

static bool grow_book(GroupTable *table) {
    size_t capacity = table->capacity == 0 ? 256 : 2 * table->capacity;
    const char **texts = static_cast<const char **>(realloc(table->texts, capacity * sizeof *texts));
    if (texts != nullptr) table->texts = texts;
    bool *owned = static_cast<bool *>(realloc(table->owned, capacity * sizeof *owned));
    if (owned != nullptr) table->owned = owned;
    unsigned *marks = static_cast<unsigned *>(realloc(table->marks, capacity * sizeof *marks));
    if (marks != nullptr) table->marks = marks;
    if (texts == nullptr || owned == nullptr || marks == nullptr) return false;
    table->capacity = capacity;
    return true;
}

// The number of `name`, given one when it has none: its text is borrowed
// when `lasting`, else copied. -1 when memory runs out.
static long number_of(GroupTable *table, const char *name, bool lasting) {
    void *found = name_index_find(&table->numbers, name);
    if (found != nullptr) return static_cast<long>(reinterpret_cast<uintptr_t>(found) - 1);
    if (table->count == table->capacity && !grow_book(table)) return -1;
    char *copy = lasting ? nullptr : strdup(name);
    if (!lasting && copy == nullptr) return -1;
    size_t number = table->count;
    table->texts[number] = lasting ? name : copy;
    table->owned[number] = !lasting;
    table->marks[number] = 0;
    void *value = reinterpret_cast<void *>(static_cast<uintptr_t>(number + 1));
    if (name_index_add(&table->numbers, table->texts[number], value) != 0) {
        free(copy);
        return -1;
    }
    ++table->count;
    return static_cast<long>(number);
}

// Members too long for a node are left out rather than cut: a cut name could
// be somebody else's. -1 when memory runs out.
static int collect_members(GroupTable *table, char *const *members, GroupRecord *record) {
    NameNode **tail = &record->members;
    size_t capacity = 0;
    for (; members != nullptr && *members != nullptr; ++members) {
        if (!fits_name_node(*members)) continue;
        NameNode *node = new_name_node();
        if (node == nullptr) return -1;
        copy_text(node->name, *members);
        *tail = node;
        tail = &node->next;
        if (record->count == capacity) {
            capacity = capacity == 0 ? 16 : 2 * capacity;
            size_t *grown = static_cast<size_t *>(realloc(record->numbers, capacity * sizeof *grown));
            if (grown == nullptr) return -1;
            record->numbers = grown;
        }
        long number = number_of(table, node->name, true);
        if (number < 0) return -1;
        record->numbers[record->count++] = static_cast<size_t>(number);
    }
    return 0;
}

static void free_group_record(GroupRecord *record) {
    free_name_list(record->members);
    free(record->numbers);
    free(record);
}

static void add_group_record(GroupTable *table, const struct group *group) {
    GroupRecord *record = new_zeroed_record<GroupRecord>();
    if (record == nullptr) return;
    // The first entry of a name counts, as for getgrnam.
    if (copy_text(record->name, group->gr_name) != 0 || name_index_find(&table->groups, record->name) != nullptr ||
        collect_members(table, group->gr_mem, record) != 0 || name_index_add(&table->groups, record->name, record) != 0)
        free_group_record(record);
}

static void load_group_table(GroupTable *table) {
    table->loaded = true;
    setgrent();
    while (const struct group *group = getgrent()) add_group_record(table, group);
    endgrent();
}

void group_table_init(GroupTable *table) { *table = GroupTable{}; }

void group_table_free(GroupTable *table) {
    for (size_t slot = 0; slot < table->groups.capacity; ++slot)
        if (table->groups.keys[slot] != nullptr)
            free_group_record(static_cast<GroupRecord *>(table->groups.values[slot]));
    for (size_t number = 0; number < table->count; ++number)
        if (table->owned[number]) free(const_cast<char *>(table->texts[number]));
    name_index_free(&table->groups);
    name_index_free(&table->numbers);
    free(table->texts);
    free(table->owned);
    free(table->marks);
    *table = GroupTable{};
}

unsigned new_name_mark(GroupTable *table) {
    if (++table->mark == 0) {  // after four thousand million marks: start again
        memset(table->marks, 0, table->count * sizeof *table->marks);
        table->mark = 1;
    }
    return table->mark;
}

static int append_name(NameArray *names, const char *name, size_t number) {
    if (names->count == names->capacity) {
        size_t capacity = names->capacity == 0 ? 64 : 2 * names->capacity;
        const char **grown = static_cast<const char **>(realloc(names->names, capacity * sizeof *grown));
        if (grown != nullptr) names->names = grown;
        size_t *grown_numbers = static_cast<size_t *>(realloc(names->numbers, capacity * sizeof *grown_numbers));
        if (grown_numbers != nullptr) names->numbers = grown_numbers;
        if (grown == nullptr || grown_numbers == nullptr) return -1;
        names->capacity = capacity;
    }
    names->names[names->count] = name;
    names->numbers[names->count++] = number;
    return 0;
}

// A name taken as it stands: a user entry, or "All Account".
static int add_user(GroupTable *table, NameArray *names, const char *name, unsigned mark) {
    long number = number_of(table, name, false);
    if (number < 0) return -1;
    table->marks[number] = mark;
    return append_name(names, table->texts[number], static_cast<size_t>(number));
}

// Members not yet in the list.
static int add_group(GroupTable *table, NameArray *names, const char *group_name, unsigned mark) {
    if (strcmp(group_name, "allaccount") == 0) return add_user(table, names, ALL_ACCOUNTS, mark);
    if (!table->loaded) load_group_table(table);
    const GroupRecord *record = static_cast<const GroupRecord *>(name_index_find(&table->groups, group_name));
    for (size_t i = 0; record != nullptr && i < record->count; ++i) {
        size_t number = record->numbers[i];
        if (table->marks[number] == mark) continue;
        table->marks[number] = mark;
        if (append_name(names, table->texts[number], number) != 0) return -1;
    }
    return 0;
}

static int add_token(GroupTable *table, NameArray *names, const char *token, unsigned mark) {
    if (token[0] != '@') return fits_name_node(token) ? add_user(table, names, token, mark) : 0;
    char group_name[GROUP_NAME_WIDTH];
    if (copy_text(group_name, token + 1) < 0) return 0;
    return add_group(table, names, group_name, mark);
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
    char *work = whole_tokens(list_text);
    if (work == nullptr) return -1;
    unsigned mark = new_name_mark(table);
    int result = 0;
    for (char *token = smb_strtok(work, LIST_DELIMITERS); token != nullptr && result == 0;
         token = smb_strtok(nullptr, LIST_DELIMITERS))
        result = add_token(table, names, token, mark);
    free(work);
    return result;
}

void free_name_array(NameArray *names) {
    free(names->names);
    free(names->numbers);
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
