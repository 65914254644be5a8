#include "commands/del.h"

#include <cstdlib>
#include <cstring>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"
#include "base/text_field.h"
#include "cycle/regeneration.h"

// No link on the way into the USB folder is followed.
static void remove_usb_marker(const char *path) {
    int dir_fd = open_dir_no_links(path);
    if (dir_fd == -1) return;
    unlinkat(dir_fd, USB_MARKER, 0);
    close(dir_fd);
}

// The list keeps at least one entry: the only entry is emptied, not freed.
static void remove_entry(DavShareEntry **entries, DavShareEntry *doomed) {
    if (doomed == *entries) {
        if (doomed->next == nullptr) {
            memset(doomed, 0, sizeof *doomed);
            return;
        }
        *entries = doomed->next;
    } else {
        DavShareEntry *previous = *entries;
        while (previous->next != doomed) previous = previous->next;
        previous->next = doomed->next;
    }
    free(doomed);
}

int webdav_del(const char *given_path) {
    char path[512];
    if (copy_text(path, given_path) != 0) return -1;  // no entry has so long a path
    bool usb = is_usb_path(path);
    if (usb) remove_usb_marker(path);

    CycleVariant variant = editing_variant();
    variant.writer = WRITE_CHOSEN_DIRECTORIES;
    CycleRun run;
    if (cycle_begin(&run, variant, -1) < 0) return -1;
    DavShareEntry *found = run.entries;
    while (found != nullptr && (found->path[0] == '\0' || strcmp(found->path, path) != 0))
        found = found->next;
    if (found == nullptr && !usb) return cycle_abort(&run);
    if (found != nullptr) {
        add_volume_prefix(path, run.volume_dirs);
        remove_entry(&run.entries, found);
    }
    return cycle_finish(&run);
}
