#include "output/usb_shares.h"

#include <cstring>
#include <dirent.h>
#include <mntent.h>
#include <sys/stat.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"
#include "base/text_field.h"
#include "output/conf_section.h"
#include "output/webdav_note.h"
#include "shares/share_catalogue.h"

static const int SHARED_NAME_WIDTH = 512;
static const int FILE_LINE_WIDTH = 1024;
static const int NAME_FIELD_WIDTH = 256;

int is_mount_point(const char *path) {
    FILE *table = open_locked_for_reading("/etc/mtab");
    if (table == nullptr) return -1;
    int result = -1;
    for (const struct mntent *entry = getmntent(table); entry != nullptr && result != 0;
         entry = getmntent(table))
        if (strcmp(entry->mnt_dir, path) == 0) result = 0;
    close_locked(table);
    return result;
}

static bool is_usable_entry(const char *path) {
    struct stat status;
    if (stat(path, &status) == 0 && !S_ISDIR(status.st_mode)) return false;
    return is_mount_point(path) == 0;
}

PathNode *scan_mounted_dirs(const char *directory) {
    PathNode *head = new_path_node();
    if (head == nullptr) return nullptr;
    DIR *listing = opendir(directory);
    if (listing == nullptr) {
        free_path_list(head);
        return nullptr;
    }
    PathNode *open_slot = head;
    for (const struct dirent *entry = readdir(listing); entry != nullptr;
         entry = readdir(listing)) {
        if (strcmp(entry->d_name, ".") == 0 || strcmp(entry->d_name, "..") == 0) continue;
        char path[PATH_NODE_WIDTH];
        if (format_text_field(path, sizeof path, "%s/%s", directory, entry->d_name) < 0) continue;
        if (!is_usable_entry(path)) continue;
        PathNode *fresh = new_path_node();
        if (fresh == nullptr) break;
        copy_text(open_slot->path, path);
        open_slot->next = fresh;
        open_slot = fresh;
    }
    closedir(listing);
    return head;
}

int lookup_shared_name_in(const char *file_path, const char *dir_name, char *result) {
    FILE *names = open_locked_for_reading(file_path);
    if (names == nullptr) return -1;
    char line[FILE_LINE_WIDTH] = {};
    char name[NAME_FIELD_WIDTH] = {};
    while (fgets(line, sizeof line, names) != nullptr) {
        if (strstr(line, dir_name) == nullptr) continue;
        char value[NAME_FIELD_WIDTH] = {};
        sscanf(line, "%255[^ ] = %255[^\n]", name, value);
        break;
    }
    close_locked(names);
    copy_text_field(result, SHARED_NAME_WIDTH, name);
    return 0;
}

int lookup_shared_name(const char *dir_name, char *result) {
    return lookup_shared_name_in("/etc/shared_name", dir_name, result);
}

static bool volume_file_path(const char *volume, const char *file_name,
                             char (&path)[FILE_LINE_WIDTH]) {
    return format_text_field(path, sizeof path, "%s/%s", volume, file_name) == 0;
}

static bool has_file(const char *volume, const char *file_name) {
    char path[FILE_LINE_WIDTH];
    struct stat status;
    return volume_file_path(volume, file_name, path) && lstat(path, &status) == 0;
}

static void find_shared_name(const char *volume, char (&name)[SHARED_NAME_WIDTH]) {
    memset(name, 0, sizeof name);
    lookup_shared_name(usb_folder_name(volume), name);
}

static void write_volume_section(ConfBuild *build, const char *volume, const char *shared_name) {
    char catalogue_path[FILE_LINE_WIDTH];
    if (!volume_file_path(volume, ".smbm.xml", catalogue_path) || !has_file(volume, ".smbm.xml")) {
        write_share_section(build->conf, &build->groups, shared_name, true, nullptr);
        return;
    }
    ShareRecord *rules = new_share_record();
    if (rules == nullptr) return;
    read_share_catalogue_file(rules, catalogue_path);
    write_share_section(build->conf, &build->groups, shared_name, true, rules);
    free_share_catalogue(rules);
}

static void append_volume(ConfBuild *build, const char *volume) {
    char shared_name[SHARED_NAME_WIDTH];
    find_shared_name(volume, shared_name);
    // A volume whose name was not found would alias the server's root.
    if (shared_name[0] == '\0' || !is_conf_safe_name(shared_name)) return;
    if (publish_name(build, shared_name) < 0) return;
    write_volume_section(build, volume, shared_name);
    request_link(&build->links, shared_name, volume);
}

static bool is_marked_volume(const PathNode *node) {
    return node->path[0] != '\0' && has_file(node->path, USB_MARKER);
}

int append_usb_shares(ConfBuild *build) {
    struct stat status;
    if (stat(USB_DIR, &status) != 0) return -1;
    PathNode *volumes = scan_mounted_dirs(USB_DIR);
    if (volumes == nullptr) return -1;
    for (const PathNode *node = volumes; node != nullptr; node = node->next)
        if (is_marked_volume(node)) append_volume(build, node->path);
    // Every marked volume is noted, also one whose name had a section already.
    build->note_wanted = true;
    for (const PathNode *node = volumes; node != nullptr; node = node->next) {
        if (!is_marked_volume(node)) continue;
        char shared_name[SHARED_NAME_WIDTH];
        find_shared_name(node->path, shared_name);
        write_note_line(build->note.stream, shared_name);
    }
    free_path_list(volumes);
    return 0;
}
