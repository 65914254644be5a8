#include "shares/usb_marks.h"

#include <cerrno>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"
#include "base/text_field.h"

namespace {

constexpr char STAGED_MARKER[] = ".davconf.davsync";

void refuse(const char *command, bool mark, const char *folder, const char *why) {
    log_event(LOG_WARNING, "%s: refused to %s %s: %s", command, mark ? "mark" : "unmark", folder, why);
}

// What stands at the marker's name: 0 nothing, 1 this user's regular file,
// 2 a folder, 3 anything else; -1 (errno) when that cannot be told.
int marker_kind(int folder_fd, const char *name) {
    struct stat status;
    if (fstatat(folder_fd, name, &status, AT_SYMLINK_NOFOLLOW) != 0) return errno == ENOENT ? 0 : -1;
    if (S_ISDIR(status.st_mode)) return 2;
    return S_ISREG(status.st_mode) && status.st_uid == geteuid() ? 1 : 3;
}

int write_staged_marker(int folder_fd) {
    if (unlinkat(folder_fd, STAGED_MARKER, 0) != 0 && errno != ENOENT) return -1;
    int fd = open_own_regular_at(folder_fd, STAGED_MARKER, O_WRONLY | O_CREAT | O_EXCL, 0644);
    if (fd == -1) return -1;
    bool written = fchmod(fd, 0644) == 0 && write_all(fd, "ON", 2) == 0 && fsync(fd) == 0;
    int error = errno;
    if (close(fd) != 0 && written) written = false, error = errno;
    if (written) return 0;
    unlinkat(folder_fd, STAGED_MARKER, 0);
    errno = error;
    return -1;
}

// 1 when a staged marker was removed from the folder, 0 when there was none
// (or the folder cannot be reached), -1 (errno) when that could not be told
// or done.
int discard_in_folder(const char *folder) {
    int folder_fd = open_dir_no_links(folder);
    if (folder_fd == -1) return is_not_reachable(errno) ? 0 : -1;
    int kind = marker_kind(folder_fd, STAGED_MARKER);
    int result = kind == 1 ? (unlinkat(folder_fd, STAGED_MARKER, 0) == 0 ? 1 : -1) : kind < 0 ? -1 : 0;
    int error = errno;
    close(folder_fd);
    errno = error;
    return result;
}

}  // namespace

int stage_usb_mark(ChangeSet *changes, const char *folder, bool mark, const char *command,
                   RunFailure *failure) {
    char marker[4096];
    if (usb_marker_path(folder, marker, sizeof marker) != 0) return 0;
    int folder_fd = open_dir_no_links(folder);
    if (folder_fd == -1) {
        if (!is_not_reachable(errno)) return note_failure(failure, "cannot open the folder", folder, errno);
        if (errno == ELOOP || errno == EINVAL) refuse(command, mark, folder, "a link or a dot name on the way");
        return 0;
    }
    int kind = marker_kind(folder_fd, USB_MARKER);
    int result = 0;
    if (kind < 0) {
        result = note_failure(failure, "cannot tell what stands at", marker, errno);
    } else if (kind == 2 || (mark && kind == 3)) {
        refuse(command, mark, folder, "something else stands at the marker's name");
    } else if (!mark && kind == 0) {
    } else if (mark && write_staged_marker(folder_fd) != 0) {
        result = note_failure(failure, "cannot stage the marker of", folder, errno);
    } else if (change_set_add(changes, mark ? CHANGE_MARK : CHANGE_UNMARK, marker) != 0) {
        result = note_failure(failure, "cannot make room for the change of", folder, ENOMEM);
    }
    close(folder_fd);
    return result;
}

int discard_staged_marks(RunFailure *failure) {
    DIR *listing = opendir(USB_DIR);
    if (listing == nullptr)
        return errno == ENOENT || errno == ENOTDIR ? 0 : note_failure(failure, "cannot read the folder", USB_DIR, errno);
    int removed = 0;
    int found = 0;
    for (;;) {
        errno = 0;
        const struct dirent *entry = readdir(listing);
        if (entry == nullptr) break;
        char folder[4096];
        if (entry->d_name[0] == '.' || format_text_field(folder, sizeof folder, "%s/%s", USB_DIR, entry->d_name) != 0)
            continue;
        found = discard_in_folder(folder);
        if (found < 0) break;
        removed += found;
    }
    int error = errno;
    closedir(listing);
    return error == 0 && found >= 0 ? removed : note_failure(failure, "cannot clear", USB_DIR, error);
}
