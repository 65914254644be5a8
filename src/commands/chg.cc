#include "commands/chg.h"

#include <cerrno>
#include <cstring>
#include <syslog.h>

#include "base/appliance_paths.h"
#include "base/file_read.h"
#include "base/text_field.h"
#include "cycle/regeneration.h"

// Entries follow the folder only while it is still there under its old
// path, and only to a place that can be shared at all.
static int move_entries(CycleRun *run, const char *old_path, const char *new_path) {
    int exists = path_exists(old_path);
    if (exists < 0) return note_failure(&run->failure, "cannot tell whether this folder exists:", old_path, errno);
    if (exists == 0 || !is_shareable_path(new_path)) return 0;
    size_t old_length = strlen(old_path);
    for (DavShareEntry *entry = run->entries; entry != nullptr; entry = entry->next) {
        if (entry->path[0] == '\0' || strncmp(entry->path, old_path, old_length) != 0) continue;
        copy_text(entry->path, new_path);
    }
    return 0;
}

int webdav_chg(const char *old_argument, const char *new_argument) {
    char old_path[DAV_TEXT_WIDTH];
    char new_path[DAV_TEXT_WIDTH];
    // No entry path is that long, and a cut new path would point elsewhere.
    if (copy_text(old_path, old_argument) != 0 || copy_text(new_path, new_argument) != 0) {
        log_event(LOG_WARNING, "chg: refused a path longer than %d bytes", DAV_TEXT_WIDTH - 1);
        return -1;
    }
    CycleRun run;
    if (cycle_begin(&run, CYCLE_CHG) < 0) return -1;
    if (move_entries(&run, old_path, new_path) != 0) return cycle_abort(&run);
    return cycle_finish(&run);
}
