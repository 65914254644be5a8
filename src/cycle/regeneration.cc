#include "cycle/regeneration.h"

#include <cerrno>
#include <cstring>
#include <syslog.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/file_read.h"
#include "base/memory_file.h"
#include "base/safe_file.h"
#include "base/shell_command.h"
#include "base/text_field.h"
#include "cycle/config_switches.h"
#include "cycle/run_locks.h"
#include "output/conf_build.h"
#include "output/dav_conf.h"
#include "output/link_dir.h"
#include "output/usb_shares.h"
#include "output/webdav_note.h"
#include "shares/share_list_store.h"
#include "shares/usb_marks.h"

namespace {

// The change from start's row is in the last column.
const CycleVariant VARIANTS[] = {
    // command   start lock  clears  switch  reconciliation           allen              lists written
    {"start",    true,       true,   true,   RECONCILE_PATH,          ALLEN_ONE,         WRITE_FIXED_DIRECTORIES},
    {"stop",     false,      true,   false,  RECONCILE_NAME_AND_PATH, ALLEN_ZERO,        WRITE_FIXED_DIRECTORIES},  // WebDAV off
    {"chg",      true,       true,   true,   RECONCILE_PATH,          ALLEN_ONE,         WRITE_FIXED_DIRECTORIES},  // entries moved
    {"do",       false,      false,  true,   RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG, WRITE_CHOSEN_DIRECTORIES}, // items applied
    {"merge",    false,      false,  true,   RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG, WRITE_CHOSEN_DIRECTORIES}, // RW kept
    {"del",      false,      false,  true,   RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG, WRITE_CHOSEN_DIRECTORIES}, // entry removed
    {"du",       false,      false,  true,   RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG, WRITE_FIXED_DIRECTORIES},  // realigned
    {"p2pen",    false,      false,  true,   RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG, WRITE_ALL_VOLUMES},        // download entry
    {"amulen",   false,      false,  true,   RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG, WRITE_ALL_VOLUMES},        // download entry
};

const char *command_of(const CycleRun *run) { return run->variant->command; }

void add_fixed_volume_dirs(PathNode *dirs) {
    char directory[PATH_NODE_WIDTH];
    for (char letter = 'a'; letter <= 'd'; ++letter) {
        format_text_field(directory, sizeof directory, "/mnt/HD/HD_%c2", letter);
        path_list_add(directory, dirs);
    }
}

void free_run_objects(CycleRun *run) {
    free_dav_share_list(run->entries);
    free_stored_lists(run->stored);
    share_lookup_free(&run->shares);
    free_share_catalogue(run->catalogue);
    free_path_list(run->volume_dirs);
    free_volume_list(run->volumes);
    free_mount_table(run->mounts);
    free_usb_scan(&run->usb);
    change_set_free(&run->changes);
    run->entries = nullptr;
    run->stored = nullptr;
    run->catalogue = nullptr;
    run->volume_dirs = nullptr;
    run->volumes = nullptr;
    run->mounts = nullptr;
}

void release_marks(CycleRun *run) {
    if (run->variant->clears_start_lock) start_lock_clear(command_of(run));
    unlock_node_file(run->node_lock, command_of(run));
    run->node_lock = -1;
}

// What a run killed before its commit point staged, and what older versions
// left, found by name where they would be.
int discard_leftovers(CycleRun *run) {
    PathNode *dirs = new_path_node();
    if (dirs == nullptr) return note_failure(&run->failure, "cannot make room", "", ENOMEM);
    for (const VolumeEntry *volume = run->volumes; volume != nullptr; volume = volume->next)
        if (volume->mount_dir[0] != '\0') path_list_add(volume->mount_dir, dirs);
    add_fixed_volume_dirs(dirs);
    int lists = discard_staged_lists(dirs, &run->failure);
    free_path_list(dirs);
    if (lists < 0) return -1;
    int marks = discard_staged_marks(&run->failure);
    if (marks < 0) return -1;
    lists += marks;
    // Staging folders, and unfinished replacements of the note and the answer.
    static const char *const IN_TMP[] = {"davsync.", ".set_webdav_note.", ".webdav_query.xml."};
    // What older versions left beside the configuration.
    static const char *const BESIDE_CONF[] = {".httpd-dav.conf."};
    int removed = lists;
    int found = remove_staged(PLACED_CONF_FILE);
    if (found < 0) return note_failure(&run->failure, "cannot remove what was staged beside", PLACED_CONF_FILE, errno);
    removed += found;
    found = remove_stale_temporaries("/tmp", IN_TMP, 3);
    if (found < 0) return note_failure(&run->failure, "cannot clear", "/tmp", errno);
    removed += found;
    found = remove_stale_temporaries(CONF_DIR, BESIDE_CONF, 1);
    if (found < 0) return note_failure(&run->failure, "cannot clear", CONF_DIR, errno);
    removed += found;
    if (removed > 0)
        log_event(LOG_NOTICE, "%s: discarded what an interrupted run left (%d files)", command_of(run), removed);
    return 0;
}

int load(CycleRun *run) {
    if (read_mount_table(&run->mounts) != 0)
        return note_failure(&run->failure, "cannot read", "/etc/mtab", errno);
    run->volumes = new_volume_entry();
    run->volume_dirs = new_path_node();
    run->entries = new_dav_share_entry();
    if (run->volumes == nullptr || run->volume_dirs == nullptr || run->entries == nullptr)
        return note_failure(&run->failure, "cannot make room", "", ENOMEM);
    scan_data_volumes(run->mounts, run->volumes);
    if (discard_leftovers(run) != 0) return -1;
    return load_share_lists(run->volumes, run->entries, &run->stored, command_of(run), &run->failure);
}

void reconcile_entries(DavShareEntry *entries, const ShareLookup *catalogue, ReconcileRule rule) {
    for (DavShareEntry *entry = entries; entry != nullptr; entry = entry->next) {
        if (entry->path[0] == '\0') continue;
        const ShareRecord *share = find_entry_share(catalogue, entry, rule == RECONCILE_NAME_AND_PATH);
        if (share == nullptr) empty_entry(entry);
        else if (rule == RECONCILE_PATH) copy_text(entry->shared_name, share->name);
    }
}

int allen_value(const CycleRun *run) {
    switch (run->variant->allen) {
    case ALLEN_ONE: return 1;
    case ALLEN_ZERO: return 0;
    case ALLEN_ENABLE_FLAG: break;
    }
    return run->webdav_enable;
}

int stage_lists(CycleRun *run) {
    PathNode *dirs = run->volume_dirs;
    switch (run->variant->writer) {
    case WRITE_FIXED_DIRECTORIES:
        add_fixed_volume_dirs(dirs);
        path_list_add(ISO_DIR, dirs);
        break;
    case WRITE_ALL_VOLUMES:
        for (const VolumeEntry *volume = run->volumes; volume != nullptr; volume = volume->next)
            if (volume->mount_dir[0] != '\0') path_list_add(volume->mount_dir, dirs);
        break;
    case WRITE_CHOSEN_DIRECTORIES:
        break;
    }
    ListWrite write = {run->entries, allen_value(run), run->volumes, run->stored, &run->changes,
                       command_of(run), &run->failure, {}};
    int result = stage_share_lists(&write, dirs);
    end_list_staging(&write);
    return result;
}

bool holds(const char *path, const MemoryFile &text) { return file_holds(path, text.text, text.length); }

// Staged only when it differs from the placed one.
int stage_conf(CycleRun *run, const MemoryFile &conf) {
    if (holds(PLACED_CONF_FILE, conf)) return 0;
    if (stage_file(PLACED_CONF_FILE, conf.text, conf.length, 0644) != 0)
        return note_failure(&run->failure, "cannot stage", PLACED_CONF_FILE, errno);
    if (change_set_add(&run->changes, CHANGE_REPLACE, PLACED_CONF_FILE) != 0)
        return note_failure(&run->failure, "cannot make room for the change of", PLACED_CONF_FILE, ENOMEM);
    return 0;
}

int place_note(CycleRun *run, const ConfBuild &build) {
    if (build.note_wanted && holds(NOTE_FILE, build.note)) return 0;
    if (build.note_wanted) {
        if (replace_file(NOTE_FILE, build.note.text, build.note.length, 0644) != 0)
            return note_failure(&run->failure, "cannot write", NOTE_FILE, errno);
    } else if (unlink(NOTE_FILE) != 0 && errno != ENOENT) {
        return note_failure(&run->failure, "cannot remove", NOTE_FILE, errno);
    }
    return 0;
}

int read_rest(CycleRun *run, bool *directory_service) {
    run->catalogue = new_share_record();
    if (run->catalogue == nullptr) return note_failure(&run->failure, "cannot make room", "", ENOMEM);
    if (read_share_catalogue(run->catalogue, &run->failure) != 0) return -1;
    if (share_lookup_build(&run->shares, run->catalogue) != 0)
        return note_failure(&run->failure, "cannot make room for the share catalogue", "", ENOMEM);
    if (read_config_switch(DIRECTORY_SERVICE_SWITCH, directory_service, &run->failure) != 0) return -1;
    return read_usb_volumes(run->mounts, &run->changes, &run->usb, &run->failure);
}

int build(const CycleRun *run, bool directory_service, ConfBuild *conf) {
    if (conf_build_open(conf) != 0) return -1;
    write_dav_conf(conf, run->webdav_enable, run->entries, &run->shares);
    if (!directory_service) write_webdav_note(conf, run->entries);
    append_usb_shares(conf, &run->usb);
    return conf_build_close(conf);
}

// The steps of a change that was never committed leave no staged file.
void discard_staged(const ChangeSet *changes, const char *command) {
    for (const ChangeStep *step = changes->first; step != nullptr; step = step->next)
        if (step->kind != CHANGE_UNMARK && remove_staged(step->path) < 0)
            log_event(LOG_WARNING, "%s: cannot remove what was staged beside %s: %m", command, step->path);
}

int sync_links(CycleRun *run, const LinkRequest *links) {
    int link_dir = open_link_dir();
    if (link_dir == -1) return note_failure(&run->failure, "cannot use the link directory", LINK_DIR, errno);
    int result = sync_link_dir(link_dir, links, command_of(run), &run->failure);
    close(link_dir);
    return result;
}

// Reads, builds, stages and commits; then the links and the note.
int finish(CycleRun *run, ConfBuild *conf) {
    bool directory_service = false;
    if (read_rest(run, &directory_service) != 0) return -1;
    // A link directory that cannot be used stops the run before anything changes.
    if (check_link_dir() != 0) return note_failure(&run->failure, "cannot use the link directory", LINK_DIR, errno);
    reconcile_entries(run->entries, &run->shares, run->variant->rule);
    if (build(run, directory_service, conf) != 0)
        return note_failure(&run->failure, "cannot make room for the configuration", "", ENOMEM);
    if (stage_lists(run) != 0 || stage_conf(run, conf->conf) != 0) return -1;
    if (commit_change_set(&run->changes, command_of(run), &run->failure, &run->committed) != 0) return -1;
    if (sync_links(run, conf->links) != 0) return -1;
    return place_note(run, *conf);
}

}  // namespace

