#include "output/conf_build.h"

#include <unistd.h>

#include "base/appliance_paths.h"

int conf_build_open(ConfBuild *build) {
    build->note_wanted = false;
    build->links = nullptr;
    build->published = new_path_node();
    int conf = memory_file_open(&build->conf);
    int note = memory_file_open(&build->note);
    if (build->published != nullptr && conf == 0 && note == 0) return 0;
    conf_build_free(build);
    return -1;
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
    int conf_closed = memory_file_close(&build->conf);
    int note_closed = memory_file_close(&build->note);
    Replacement conf;
    if (conf_closed != 0 || note_closed != 0 ||
        replacement_write(&conf, PLACED_CONF_FILE, build->conf.text, build->conf.length, 0644) != 0)
        return -1;
    sync_link_dir(build->links);
    place_note(build);
    return replacement_commit(&conf);
}

void conf_build_free(ConfBuild *build) {
    memory_file_free(&build->conf);
    memory_file_free(&build->note);
    free_path_list(build->published);
    free_link_requests(build->links);
    build->published = nullptr;
    build->links = nullptr;
}
