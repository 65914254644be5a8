#include "output/usb_shares.h"

#include <cstring>
#include <dirent.h>
#include <mntent.h>
#include <sys/file.h>
#include <sys/stat.h>

#include "base/shell_command.h"
#include "base/text_field.h"
#include "output/conf_writer.h"
#include "output/shell_escape.h"
#include "output/webdav_note.h"
#include "shares/share_catalogue.h"

static const char USB_DIR[] = "/mnt/USB";
static const size_t USB_DIR_PREFIX_LENGTH = 9;  // "/mnt/USB/"
static const int SHARED_NAME_WIDTH = 512;
static const int FILE_LINE_WIDTH = 1024;
static const int NAME_FIELD_WIDTH = 256;

int is_mount_point(const char *path) {
    FILE *table = setmntent("/etc/mtab", "r");
    if (table == nullptr) return -1;
    if (flock(fileno(table), LOCK_EX) != 0) {
        endmntent(table);
        return -1;
    }
    int result = -1;
    for (const struct mntent *entry = getmntent(table); entry != nullptr && result != 0;
         entry = getmntent(table))
        if (strcmp(entry->mnt_dir, path) == 0) result = 0;
    flock(fileno(table), LOCK_UN);
    endmntent(table);
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

int lookup_shared_name(const char *dir_name, char *result) {
    return lookup_shared_name_in("/etc/shared_name", dir_name, result);
}

int lookup_shared_name_in(const char *file_path, const char *dir_name, char *result) {
    FILE *names = fopen(file_path, "r");
    if (names == nullptr) return -1;
    if (flock(fileno(names), LOCK_EX) != 0) {
        fclose(names);
        return -1;
    }
    char line[FILE_LINE_WIDTH] = {};
    char name[NAME_FIELD_WIDTH] = {};
    while (fgets(line, sizeof line, names) != nullptr) {
        if (strstr(line, dir_name) == nullptr) continue;
        char value[NAME_FIELD_WIDTH] = {};
        sscanf(line, "%255[^ ] = %255[^\n]", name, value);
        break;
    }
    flock(fileno(names), LOCK_UN);
    fclose(names);
    copy_text_field(result, SHARED_NAME_WIDTH, name);
    return 0;
}

static bool volume_file_path(const char *volume, const char *file_name,
                             char (&path)[FILE_LINE_WIDTH]) {
    return format_text_field(path, sizeof path, "%s/%s", volume, file_name) == 0;
}

static bool has_file(const char *volume, const char *file_name) {
    char path[FILE_LINE_WIDTH];
    return volume_file_path(volume, file_name, path) && path_exists(path);
}

static void find_shared_name(const char *volume, char (&name)[SHARED_NAME_WIDTH]) {
    memset(name, 0, sizeof name);
    lookup_shared_name(volume + USB_DIR_PREFIX_LENGTH, name);
}

// Unescaped on the command line, so both texts must be ones the shell takes
// literally.
static void make_usb_link(const char *volume, const char *shared_name) {
    if (!is_link_name(shared_name)) return;
    if (!is_shell_literal(volume) || !is_shell_literal(shared_name)) return;
    char command[FILE_LINE_WIDTH];
    if (format_text_field(command, sizeof command, "ln -s %s /usr/local/apache2_dav/webdav/%s",
                          volume, shared_name) < 0)
        return;
    run_shell_command(command);
}

static void write_volume_section(FILE *conf, const char *volume, const char *shared_name) {
    char catalogue_path[FILE_LINE_WIDTH];
    volume_file_path(volume, ".smbm.xml", catalogue_path);
    if (!path_exists(catalogue_path)) {
        write_share_section(conf, shared_name, true, nullptr);
        return;
    }
    ShareRecord *rules = new_share_record();
    if (rules == nullptr) return;
    read_share_catalogue_file(rules, catalogue_path);
    write_share_section(conf, shared_name, true, rules);
    free_share_catalogue(rules);
}

static void append_volume(FILE *conf, const char *volume, PathNode *published) {
    char shared_name[SHARED_NAME_WIDTH];
    find_shared_name(volume, shared_name);
    // A volume whose name was not found would alias the server's root.
    if (shared_name[0] == '\0' || !is_conf_safe_name(shared_name)) return;
    if (path_list_add(shared_name, published) < 0) return;
    write_volume_section(conf, volume, shared_name);
    make_usb_link(volume, shared_name);
}

static bool is_marked_volume(const PathNode *node) {
    return node->path[0] != '\0' && has_file(node->path, ".davconf");
}

static int append_note_lines(const PathNode *volumes) {
    FILE *note = open_locked(WEBDAV_NOTE_FILE, "a");
    if (note == nullptr) return -1;
    for (const PathNode *node = volumes; node != nullptr; node = node->next) {
        if (!is_marked_volume(node)) continue;
        char shared_name[SHARED_NAME_WIDTH];
        find_shared_name(node->path, shared_name);
        write_note_line(note, shared_name);
    }
    close_locked(note);
    return 0;
}

int append_usb_shares(PathNode *published) {
    struct stat status;
    if (stat(USB_DIR, &status) != 0) return -1;
    PathNode *volumes = scan_mounted_dirs(USB_DIR);
    if (volumes == nullptr) return -1;
    FILE *conf = open_locked(DAV_CONF_FILE, "a");
    if (conf == nullptr) {
        free_path_list(volumes);
        return -1;
    }
    for (const PathNode *node = volumes; node != nullptr; node = node->next)
        if (is_marked_volume(node)) append_volume(conf, node->path, published);
    close_locked(conf);
    int result = append_note_lines(volumes);
    free_path_list(volumes);
    return result;
}
