#include "shares/share_lists.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <syslog.h>

#include "base/appliance_paths.h"
#include "base/record_list.h"
#include "base/text_field.h"
#include "platform/volume_lib.h"
#include "shares/share_list_reader.h"

namespace {

struct ListLoad {
    const char *command;
    RunFailure *failure;
    const char *only_path;
    StoredList **tail;  // where the next note goes; null: nothing is noted
};

enum LoadOutcome { LIST_FAILED = -1, LIST_UNUSED = 0, LIST_READ = 1 };

void refused(const ListLoad *load, StoredList *note, const char *why) {
    note->kept = true;
    log_event(LOG_WARNING, "%s: cannot use %s: %s", load->command, note->location, why);
}

// Reads one list file and, with `parse`, its entries into `target`.
LoadOutcome load_one(ListLoad *load, const char *volume_dir, bool iso, DavShareEntry *target,
                     bool parse) {
    StoredList *note = new_zeroed_record<StoredList>();
    if (note == nullptr || list_location(volume_dir, iso, note->location) != 0) {
        free(note);
        note_failure(load->failure, "cannot make room for the list of", volume_dir, ENOMEM);
        return LIST_FAILED;
    }
    copy_text(note->volume_dir, volume_dir);
    note->iso = iso;
    note->state = read_whole_file(note->location, &note->bytes, READ_NO_LINK);
    if (note->state == FileState::failed) {
        note_failure(load->failure, "cannot read", note->location, errno);
        free(note);
        return LIST_FAILED;
    }
    LoadOutcome outcome = LIST_UNUSED;
    if (note->state == FileState::not_regular) {
        refused(load, note, "it is not a regular file");
    } else if (note->state == FileState::read && parse) {
        int allen = 0;
        ListRequest request = {ListKind::volume_list, iso ? ISO_DIR : volume_dir, load->only_path};
        ListParse parsed = parse_share_list(note->bytes.data, note->bytes.length, request, target, &allen);
        if (parsed == ListParse::read) outcome = LIST_READ;
        else if (parsed == ListParse::refused) refused(load, note, "it is not a share list this tool reads");
        else outcome = LIST_FAILED, note_failure(load->failure, "cannot make room for the entries of", note->location, ENOMEM);
    }
    if (load->tail == nullptr || outcome == LIST_FAILED) {
        free_file_bytes(&note->bytes);
        free(note);
    } else {
        *load->tail = note;
        load->tail = &note->next;
    }
    return outcome;
}

bool may_hold(const char *directory, const char *only_path) {
    return only_path == nullptr || strncmp(only_path, directory, strlen(directory)) == 0;
}

// The volume lists: a target whose list contributed nothing takes the next.
int load_volume_lists(ListLoad *load, const VolumeEntry *volumes, DavShareEntry *head) {
    DavShareEntry *target = head;
    int result = 0;
    for (const VolumeEntry *volume = volumes; volume != nullptr && result == 0; volume = volume->next) {
        if (volume->mount_dir[0] == '\0' || !may_hold(volume->mount_dir, load->only_path)) continue;
        if (target == nullptr) target = new_dav_share_entry();
        if (target == nullptr) return note_failure(load->failure, "cannot make room for the entries of", volume->mount_dir, ENOMEM);
        LoadOutcome outcome = load_one(load, volume->mount_dir, false, target, true);
        if (outcome == LIST_FAILED) result = -1;
        if (outcome != LIST_READ) continue;
        if (target != head) last_entry(head)->next = target;
        target = nullptr;
    }
    if (target != head) free_dav_share_list(target);
    return result;
}

// The first iso copy that reads counts; those that do not are kept only when
// none reads, since otherwise their entries are all in the one read.
int load_iso_list(ListLoad *load, const VolumeEntry *volumes, DavShareEntry *head) {
    if (!may_hold(ISO_DIR, load->only_path)) return 0;
    StoredList **first_note = load->tail;
    DavShareEntry *read = nullptr;
    for (const VolumeEntry *volume = volumes; volume != nullptr; volume = volume->next) {
        if (volume->mount_dir[0] == '\0') continue;
        if (read != nullptr && load->tail == nullptr) break;
        DavShareEntry *target = read == nullptr ? new_dav_share_entry() : nullptr;
        if (read == nullptr && target == nullptr)
            return note_failure(load->failure, "cannot make room for the entries of", volume->mount_dir, ENOMEM);
        LoadOutcome outcome = load_one(load, volume->mount_dir, true, target, read == nullptr);
        if (outcome == LIST_READ) read = target;
        else free_dav_share_list(target);
        if (outcome == LIST_FAILED) {
            free_dav_share_list(read);
            return -1;
        }
    }
    if (read == nullptr) return 0;
    last_entry(head)->next = read;
    for (StoredList *note = first_note != nullptr ? *first_note : nullptr; note != nullptr; note = note->next)
        note->kept = false;
    return 0;
}

int load(ListLoad *load, const VolumeEntry *volumes, DavShareEntry *head) {
    if (volumes == nullptr || volumes->mount_dir[0] == '\0')
        return note_failure(load->failure, "no data volume is mounted", "", 0);
    head->next = nullptr;
    if (load_volume_lists(load, volumes, head) != 0) return -1;
    return load_iso_list(load, volumes, head);
}

}  // namespace

int list_location(const char *volume_dir, bool iso, char (&location)[4096]) {
    char *named = getDataLocationByVolume(iso ? ISO_LIST : VOLUME_LIST, volume_dir);
    int result = named != nullptr ? copy_text(location, named) : -1;
    free(named);
    return result;
}

int load_share_lists(const VolumeEntry *volumes, DavShareEntry *head, StoredList **stored,
                     const char *command, RunFailure *failure) {
    *stored = nullptr;
    ListLoad state = {command, failure, nullptr, stored};
    return load(&state, volumes, head);
}

int load_share_lists_for(const VolumeEntry *volumes, DavShareEntry *head, const char *path,
                         const char *command, RunFailure *failure) {
    ListLoad state = {command, failure, path, nullptr};
    return load(&state, volumes, head);
}

const StoredList *find_stored_list(const StoredList *stored, const char *location) {
    for (; stored != nullptr; stored = stored->next)
        if (strcmp(stored->location, location) == 0) return stored;
    return nullptr;
}

void free_stored_lists(StoredList *stored) {
    while (stored != nullptr) {
        StoredList *next = stored->next;
        free_file_bytes(&stored->bytes);
        free(stored);
        stored = next;
    }
}
