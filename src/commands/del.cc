#include "commands/del.h"

#include <cstdlib>
#include <cstring>
#include <unistd.h>

#include "base/text_field.h"
#include "cycle/regeneration.h"

static const CycleVariant DEL_VARIANT = {
    /*lock_taken_first=*/false, /*wait_start_lock=*/false, /*clear_start_lock=*/false,
    /*read_enable_flag=*/true, RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG,
    WRITE_CHOSEN_DIRECTORIES, /*prepare_link_dir=*/false, /*remove_links_after_conf=*/false,
};

static void remove_usb_marker(const char *path) {
    char marker[512 + 16];
    if (format_text_field(marker, sizeof marker, "%s/.davconf", path) != 0) return;
    if (access(marker, F_OK) == 0) unlink(marker);
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
    bool usb = strncmp(path, "/mnt/USB/", 9) == 0;
    if (usb) remove_usb_marker(path);

    CycleRun run;
    if (cycle_begin(&run, &DEL_VARIANT, -1) < 0) return -1;
    DavShareEntry *found = run.entries;
    while (found != nullptr && (found->path[0] == '\0' || strcmp(found->path, path) != 0))
        found = found->next;
    if (found == nullptr && !usb) return cycle_abort(&run);
    if (found != nullptr) {
        char prefix[PATH_NODE_WIDTH];
        volume_prefix(path, prefix);
        path_list_add(prefix, run.volume_dirs);
        remove_entry(&run.entries, found);
    }
    return cycle_finish(&run);
}