const CycleVariant &cycle_variant(CycleCommand command) { return VARIANTS[command]; }

int cycle_abort(CycleRun *run) {
    if (!run->committed) discard_staged(&run->changes, command_of(run));
    log_failure(command_of(run), &run->failure,
                run->committed ? "the change is stored, the rest is left to the next run; the server was not told"
                               : "nothing was changed");
    free_run_objects(run);
    release_marks(run);
    return -1;
}

int cycle_begin(CycleRun *run, CycleCommand command) {
    *run = CycleRun{};
    run->variant = &cycle_variant(command);
    run->node_lock = -1;
    if (run->variant->start_lock) start_lock_wait_and_mark(command_of(run));
    run->node_lock = lock_node_file(command_of(run), &run->failure);
    if (run->node_lock == -1 || roll_forward_recorded_change(command_of(run), &run->failure) != 0 ||
        load(run) != 0)
        return cycle_abort(run);
    bool on = false;
    if (run->variant->reads_switch && read_config_switch(WEBDAV_SWITCH, &on, &run->failure) != 0)
        return cycle_abort(run);
    run->webdav_enable = on ? 1 : 0;
    return 0;
}

int cycle_finish(CycleRun *run) {
    ConfBuild conf = {};
    int result = finish(run, &conf);
    conf_build_free(&conf);
    if (result != 0) return cycle_abort(run);
    release_marks(run);
    const char *server_command = run->webdav_enable == 1 ? "apache restart dav" : "apache stop dav";
    if (run_shell_command(server_command) != 0)
        log_event(LOG_ERR, "%s: cannot run %s: %m", command_of(run), server_command);
    free_run_objects(run);
    return 0;
}
