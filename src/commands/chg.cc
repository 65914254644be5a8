#include "commands/chg.h"

#include <cstring>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/text_field.h"
#include "cycle/regeneration.h"

// Entries follow the folder only while it is still there under its old
// path, and only to a place that can be shared at all.
static void move_entries(DavShareEntry *entries, const char *old_path, const char *new_path) {
    if (access(old_path, F_OK) != 0 || !is_shareable_path(new_path)) return;
    size_t old_length = strlen(old_path);
    for (DavShareEntry *entry = entries; entry != nullptr; entry = entry->next) {
        if (entry->path[0] == '\0' || strncmp(entry->path, old_path, old_length) != 0) continue;
        copy_text(entry->path, new_path);
    }
}

int webdav_chg(const char *old_argument, const char *new_argument) {
    char old_path[DAV_TEXT_WIDTH];
    char new_path[DAV_TEXT_WIDTH];
    // No entry path is that long, and a cut new path would point elsewhere.
    if (copy_text(old_path, old_argument) != 0 || copy_text(new_path, new_argument) != 0)
        return -1;
    CycleRun run;
    if (cycle_begin(&run, start_variant(), -1) < 0) return -1;
    move_entries(run.entries, old_path, new_path);
    return cycle_finish(&run);
}
