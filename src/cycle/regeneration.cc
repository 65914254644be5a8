#include "cycle/regeneration.h"

#include <cstring>
#include <sys/stat.h>
#include <unistd.h>

#include "base/shell_command.h"
#include "base/text_field.h"
#include "cycle/run_locks.h"
#include "output/dav_conf.h"
#include "output/usb_shares.h"
#include "output/webdav_note.h"
#include "platform/config_db.h"

static const char LINK_DIR[] = "/usr/local/apache2_dav/webdav";
static const char REMOVE_LINKS[] = "rm /usr/local/apache2_dav/webdav/* > /dev/null 2>&1";

// A switch of the configuration database is on only when its text is exactly "1".
static bool config_switch_on(const char *slash_path) {
    char value[8] = {};
    xml_get_str(slash_path, sizeof value, value);
    return value[0] == '1' && value[1] == '\0';
}

int read_webdav_enable_flag() { return config_switch_on("/system_mgr/webdav/enable") ? 1 : 0; }

void volume_prefix(const char *path, char out[PATH_NODE_WIDTH]) {
    copy_text_prefix(out, PATH_NODE_WIDTH, path, VOLUME_PREFIX_LENGTH);
}

static void release_node_lock(CycleRun *run) {
    if (!run->lock_taken) return;
    unlock_node_file(run->node_lock);
    run->lock_taken = false;
}

static void free_run_objects(CycleRun *run) {
    free_dav_share_list(run->entries);
    free_share_catalogue(run->catalogue);
    free_path_list(run->volume_dirs);
    free_path_list(run->published);
    run->entries = nullptr;
    run->catalogue = nullptr;
    run->volume_dirs = nullptr;
    run->published = nullptr;
}

int cycle_abort(CycleRun *run) {
    free_run_objects(run);
    release_node_lock(run);
    if (run->variant->clear_start_lock) start_lock_clear();
    return -1;
}

int cycle_begin(CycleRun *run, const CycleVariant *variant, int node_lock) {
    memset(run, 0, sizeof *run);
    run->variant = variant;
    if (variant->wait_start_lock) start_lock_wait_and_mark();
    run->volume_dirs = new_path_node();
    run->published = new_path_node();
    run->node_lock = variant->lock_taken_first ? node_lock : lock_node_file();
    run->lock_taken = true;
    if (run->volume_dirs == nullptr || run->published == nullptr) return cycle_abort(run);

    run->entries = new_dav_share_entry();
    int allen_unused = 0;
    if (run->entries == nullptr || load_dav_share_lists(run->entries, &allen_unused) < 0)
        return cycle_abort(run);
    run->webdav_enable = variant->read_enable_flag ? read_webdav_enable_flag() : 0;
    return 0;
}

static void reconcile_entries(DavShareEntry *entries, const ShareRecord *catalogue,
                              ReconcileRule rule) {
    for (DavShareEntry *entry = entries; entry != nullptr; entry = entry->next) {
        if (entry->path[0] == '\0') continue;
        const ShareRecord *share =
            find_entry_share(entry, catalogue, rule == RECONCILE_NAME_AND_PATH);
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
    switch (run->variant->allen) {
    case ALLEN_ONE: return 1;
    case ALLEN_ZERO: return 0;
    case ALLEN_ENABLE_FLAG: break;
    }
    return run->webdav_enable;
}

static void write_share_lists(CycleRun *run) {
    int allen = allen_value(run);
    switch (run->variant->writer) {
    case WRITE_ALL_VOLUMES:
        write_volume_share_lists(run->entries, allen);
        return;
    case WRITE_FIXED_DIRECTORIES:
        add_fixed_volume_dirs(run->volume_dirs);
        break;
    case WRITE_CHOSEN_DIRECTORIES:
        break;
    }
    write_dav_share_lists(run->entries, run->volume_dirs, allen);
}

static void prepare_link_dir() {
    struct stat status;
    if (stat(LINK_DIR, &status) == 0)
        run_shell_command(REMOVE_LINKS);
    else
        run_shell_command("mkdir -p /usr/local/apache2_dav/webdav > /dev/null 2>&1");
}

static void update_note_file(const DavShareEntry *entries) {
    if (config_switch_on("/system_mgr/samba/ads_enable"))
        unlink(WEBDAV_NOTE_FILE);
    else
        write_webdav_note(entries);
}

int cycle_finish(CycleRun *run) {
    const CycleVariant *variant = run->variant;
    run->catalogue = new_share_record();
    if (run->catalogue == nullptr) return cycle_abort(run);
    if (read_share_catalogue(run->catalogue) < 0) return cycle_abort(run);

    reconcile_entries(run->entries, run->catalogue, variant->rule);
    write_share_lists(run);
    if (variant->prepare_link_dir) prepare_link_dir();
    write_dav_conf(run->webdav_enable, run->entries, run->published, run->catalogue);
    if (variant->remove_links_after_conf) run_shell_command(REMOVE_LINKS);
    update_note_file(run->entries);
    append_usb_shares(run->published);
    run_shell_command("mv /tmp/dav.conf /usr/local/apache2_dav/conf/extra/httpd-dav.conf");

    if (variant->clear_start_lock) start_lock_clear();
    release_node_lock(run);
    run_shell_command(run->webdav_enable == 1 ? "apache restart dav" : "apache stop dav");
    free_run_objects(run);
    return 0;
}
