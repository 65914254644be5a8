#include "shares/path_list.h"

#include <cstdlib>
#include <cstring>

#include "base/appliance_paths.h"
#include "base/record_list.h"
#include "base/text_field.h"

PathNode *new_path_node() { return new_zeroed_record<PathNode>(); }

void free_path_list(PathNode *head) { free_record_list(head); }

int path_list_add(const char *text, PathNode *head) {
    if (head == nullptr) return 0;
    if (strlen(text) >= sizeof head->path) return -1;
    PathNode *tail = head;
    for (PathNode *node = head; node != nullptr; node = node->next) {
        if (text[0] != '\0' && strcmp(node->path, text) == 0) return -1;
        tail = node;
    }
    PathNode *added = new_path_node();
    if (added == nullptr) return -1;
    copy_text(added->path, text);
    tail->next = added;
    return 0;
}

void add_volume_prefix(const char *path, PathNode *volume_dirs) {
    char prefix[PATH_NODE_WIDTH];
    copy_text_prefix(prefix, sizeof prefix, path, VOLUME_PREFIX_LENGTH);
    path_list_add(prefix, volume_dirs);
}
