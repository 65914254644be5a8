// Path lists: texts of up to 255 characters, each held once. A list starts
// with an empty head node made by the caller; texts are appended behind it.
// Walkers skip nodes whose path is empty.
#ifndef DAVSYNC_SHARES_PATH_LIST_H
#define DAVSYNC_SHARES_PATH_LIST_H

constexpr int PATH_NODE_WIDTH = 256;

struct PathNode {
    char path[PATH_NODE_WIDTH];
    PathNode *next;
};

[[nodiscard]] PathNode *new_path_node();
// Appends `text` unless a node holds it already: 0 when appended (a null
// head appends nothing and also gives 0), -1 when present. An empty text is
// never present, so it appends an empty node each time. A text too long for
// a node, or memory exhausted, gives -1.
int path_list_add(const char *text, PathNode *head);
void free_path_list(PathNode *head);
// Adds the volume prefix of `path` (its first 13 characters, the volume
// directory whose list holds it) to the list of directories to rewrite.
void add_volume_prefix(const char *path, PathNode *volume_dirs);

#endif
