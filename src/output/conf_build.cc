#include "output/conf_build.h"

int conf_build_open(ConfBuild *build) {
    build->note_wanted = false;
    build->failed = false;
    build->links = nullptr;
    name_index_init(&build->published);
    group_table_init(&build->groups);
    int conf = memory_file_open(&build->conf);
    int note = memory_file_open(&build->note);
    if (conf == 0 && note == 0) return 0;
    conf_build_free(build);
    return -1;
}

int publish_name(ConfBuild *build, const char *shared_name) {
    int added = name_index_add(&build->published, shared_name, const_cast<char *>(shared_name));
    if (added < 0) build->failed = true;
    return added == 0 ? 0 : -1;
}

int conf_build_close(ConfBuild *build) {
    int conf = memory_file_close(&build->conf);
    int note = memory_file_close(&build->note);
    return conf == 0 && note == 0 && !build->failed ? 0 : -1;
}

void conf_build_free(ConfBuild *build) {
    memory_file_free(&build->conf);
    memory_file_free(&build->note);
    free_link_requests(build->links);
    name_index_free(&build->published);
    group_table_free(&build->groups);
    build->links = nullptr;
}
