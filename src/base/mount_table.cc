#include "base/mount_table.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>

#include "base/file_read.h"
#include "base/record_list.h"

static const char MOUNT_TABLE_FILE[] = "/etc/mtab";

static bool is_blank(char c) { return c == ' ' || c == '\t'; }

// The escapes getmntent(3) decodes; anything else stays as it is.
static size_t decode_escape(const char *at, char *out) {
    static const struct { const char *text; char decoded; } ESCAPES[] = {
        {"\\040", ' '}, {"\\011", '\t'}, {"\\012", '\n'}, {"\\134", '\\'}, {"\\\\", '\\'}};
    for (const auto &escape : ESCAPES) {
        size_t length = strlen(escape.text);
        if (strncmp(at, escape.text, length) == 0) {
            *out = escape.decoded;
            return length;
        }
    }
    *out = *at;
    return 1;
}

// The second field of the line [line, end), decoded into a new text; null
// when the line has none (or memory ran out: *failed is then set).
static char *mount_dir_of(const char *line, const char *end, bool *failed) {
    const char *at = line;
    for (int field = 0; field < 2; ++field) {
        while (at < end && is_blank(*at)) ++at;
        if (at == end || (field == 0 && *at == '#')) return nullptr;
        if (field == 1) break;
        while (at < end && !is_blank(*at)) ++at;
    }
    const char *stop = at;
    while (stop < end && !is_blank(*stop)) ++stop;
    char *dir = static_cast<char *>(malloc(static_cast<size_t>(stop - at) + 1));
    if (dir == nullptr) {
        *failed = true;
        return nullptr;
    }
    size_t length = 0;
    while (at < stop) at += decode_escape(at, dir + length++);
    dir[length] = '\0';
    return dir;
}

static int parse_mount_table(const char *text, MountPoint **table_out) {
    *table_out = nullptr;
    MountPoint **tail = table_out;
    bool failed = false;
    for (const char *line = text; *line != '\0' && !failed;) {
        const char *end = line + strcspn(line, "\n");
        char *dir = mount_dir_of(line, end, &failed);
        if (dir != nullptr) {
            MountPoint *point = new_zeroed_record<MountPoint>();
            if (point == nullptr) {
                free(dir);
                failed = true;
                break;
            }
            point->dir = dir;
            *tail = point;
            tail = &point->next;
        }
        line = *end == '\n' ? end + 1 : end;
    }
    if (!failed) return 0;
    free_mount_table(*table_out);
    *table_out = nullptr;
    errno = ENOMEM;
    return -1;
}

int read_mount_table(MountPoint **table_out) {
    *table_out = nullptr;
    FileBytes bytes = {};
    FileState state = read_whole_file(MOUNT_TABLE_FILE, &bytes, READ_LOCKED);
    if (state == FileState::absent) return 0;
    if (state == FileState::not_regular) errno = EINVAL;
    if (state != FileState::read) return -1;
    // What follows a NUL byte is no text of the table.
    int result = parse_mount_table(bytes.data, table_out);
    free_file_bytes(&bytes);
    return result;
}

bool is_mount_dir(const MountPoint *table, const char *dir) {
    for (const MountPoint *point = table; point != nullptr; point = point->next)
        if (strcmp(point->dir, dir) == 0) return true;
    return false;
}

void free_mount_table(MountPoint *table) {
    while (table != nullptr) {
        MountPoint *next = table->next;
        free(table->dir);
        free(table);
        table = next;
    }
}
