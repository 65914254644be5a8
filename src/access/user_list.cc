#include "access/user_list.h"

#include <cstdlib>
#include <cstring>
#include <grp.h>

#include "base/appliance_paths.h"
#include "base/record_list.h"
#include "base/text_field.h"
#include "platform/smb_strtok.h"

static const int GROUP_NAME_WIDTH = 128;
static const char LIST_DELIMITERS[] = "#,";

NameNode *new_name_node() { return new_zeroed_record<NameNode>(); }

void free_name_list(NameNode *head) { free_record_list(head); }

static bool fits_name_node(const char *name) {
    return strlen(name) < sizeof(NameNode::name);
}

// Names too long for a node are left out rather than cut: a cut name could
// be somebody else's.
static int collect_members(char *const *members, NameNode *head) {
    NameNode *last = nullptr;
    for (; *members != nullptr; ++members) {
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

int get_group_members(const char *group_name, NameNode **members_out) {
    NameNode *head = new_name_node();
    if (head == nullptr) return -1;
    const struct group *entry = getgrnam(group_name);
    int result = 0;
    if (entry != nullptr && entry->gr_mem != nullptr) result = collect_members(entry->gr_mem, head);
    endgrent();
    if (result < 0) {
        free_name_list(head);
        return -1;
    }
    *members_out = head;
    return 0;
}

// Writes `name` into the open slot and appends a fresh one behind it.
static int fill_open_slot(NameNode **open_slot, const char *name) {
    NameNode *fresh = new_name_node();
    if (fresh == nullptr) return -1;
    copy_text((*open_slot)->name, name);
    (*open_slot)->next = fresh;
    *open_slot = fresh;
    return 0;
}

bool name_list_holds(const NameNode *head, const char *name) {
    for (const NameNode *node = head; node != nullptr; node = node->next)
        if (strcmp(node->name, name) == 0) return true;
    return false;
}

static int add_group(const char *group_name, NameNode *head, NameNode **open_slot) {
    if (strcmp(group_name, "allaccount") == 0) return fill_open_slot(open_slot, "All Account");
    NameNode *members = nullptr;
    if (get_group_members(group_name, &members) < 0) return 0;
    int result = 0;
    for (const NameNode *member = members; member != nullptr && result == 0;
         member = member->next) {
        if (name_list_holds(head, member->name)) continue;
        result = fill_open_slot(open_slot, member->name);
    }
    free_name_list(members);
    return result;
}

static int add_token(const char *token, NameNode *head, NameNode **open_slot) {
    if (token[0] != '@') {
        if (!fits_name_node(token)) return 0;
        return fill_open_slot(open_slot, token);
    }
    char group_name[GROUP_NAME_WIDTH] = {};
    if (copy_text(group_name, token + 1) < 0) return 0;
    return add_group(group_name, head, open_slot);
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

int expand_user_list(const char *list_text, NameNode **list_out) {
    NameNode *head = new_name_node();
    *list_out = head;
    if (head == nullptr) return -1;
    char work[LINE_BUFFER_WIDTH] = {};
    copy_whole_tokens(work, list_text);
    NameNode *open_slot = head;
    for (char *token = smb_strtok(work, LIST_DELIMITERS); token != nullptr;
         token = smb_strtok(nullptr, LIST_DELIMITERS)) {
        if (add_token(token, head, &open_slot) < 0) return -1;
    }
    return 0;
}
