#include "shares/usb_volumes.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/file_read.h"
#include "base/record_list.h"
#include "base/safe_file.h"
#include "base/text_field.h"

namespace {

constexpr char SHARED_NAME_FILE[] = "/etc/shared_name";
constexpr char VOLUME_CATALOGUE[] = ".smbm.xml";
constexpr size_t NAME_FIELD_WIDTH = 256;

struct UsbRead {
    const MountPoint *mounts;
    const ChangeSet *changes;
    RunFailure *failure;
    FileBytes names;      // /etc/shared_name, read on first need
    bool names_read;
    UsbVolume **tail;
};

bool is_absent_error(int error) { return error == ENOENT || error == ENOTDIR; }

// 1 when the name is there in the volume (no link followed), 0 when not, -1
// when that could not be told.
int has_file(int volume_fd, const char *name) {
    struct stat status;
    if (fstatat(volume_fd, name, &status, AT_SYMLINK_NOFOLLOW) == 0) return 1;
    return is_absent_error(errno) ? 0 : -1;
}

// The marker as this run's change leaves it, else as it is.
int is_marked(UsbRead *read, int volume_fd, const char *path) {
    char marker[PATH_NODE_WIDTH + 16];
    usb_marker_path(path, marker, sizeof marker);
    int pending = -1;
    for (const ChangeStep *step = read->changes->first; step != nullptr; step = step->next)
        if (strcmp(step->path, marker) == 0) pending = step->kind == CHANGE_MARK ? 1 : 0;
    if (pending >= 0) return pending;
    int marked = has_file(volume_fd, USB_MARKER);
    if (marked < 0) note_failure(read->failure, "cannot tell whether this volume is marked:", path, errno);
    return marked;
}

int find_shared_name(UsbRead *read, UsbVolume *volume) {
    if (!read->names_read) {
        FileState state = read_whole_file(SHARED_NAME_FILE, &read->names, READ_LOCKED);
        if (state == FileState::failed) return note_failure(read->failure, "cannot read", SHARED_NAME_FILE, errno);
        read->names_read = true;
    }
    if (read->names.data != nullptr)
        shared_name_in(read->names.data, usb_folder_name(volume->path), volume->shared_name);
    return 0;
}

// A catalogue that does not parse (or is no regular file) leaves an empty
// record: the volume's section then admits nobody.
int read_rules(UsbRead *read, int volume_fd, UsbVolume *volume) {
    FileBytes bytes = {};
    FileState state = read_whole_file_at(volume_fd, VOLUME_CATALOGUE, &bytes, READ_NO_LINK);
    if (state == FileState::failed) return note_failure(read->failure, "cannot read the catalogue of", volume->path, errno);
    if (state == FileState::absent) return 0;
    volume->rules = new_share_record();
    if (volume->rules == nullptr) {
        free_file_bytes(&bytes);
        return note_failure(read->failure, "cannot make room for the catalogue of", volume->path, ENOMEM);
    }
    if (state == FileState::read) read_share_catalogue_text(volume->rules, bytes.data, bytes.length);
    free_file_bytes(&bytes);
    return 0;
}

int read_volume(UsbRead *read, const char *path) {
    int volume_fd = open_dir_no_links(path);
    if (volume_fd == -1) {
        // Gone, or reached only through a link: not used.
        if (is_not_reachable(errno)) return 0;
        return note_failure(read->failure, "cannot open the folder", path, errno);
    }
    int marked = is_marked(read, volume_fd, path);
    int result = marked < 0 ? -1 : 0;
    if (marked == 1) {
        UsbVolume *volume = new_zeroed_record<UsbVolume>();
        if (volume == nullptr) {
            close(volume_fd);
            return note_failure(read->failure, "cannot make room for", path, ENOMEM);
        }
        copy_text(volume->path, path);
        *read->tail = volume;
        read->tail = &volume->next;
        result = find_shared_name(read, volume);
        int catalogue = result == 0 ? has_file(volume_fd, VOLUME_CATALOGUE) : 0;
        if (catalogue < 0) result = note_failure(read->failure, "cannot read the catalogue of", path, errno);
        if (catalogue > 0) result = read_rules(read, volume_fd, volume);
    }
    close(volume_fd);
    return result;
}

// What is in /mnt/USB that is a mount point (a folder, or what cannot be told).
int usable_entry(UsbRead *read, const char *path) {
    struct stat status;
    if (stat(path, &status) == 0 && !S_ISDIR(status.st_mode)) return 0;
    return is_mount_dir(read->mounts, path) ? 1 : 0;
}

int read_folder(UsbRead *read, DIR *listing) {
    for (;;) {
        errno = 0;
        const struct dirent *entry = readdir(listing);
        if (entry == nullptr) break;
        if (strcmp(entry->d_name, ".") == 0 || strcmp(entry->d_name, "..") == 0) continue;
        char path[PATH_NODE_WIDTH];
        if (format_text_field(path, sizeof path, "%s/%s", USB_DIR, entry->d_name) != 0) continue;
        if (usable_entry(read, path) && read_volume(read, path) != 0) return -1;
    }
    return errno == 0 ? 0 : note_failure(read->failure, "cannot read the folder", USB_DIR, errno);
}

}  // namespace

void shared_name_in(const char *text, const char *dir_name, char (&name)[SHARED_NAME_WIDTH]) {
    memset(name, 0, sizeof name);
    for (const char *line = text; *line != '\0';) {
        size_t length = strcspn(line, "\n");
        const char *found = strstr(line, dir_name);
        if (found != nullptr && found < line + length) {
            size_t name_length = strcspn(line, " \n");
            copy_text_prefix(name, NAME_FIELD_WIDTH, line, name_length);
            return;
        }
        line += length + (line[length] == '\n' ? 1 : 0);
    }
}

int read_usb_volumes(const MountPoint *mounts, const ChangeSet *changes, UsbScan *scan,
                     RunFailure *failure) {
    *scan = UsbScan{};
    DIR *listing = opendir(USB_DIR);
    if (listing == nullptr) {
        if (is_absent_error(errno)) return 0;
        return note_failure(failure, "cannot read the folder", USB_DIR, errno);
    }
    UsbRead read = {mounts, changes, failure, {}, false, &scan->volumes};
    int result = read_folder(&read, listing);
    closedir(listing);
    free_file_bytes(&read.names);
    scan->scanned = result == 0;
    if (result != 0) free_usb_scan(scan);
    return result;
}

void free_usb_scan(UsbScan *scan) {
    for (UsbVolume *volume = scan->volumes; volume != nullptr;) {
        UsbVolume *next = volume->next;
        free_share_catalogue(volume->rules);
        free(volume);
        volume = next;
    }
    *scan = UsbScan{};
}
