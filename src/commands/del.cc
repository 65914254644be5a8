#include "commands/del.h"

#include <cstdlib>
#include <cstring>
#include <syslog.h>

#include "base/appliance_paths.h"
#include "base/text_field.h"
#include "cycle/regeneration.h"
#include "shares/usb_marks.h"

// The list keeps at least one entry: the only entry is emptied, not freed.
static void remove_entry(DavShareEntry **entries, DavShareEntry *doomed) {
    if (doomed == *entries) {
        if (doomed->next == nullptr) {
            empty_entry(doomed);
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
    char path[DAV_TEXT_WIDTH];
    if (copy_text(path, given_path) != 0) {
        log_event(LOG_WARNING, "del: refused a path longer than %d bytes", DAV_TEXT_WIDTH - 1);
        return -1;
    }
    bool usb = is_usb_path(path);
    CycleRun run;
    if (cycle_begin(&run, CYCLE_DEL) < 0) return -1;
    if (usb && stage_usb_mark(&run.changes, path, false, run.variant->command, &run.failure) != 0)
        return cycle_abort(&run);
    DavShareEntry *found = find_entry_by_path(run.entries, path);
    if (found == nullptr && !usb) {
        note_failure(&run.failure, "no share is published at", path, 0);
        return cycle_abort(&run);
    }
    if (found != nullptr) {
        add_volume_prefix(path, run.volume_dirs);
        remove_entry(&run.entries, found);
    }
    return cycle_finish(&run);
}
