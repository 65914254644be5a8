#include "commands/do_merge.h"

#include <cerrno>
#include <cstring>

#include "base/appliance_paths.h"
#include "base/file_read.h"
#include "base/text_field.h"
#include "cycle/regeneration.h"
#include "shares/usb_marks.h"
#include "shares/share_list_reader.h"

// Anything that is not a volume folder or below one (a path of "/" would
// publish the whole file system) is no input at all.
static bool is_input_item(const DavShareEntry *item) {
    return item->path[0] != '\0' && is_shareable_path(item->path);
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

static int apply_input_item(CycleRun *run, const DavShareEntry *item, int merge) {
    if (!is_input_item(item)) return 0;
    char path[DAV_TEXT_WIDTH];
    copy_text(path, item->path);
    append_volume_root_slash(path, sizeof path);
    if (is_usb_path(path)) return stage_usb_mark(&run->changes, item->path, true, run->variant->command, &run->failure);

    DavShareEntry *existing = find_entry_by_path(run->entries, path);
    if (existing != nullptr) {
        int kept_rw = existing->RW;
        set_entry(existing, item, path);
        if (merge) existing->RW = kept_rw;
    } else if (run->entries->path[0] != '\0') {
        DavShareEntry *added = new_dav_share_entry();
        if (added == nullptr) return note_failure(&run->failure, "cannot make room for", path, ENOMEM);
        set_entry(added, item, path);
        insert_by_volume(&run->entries, added);
    } else {
        set_entry(run->entries, item, path);
    }
    add_volume_prefix(path, run->volume_dirs);
    return 0;
}

// The input file read whole; what it holds, into `input`.
static int read_input(CycleRun *run, const char *file_name, DavShareEntry *input) {
    FileBytes bytes = {};
    FileState state = read_whole_file(file_name, &bytes, READ_PLAIN);
    if (state == FileState::failed) return note_failure(&run->failure, "cannot read", file_name, errno);
    if (state != FileState::read) return note_failure(&run->failure, "there is no input file", file_name, 0);
    ListRequest request = {ListKind::input_file, "", nullptr};
    ListParse parsed = parse_share_list(bytes.data, bytes.length, request, input, nullptr);
    free_file_bytes(&bytes);
    if (parsed == ListParse::refused)
        return note_failure(&run->failure, "the input is no share list:", file_name, 0);
    if (parsed != ListParse::read) return note_failure(&run->failure, "cannot make room for", file_name, ENOMEM);
    return 0;
}

int webdav_do_merge(const char *file_name, int merge) {
    CycleRun run;
    if (cycle_begin(&run, merge ? CYCLE_MERGE : CYCLE_DO) < 0) return -1;
    DavShareEntry *input = new_dav_share_entry();
    int result = input != nullptr ? read_input(&run, file_name, input)
                                  : note_failure(&run.failure, "cannot make room for", file_name, ENOMEM);
    for (const DavShareEntry *item = input; item != nullptr && result == 0; item = item->next)
        result = apply_input_item(&run, item, merge);
    free_dav_share_list(input);
    return result == 0 ? cycle_finish(&run) : cycle_abort(&run);
}
