#include "cycle/regeneration.h"

#include <cstring>

#include "base/shell_command.h"
#include "base/text_field.h"
#include "cycle/config_switches.h"
#include "cycle/run_locks.h"
#include "output/conf_build.h"
#include "output/dav_conf.h"
#include "output/usb_shares.h"
#include "output/webdav_note.h"


CycleVariant start_variant() {
    CycleVariant variant;
    variant.lock_taken_first = false;
    variant.wait_start_lock = true;
    variant.clear_start_lock = true;
    variant.read_enable_flag = true;
    variant.rule = RECONCILE_PATH;
    variant.allen = ALLEN_ONE;
    variant.writer = WRITE_FIXED_DIRECTORIES;
    return variant;
}

CycleVariant editing_variant() {
    CycleVariant variant = start_variant();
    variant.wait_start_lock = false;
    variant.clear_start_lock = false;
    variant.rule = RECONCILE_NAME_AND_PATH;
    variant.allen = ALLEN_ENABLE_FLAG;
    return variant;
}

static void release_node_lock(CycleRun *run) {
    if (!run->lock_taken) return;
    unlock_node_file(run->node_lock);
    run->lock_taken = false;
}

static void free_run_objects(CycleRun *run) {
    free_dav_share_list(run->entries);
    share_lookup_free(&run->shares);
    free_share_catalogue(run->catalogue);
    free_path_list(run->volume_dirs);
    free_path_list(run->unreadable);
    run->entries = nullptr;
    run->catalogue = nullptr;
    run->volume_dirs = nullptr;
    run->unreadable = nullptr;
}

int cycle_abort(CycleRun *run) {
    free_run_objects(run);
    release_node_lock(run);
    if (run->variant.clear_start_lock) start_lock_clear();
    return -1;
}

int cycle_begin(CycleRun *run, const CycleVariant &variant, int node_lock) {
    memset(run, 0, sizeof *run);
    run->variant = variant;
    if (variant.wait_start_lock) start_lock_wait_and_mark();
    run->volume_dirs = new_path_node();
    run->unreadable = new_path_node();
    run->node_lock = variant.lock_taken_first ? node_lock : lock_node_file();
    run->lock_taken = true;
    if (run->volume_dirs == nullptr || run->unreadable == nullptr) return cycle_abort(run);

    run->entries = new_dav_share_entry();
    int allen_unused = 0;
    if (run->entries == nullptr ||
        load_dav_share_lists_noting(run->entries, &allen_unused, run->unreadable) < 0)
        return cycle_abort(run);
    run->webdav_enable = variant.read_enable_flag ? read_webdav_enable_flag() : 0;
    return 0;
}

static void reconcile_entries(DavShareEntry *entries, const ShareLookup *catalogue,
                              ReconcileRule rule) {
    for (DavShareEntry *entry = entries; entry != nullptr; entry = entry->next) {
        if (entry->path[0] == '\0') continue;
        const ShareRecord *share =
            find_entry_share(catalogue, entry, rule == RECONCILE_NAME_AND_PATH);
        if (share == nullptr) {
            memset(entry->shared_name, 0, sizeof entry->shared_name);
            memset(entry->path, 0, sizeof entry->path);
        } else if (rule == RECONCILE_PATH) {
            copy_text(entry->shared_name, share->name);
        }
    }
}

static void add_fixed_volume_dirs(PathNode *volume_dirs) {
    char directory[512];
    for (char letter = 'a'; letter <= 'd'; ++letter) {
        format_text_field(directory, sizeof directory, "/mnt/HD/HD_%c2", letter);
        path_list_add(directory, volume_dirs);
    }
    path_list_add("/mnt/isoMount", volume_dirs);
}

static int allen_value(const CycleRun *run) {
    switch (run->variant.allen) {
    case ALLEN_ONE: return 1;
    case ALLEN_ZERO: return 0;
    case ALLEN_ENABLE_FLAG: break;
    }
    return run->webdav_enable;
}

static void write_share_lists(CycleRun *run) {
    int allen = allen_value(run);
    switch (run->variant.writer) {
    case WRITE_ALL_VOLUMES:
        write_volume_share_lists(run->entries, allen, run->unreadable);
        return;
    case WRITE_FIXED_DIRECTORIES:
        add_fixed_volume_dirs(run->volume_dirs);
        break;
    case WRITE_CHOSEN_DIRECTORIES:
        break;
    }
    write_dav_share_lists(run->entries, run->volume_dirs, allen, run->unreadable);
}

// Configuration, note file, USB sections and links, built whole, then placed.
static void build_and_place_conf(const CycleRun *run) {
    ConfBuild build;
    if (conf_build_open(&build) != 0) return;
    write_dav_conf(&build, run->webdav_enable, run->entries, &run->shares);
    if (!config_switch_on("/system_mgr/samba/ads_enable")) write_webdav_note(&build, run->entries);
    append_usb_shares(&build);
    conf_build_place(&build);
    conf_build_free(&build);
}

int cycle_finish(CycleRun *run) {
    run->catalogue = new_share_record();
    if (run->catalogue == nullptr) return cycle_abort(run);
    if (read_share_catalogue(run->catalogue) < 0 ||
        share_lookup_build(&run->shares, run->catalogue) != 0)
        return cycle_abort(run);

    reconcile_entries(run->entries, &run->shares, run->variant.rule);
    write_share_lists(run);
    build_and_place_conf(run);

    if (run->variant.clear_start_lock) start_lock_clear();
    release_node_lock(run);
    run_shell_command(run->webdav_enable == 1 ? "apache restart dav" : "apache stop dav");
    free_run_objects(run);
    return 0;
}
