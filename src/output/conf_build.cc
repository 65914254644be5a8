#include "output/conf_build.h"

#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/text_field.h"

int conf_build_open(ConfBuild *build) {
    build->note_wanted = false;
    build->links = nullptr;
    name_index_init(&build->published_names);
    group_table_init(&build->groups);
    build->published = new_path_node();
    build->published_tail = build->published;
    // Under the node lock, a temporary file of ours can only be a killed run's.
    remove_stale_replacements(PLACED_CONF_FILE);
    remove_stale_replacements(NOTE_FILE);
    build->conf = replacement_open(&build->conf_file, PLACED_CONF_FILE);
    int note = memory_file_open(&build->note);
    if (build->published != nullptr && build->conf != nullptr && note == 0) {
        setvbuf(build->conf, build->conf_buffer, _IOFBF, sizeof build->conf_buffer);
        return 0;
    }
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

static void place_note(ConfBuild *build) {
    if (!build->note_wanted) {
        unlink(NOTE_FILE);
        return;
    }
    // A note that cannot be written leaves the old one.
    (void)replace_file(NOTE_FILE, build->note.text, build->note.length, 0644);
}

int conf_build_place(ConfBuild *build) {
    int conf_closed = replacement_close(&build->conf_file, build->conf, 0644);
    build->conf = nullptr;
    if (memory_file_close(&build->note) != 0 || conf_closed != 0) return -1;
    sync_link_dir(build->links);
    place_note(build);
    return replacement_commit(&build->conf_file);
}

void conf_build_free(ConfBuild *build) {
    if (build->conf != nullptr) fclose(build->conf);
    build->conf = nullptr;
    replacement_abandon(&build->conf_file);
    memory_file_free(&build->note);
    free_path_list(build->published);
    free_link_requests(build->links);
    name_index_free(&build->published_names);
    group_table_free(&build->groups);
    build->published = nullptr;
    build->published_tail = nullptr;
    build->links = nullptr;
}
