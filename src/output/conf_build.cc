#include "output/conf_build.h"

#include "base/text_field.h"

int conf_build_open(ConfBuild *build) {
    build->note_wanted = false;
    build->failed = false;
    build->links = nullptr;
    name_index_init(&build->published_names);
    group_table_init(&build->groups);
    build->published = new_path_node();
    build->published_tail = build->published;
    int conf = memory_file_open(&build->conf);
    int note = memory_file_open(&build->note);
    if (build->published != nullptr && conf == 0 && note == 0) return 0;
    conf_build_free(build);
    return -1;
}

// As path_list_add, with a tail and an index instead of a walk of the list.
int publish_name(ConfBuild *build, const char *shared_name) {
    if (shared_name[0] != '\0' && name_index_find(&build->published_names, shared_name)) return -1;
    PathNode *node = new_path_node();
    if (node == nullptr || copy_text(node->path, shared_name) != 0) {
        free_path_list(node);
        return -1;
    }
    build->published_tail->next = node;
    build->published_tail = node;
    if (shared_name[0] != '\0' && name_index_add(&build->published_names, node->path, node) < 0)
        return -1;
    return 0;
}

int conf_build_close(ConfBuild *build) {
    int conf = memory_file_close(&build->conf);
    int note = memory_file_close(&build->note);
    return conf == 0 && note == 0 && !build->failed ? 0 : -1;
}

void conf_build_free(ConfBuild *build) {
    memory_file_free(&build->conf);
    memory_file_free(&build->note);
    free_path_list(build->published);
    free_link_requests(build->links);
    name_index_free(&build->published_names);
    group_table_free(&build->groups);
    build->published = nullptr;
    build->published_tail = nullptr;
    build->links = nullptr;
}
