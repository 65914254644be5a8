#include "commands/do_merge.h"

#include <cstring>
#include <fcntl.h>
#include <unistd.h>

#include "base/safe_file.h"
#include "base/text_field.h"
#include "cycle/regeneration.h"
#include "cycle/run_locks.h"

static const CycleVariant DO_MERGE_VARIANT = {
    /*lock_taken_first=*/true, /*wait_start_lock=*/false, /*clear_start_lock=*/false,
    /*read_enable_flag=*/true, RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG,
    WRITE_CHOSEN_DIRECTORIES, /*prepare_link_dir=*/true, /*remove_links_after_conf=*/false,
};

static bool is_usb_path(const char *path) { return strncmp(path, "/mnt/USB/", 9) == 0; }

// USB folders are published by a marker in the folder itself. The folder
// belongs to whoever plugged the volume in, so a link there is not followed.
static void write_usb_markers(const DavShareEntry *input) {
    for (const DavShareEntry *item = input; item != nullptr; item = item->next) {
        if (item->path[0] == '\0' || !is_usb_path(item->path)) continue;
        char marker[DAV_TEXT_WIDTH + 16];
        if (format_text_field(marker, sizeof marker, "%s/.davconf", item->path) != 0) continue;
        int fd = open_no_follow(marker, O_WRONLY | O_CREAT | O_TRUNC, 0644);
        if (fd == -1) continue;
        ssize_t written = write(fd, "ON", 2);
        (void)written;
        close(fd);
    }
}

static DavShareEntry *find_entry_by_path(DavShareEntry *entries, const char *path) {
    for (DavShareEntry *entry = entries; entry != nullptr; entry = entry->next)
        if (entry->path[0] != '\0' && strcmp(entry->path, path) == 0) return entry;
    return nullptr;
}

static void set_entry(DavShareEntry *entry, const DavShareEntry *item, const char *path) {
    copy_text(entry->shared_name, item->shared_name);
    copy_text(entry->path, path);
    entry->RW = item->RW;
    entry->enable = item->enable;
}

// New entries go in front of the first entry of their volume, or at the end
// when the volume has none yet.
static void insert_by_volume(DavShareEntry **entries, DavShareEntry *added) {
    DavShareEntry *previous = nullptr;
    for (DavShareEntry *entry = *entries; entry != nullptr; entry = entry->next) {
        if (entry->path[0] != '\0' &&
            strncmp(entry->path, added->path, VOLUME_PREFIX_LENGTH) == 0) {
            added->next = entry;
            if (previous == nullptr)
                *entries = added;
            else
                previous->next = added;
            return;
        }
        previous = entry;
    }
    previous->next = added;
}

static void apply_input_item(CycleRun *run, const DavShareEntry *item, int merge) {
    char path[DAV_TEXT_WIDTH];
    copy_text(path, item->path);
    if (strlen(path) == VOLUME_PREFIX_LENGTH) append_text(path, "/");
    if (is_usb_path(path)) return;

    DavShareEntry *existing = find_entry_by_path(run->entries, path);
    if (existing != nullptr) {
        int kept_rw = existing->RW;
        set_entry(existing, item, path);
        if (merge) existing->RW = kept_rw;
    } else if (run->entries->path[0] != '\0') {
        DavShareEntry *added = new_dav_share_entry();
        if (added == nullptr) return;
        set_entry(added, item, path);
        insert_by_volume(&run->entries, added);
    } else {
        set_entry(run->entries, item, path);
    }
    char prefix[PATH_NODE_WIDTH];
    volume_prefix(path, prefix);
    path_list_add(prefix, run->volume_dirs);
}

int webdav_do_merge(const char *file_name, int merge) {
    int node_lock = lock_node_file();
    DavShareEntry *input = new_dav_share_entry();
    if (input == nullptr || read_share_list_file(input, file_name) < 0) {
        free_dav_share_list(input);
        unlock_node_file(node_lock);
        return -1;
    }
    write_usb_markers(input);

    CycleRun run;
    if (cycle_begin(&run, &DO_MERGE_VARIANT, node_lock) < 0) {
        free_dav_share_list(input);
        return -1;
    }
    for (const DavShareEntry *item = input; item != nullptr; item = item->next)
        apply_input_item(&run, item, merge);
    free_dav_share_list(input);
    return cycle_finish(&run);
}
