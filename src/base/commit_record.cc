#include "base/commit_record.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/file_read.h"
#include "base/record_list.h"
#include "base/memory_file.h"
#include "base/safe_file.h"
#include "base/text_field.h"

namespace {

constexpr char RECORD_HEADER[] = "davsync change\n";
constexpr char RECORD_END[] = "end\n";
constexpr char STAGED_SUFFIX[] = ".davsync";
constexpr size_t NAME_WIDTH = 256;

// The folder and the last name of `path`.
int split_path(const char *path, char (&dir)[4096], char (&name)[NAME_WIDTH]) {
    const char *slash = strrchr(path, '/');
    if (slash == nullptr || slash[1] == '\0') return -1;
    size_t dir_length = slash == path ? 1 : static_cast<size_t>(slash - path);
    if (copy_text_prefix(dir, sizeof dir, path, dir_length) != 0) return -1;
    return copy_text(name, slash + 1);
}

int staged_name_of(const char *name, char (&staged)[NAME_WIDTH]) {
    return format_text_field(staged, sizeof staged, "%s%s%s", name[0] == '.' ? "" : ".", name,
                             STAGED_SUFFIX);
}

int rename_staged(int dir_fd, const char *name) {
    char staged[NAME_WIDTH];
    if (staged_name_of(name, staged) != 0) return errno = ENAMETOOLONG, -1;
    return renameat(dir_fd, staged, dir_fd, name);
}

// Markers live in folders of whoever plugged the volume in: no link on the
// way is followed. The other files live in the appliance's own folders.
int open_step_dir(const ChangeStep *step, const char *dir) {
    if (step->kind == CHANGE_REPLACE) return open(dir, O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    return open_dir_no_links(dir);
}

const char *step_action(char kind) {
    return kind == CHANGE_REPLACE ? "cannot store" : kind == CHANGE_MARK ? "cannot mark" : "cannot unmark";
}

// What a user can put in the way in a folder of theirs.
bool is_put_in_the_way(int error) {
    return error == EISDIR || error == ENOTDIR || error == ELOOP || error == EPERM || error == ENOTEMPTY ||
           error == EEXIST || error == EINVAL;
}

int apply_step(const ChangeStep *step, const char *command, RunFailure *failure) {
    char dir[4096];
    char name[NAME_WIDTH];
    if (split_path(step->path, dir, name) != 0)
        return note_failure(failure, "cannot store", step->path, ENAMETOOLONG);
    int dir_fd = open_step_dir(step, dir);
    int result = dir_fd;
    if (dir_fd != -1) {
        result = step->kind != CHANGE_UNMARK ? rename_staged(dir_fd, name)
                 : (unlinkat(dir_fd, name, 0) == 0 || errno == ENOENT) ? 0 : -1;
        if (result == 0) result = sync_dir(dir_fd);
        int error = errno;
        close(dir_fd);
        errno = error;
    }
    if (result == 0) return 0;
    // The staged file was renamed by an earlier attempt, or the volume or
    // folder went away since: there is nothing left to change there.
    if (errno == ENOENT) return 0;
    if (step->kind != CHANGE_REPLACE && is_put_in_the_way(errno)) {
        log_event(LOG_WARNING, "%s: passed over %s: %m", command, step->path);
        return 0;
    }
    return note_failure(failure, step_action(step->kind), step->path, errno);
}

int apply_steps(const ChangeStep *first, const char *command, RunFailure *failure) {
    for (const ChangeStep *step = first; step != nullptr; step = step->next)
        if (apply_step(step, command, failure) != 0) return -1;
    return 0;
}

// Header, then per step its kind, its path and a NUL, then the end line.
int record_text(const ChangeSet *set, MemoryFile *text) {
    if (memory_file_open(text) != 0) return -1;
    fputs(RECORD_HEADER, text->stream);
    for (const ChangeStep *step = set->first; step != nullptr; step = step->next) {
        fputc(step->kind, text->stream);
        fputs(step->path, text->stream);
        fputc('\0', text->stream);
    }
    fputs(RECORD_END, text->stream);
    return memory_file_close(text);
}

// Staged and renamed in like every other file: it exists whole or not at all.
int write_record(const ChangeSet *set, RunFailure *failure) {
    MemoryFile text;
    if (record_text(set, &text) != 0) {
        memory_file_free(&text);
        return note_failure(failure, "cannot make room for the change record", "", ENOMEM);
    }
    int result = stage_file(COMMIT_RECORD_FILE, text.text, text.length, 0600);
    int error = errno;
    memory_file_free(&text);
    if (result != 0)
        return note_failure(failure, "cannot write the change record", COMMIT_RECORD_FILE, error);
    ChangeStep place = {CHANGE_REPLACE, {}, nullptr};
    copy_text(place.path, COMMIT_RECORD_FILE);
    return apply_step(&place, "", failure);
}

// The steps of a record's text; -1 when it is no whole record.
int parse_record(const FileBytes &bytes, ChangeSet *set) {
    size_t header = sizeof RECORD_HEADER - 1, end = sizeof RECORD_END - 1;
    if (bytes.length < header + end || memcmp(bytes.data, RECORD_HEADER, header) != 0 ||
        memcmp(bytes.data + bytes.length - end, RECORD_END, end) != 0)
        return -1;
    const char *at = bytes.data + header;
    const char *stop = bytes.data + bytes.length - end;
    while (at < stop) {
        const char *nul = static_cast<const char *>(memchr(at, '\0', static_cast<size_t>(stop - at)));
        bool known = *at == CHANGE_REPLACE || *at == CHANGE_MARK || *at == CHANGE_UNMARK;
        if (nul == nullptr || !known || change_set_add(set, *at, at + 1) != 0) return -1;
        at = nul + 1;
    }
    return 0;
}

}  // namespace

int staged_path_of(const char *path, char *staged, size_t width) {
    char dir[4096];
    char name[NAME_WIDTH];
    char staged_name[NAME_WIDTH];
    if (split_path(path, dir, name) != 0 || staged_name_of(name, staged_name) != 0) return -1;
    return format_text_field(staged, width, "%s%s%s", dir, strcmp(dir, "/") == 0 ? "" : "/",
                             staged_name);
}

int change_set_add(ChangeSet *set, char kind, const char *path) {
    ChangeStep *step = new_zeroed_record<ChangeStep>();
    if (step == nullptr || copy_text(step->path, path) != 0) {
        free(step);
        return -1;
    }
    step->kind = kind;
    if (set->last != nullptr) set->last->next = step;
    else set->first = step;
    set->last = step;
    ++set->count;
    return 0;
}

void change_set_free(ChangeSet *set) {
    free_record_list(set->first);
    *set = ChangeSet{};
}

int commit_change_set(const ChangeSet *set, const char *command, RunFailure *failure, bool *committed) {
    *committed = false;
    if (set->first == nullptr) return 0;
    if (write_record(set, failure) != 0) {
        // Renamed in but not synced still counts: the next run will find it.
        struct stat status;
        *committed = lstat(COMMIT_RECORD_FILE, &status) == 0;
        if (!*committed) remove_staged(COMMIT_RECORD_FILE);
        return -1;
    }
    *committed = true;
    if (apply_steps(set->first, command, failure) != 0) return -1;
    // The change is whole; a record left behind would only be applied again,
    // which changes nothing.
    if (unlink(COMMIT_RECORD_FILE) != 0)
        log_event(LOG_WARNING, "%s: cannot remove the change record %s: %m", command, COMMIT_RECORD_FILE);
    return 0;
}

int roll_forward_recorded_change(const char *command, RunFailure *failure) {
    // A record not yet renamed into place belongs to a change never committed.
    if (remove_staged(COMMIT_RECORD_FILE) < 0)
        return note_failure(failure, "cannot remove what was staged beside", COMMIT_RECORD_FILE, errno);
    FileBytes bytes = {};
    FileState state = read_whole_file(COMMIT_RECORD_FILE, &bytes, READ_NO_LINK);
    if (state == FileState::absent) return 0;
    if (state == FileState::failed)
        return note_failure(failure, "cannot read the change record", COMMIT_RECORD_FILE, errno);
    ChangeSet set = {};
    bool whole = state == FileState::read && parse_record(bytes, &set) == 0;
    free_file_bytes(&bytes);
    int result = whole ? apply_steps(set.first, command, failure) : 0;
    if (result == 0 && unlink(COMMIT_RECORD_FILE) != 0 && errno != ENOENT)
        result = note_failure(failure, "cannot remove the change record", COMMIT_RECORD_FILE, errno);
    if (result == 0 && whole)
        log_event(LOG_NOTICE, "%s: rolled forward the change an interrupted run recorded (%d steps)",
                  command, set.count);
    else if (result == 0)
        log_event(LOG_WARNING, "%s: discarded an unreadable change record %s", command,
                  COMMIT_RECORD_FILE);
    change_set_free(&set);
    return result;
}

int remove_staged(const char *path) {
    char staged[4096];
    if (staged_path_of(path, staged, sizeof staged) != 0) return 0;
    if (unlink(staged) == 0) return 1;
    return errno == ENOENT || errno == ENOTDIR ? 0 : -1;
}
