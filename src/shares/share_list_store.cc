#include "shares/share_list_store.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <initializer_list>
#include <fcntl.h>
#include <syslog.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/memory_file.h"
#include "base/safe_file.h"
#include "base/text_field.h"
#include "platform/volume_lib.h"
#include "shares/share_list_layout.h"
#include "shares/xml_helpers.h"

namespace {

// Whether `entry` goes to the list of `directory`, and then its escaped name
// and its escaped path less the volume prefix. Texts that do not escape
// within the buffer are left out rather than written cut. -1: the existence
// of its folder could not be told.
int item_texts(const DavShareEntry *entry, const char *directory, char *name_out, char *path_out) {
    if (entry->path[0] == '\0' || strncmp(entry->path, directory, strlen(directory)) != 0) return 0;
    int exists = path_exists(entry->path);
    if (exists <= 0) return exists;
    char path[XML_ESCAPE_WIDTH];
    if (escape_xml_text(entry->shared_name, name_out) != 0) return 0;
    if (escape_xml_text(entry->path, path) != 0) return 0;
    size_t length = strlen(path);
    size_t dropped = length < VOLUME_PREFIX_LENGTH ? length : VOLUME_PREFIX_LENGTH;
    copy_text_field(path_out, XML_ESCAPE_WIDTH, path + dropped);
    return 1;
}

// The items go to their own stream first: the count stands before them.
int build_list_text(ListWrite *write, const char *directory, MemoryFile *text, int *count) {
    MemoryFile items;
    if (memory_file_open(&items) != 0 || memory_file_open(text) != 0) {
        memory_file_free(&items);
        return note_failure(write->failure, "cannot make room for the list of", directory, ENOMEM);
    }
    char name[XML_ESCAPE_WIDTH];
    char path[XML_ESCAPE_WIDTH];
    *count = 0;
    for (const DavShareEntry *entry = write->entries; entry != nullptr; entry = entry->next) {
        int wanted = item_texts(entry, directory, name, path);
        if (wanted < 0) {
            memory_file_free(&items);
            return note_failure(write->failure, "cannot tell whether this folder exists:", entry->path, errno);
        }
        if (wanted == 0) continue;
        ++*count;
        const char *const *parts = LAYOUT_ITEM_PARTS;
        fprintf(items.stream, "%s%s%s%s%s%d%s%d%s", parts[0], name, parts[1], path, parts[2], entry->RW,
                parts[3], entry->enable, parts[4]);
    }
    bool whole = memory_file_close(&items) == 0;
    const char *const *head = LAYOUT_HEAD_PARTS;
    fprintf(text->stream, "%s%s%d%s%d%s", LAYOUT_OPEN, head[0], *count, head[1], write->allen, head[2]);
    fwrite(items.text, 1, items.length, text->stream);
    fputs(LAYOUT_CLOSE, text->stream);
    memory_file_free(&items);
    if (memory_file_close(text) == 0 && whole) return 0;
    memory_file_free(text);
    return note_failure(write->failure, "cannot make room for the list of", directory, ENOMEM);
}

// The text in the run's own folder, under the staged name the volume library
// is to give it.
int write_staging_copy(ListWrite *write, const char *staged_name, const MemoryFile &text,
                       char (&file)[64]) {
    if (write->staging_dir[0] == '\0') {
        copy_text(write->staging_dir, "/tmp/davsync.XXXXXX");
        if (mkdtemp(write->staging_dir) == nullptr) {
            write->staging_dir[0] = '\0';
            return note_failure(write->failure, "cannot make a folder in", "/tmp", errno);
        }
    }
    format_text_field(file, sizeof file, "%s/%s", write->staging_dir, staged_name);
    int fd = open(file, O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (fd != -1 && write_all(fd, text.text, text.length) == 0 && close(fd) == 0) return 0;
    int error = errno;
    if (fd != -1) close(fd);
    return note_failure(write->failure, "cannot write", file, error);
}

bool is_unchanged(const StoredList *stored, const MemoryFile &text) {
    return stored != nullptr && stored->state == FileState::read &&
           stored->bytes.length == text.length && memcmp(stored->bytes.data, text.text, text.length) == 0;
}

int stage_on_volume(ListWrite *write, const char *volume_dir, bool iso, const MemoryFile &text,
                    int count) {
    char location[4096];
    char staged[4096];
    if (list_location(volume_dir, iso, location) != 0 || staged_path_of(location, staged, sizeof staged) != 0)
        return note_failure(write->failure, "cannot make room for the list of", volume_dir, ENOMEM);
    const StoredList *stored = find_stored_list(write->stored, location);
    if (stored != nullptr && stored->kept) {
        if (count == 0) return 0;
        return note_failure(write->failure, "cannot store entries in a list left as it is:", location, 0);
    }
    if (is_unchanged(stored, text)) return 0;
    const char *staged_name = strrchr(staged, '/') + 1;
    char file[64];
    if (write_staging_copy(write, staged_name, text, file) != 0) return -1;
    char *library_place = getDataLocationByVolume(staged_name, volume_dir);
    bool beside = library_place != nullptr && strcmp(library_place, staged) == 0;
    free(library_place);
    if (!beside) return note_failure(write->failure, "cannot stage beside", location, EINVAL);
    if (saveDataToHiddenByVolume(file, volume_dir) != 0)
        return note_failure(write->failure, "cannot stage", staged, errno);
    if (change_set_add(write->changes, CHANGE_REPLACE, location) != 0)
        return note_failure(write->failure, "cannot make room for the change of", location, ENOMEM);
    return 0;
}

int stage_directory(ListWrite *write, const char *directory) {
    bool iso = is_iso_path(directory);
    if (!iso) {
        int exists = path_exists(directory);
        if (exists < 0) return note_failure(write->failure, "cannot tell whether this folder exists:", directory, errno);
        if (exists == 0) return 0;
    }
    MemoryFile text;
    int count = 0;
    if (build_list_text(write, directory, &text, &count) != 0) return -1;
    int result = 0;
    if (!iso) result = stage_on_volume(write, directory, false, text, count);
    for (const VolumeEntry *volume = write->volumes; iso && volume != nullptr && result == 0; volume = volume->next)
        if (volume->mount_dir[0] != '\0') result = stage_on_volume(write, volume->mount_dir, true, text, count);
    memory_file_free(&text);
    return result;
}

}  // namespace

int stage_share_lists(ListWrite *write, const PathNode *directories) {
    for (const PathNode *node = directories; node != nullptr; node = node->next)
        if (node->path[0] != '\0' && stage_directory(write, node->path) != 0) return -1;
    return 0;
}

void end_list_staging(ListWrite *write) {
    if (write->staging_dir[0] == '\0') return;
    int tmp_fd = open("/tmp", O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    if (tmp_fd == -1 || remove_tree_at(tmp_fd, write->staging_dir + strlen("/tmp/")) != 0)
        log_event(LOG_WARNING, "%s: cannot remove %s: %m", write->command, write->staging_dir);
    if (tmp_fd != -1) close(tmp_fd);
    write->staging_dir[0] = '\0';
}

int discard_staged_lists(const PathNode *directories, RunFailure *failure) {
    static const char *const LEFTOVERS[] = {".lighty.xml.davsync.", ".lighty_iso.xml.davsync.",
                                            "lighty.xml.", "lighty_iso.xml."};
    int removed = 0;
    for (const PathNode *node = directories; node != nullptr; node = node->next) {
        if (node->path[0] == '\0') continue;
        for (bool iso : {false, true}) {  // the volume list, then the iso copy
            char location[4096];
            if (list_location(node->path, iso, location) != 0)
                return note_failure(failure, "cannot make room for the list of", node->path, ENOMEM);
            int staged = remove_staged(location);
            if (staged < 0) return note_failure(failure, "cannot remove what was staged beside", location, errno);
            removed += staged;
        }
        char location[4096];
        list_location(node->path, false, location);
        *strrchr(location, '/') = '\0';
        int swept = remove_stale_temporaries(location, LEFTOVERS, 4);
        if (swept < 0) return note_failure(failure, "cannot clear", location, errno);
        removed += swept;
    }
    return removed;
}
