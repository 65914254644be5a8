#include "commands/do_merge.h"

#include <cstring>
#include <fcntl.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"
#include "base/text_field.h"
#include "cycle/regeneration.h"
#include "cycle/run_locks.h"

// USB folders are published by a marker in the folder itself. The folder
// belongs to whoever plugged the volume in, so no link on the way is followed.
static void write_usb_marker(const char *folder) {
    int dir_fd = open_dir_no_links(folder);
    if (dir_fd == -1) return;
    int fd = open_own_regular_at(dir_fd, USB_MARKER, O_WRONLY | O_CREAT | O_TRUNC, 0644);
    close(dir_fd);
    if (fd == -1) return;
    ssize_t written = write(fd, "ON", 2);
    (void)written;
    close(fd);
}

// Anything that is not a volume folder or below one (a path of "/" would
// publish the whole file system) is no input at all.
static bool is_input_item(const DavShareEntry *item) {
    return item->path[0] != '\0' && is_shareable_path(item->path);
}

static void write_usb_markers(const DavShareEntry *input) {
    for (const DavShareEntry *item = input; item != nullptr; item = item->next)
        if (is_input_item(item) && is_usb_path(item->path)) write_usb_marker(item->path);
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
    if (!is_input_item(item)) return;
    char path[DAV_TEXT_WIDTH];
    copy_text(path, item->path);
    append_volume_root_slash(path, sizeof path);
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
    add_volume_prefix(path, run->volume_dirs);
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

    CycleVariant variant = editing_variant();
    variant.lock_taken_first = true;
    variant.writer = WRITE_CHOSEN_DIRECTORIES;
    CycleRun run;
    if (cycle_begin(&run, variant, node_lock) < 0) {
        free_dav_share_list(input);
        return -1;
    }
    for (const DavShareEntry *item = input; item != nullptr; item = item->next)
        apply_input_item(&run, item, merge);
    free_dav_share_list(input);
    return cycle_finish(&run);
}
