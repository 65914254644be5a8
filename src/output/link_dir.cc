#include "output/link_dir.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <syslog.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/name_index.h"
#include "base/record_list.h"
#include "base/text_field.h"

// A new link is made here first and renamed over the old entry.
static const char NEW_LINK[] = ".davsync-link";

bool is_link_name(const char *shared_name) {
    return shared_name[0] != '\0' && strchr(shared_name, '/') == nullptr &&
           strcmp(shared_name, ".") != 0 && strcmp(shared_name, "..") != 0;
}

int request_link(LinkRequest **list, const char *name, const char *target) {
    if (!is_link_name(name)) return 0;
    LinkRequest *request = new_zeroed_record<LinkRequest>();
    if (request == nullptr) return -1;
    if (copy_text(request->name, name) != 0 || copy_text(request->target, target) != 0) {
        free(request);
        return 0;
    }
    request->next = *list;
    *list = request;
    return 0;
}

void free_link_requests(LinkRequest *list) { free_record_list(list); }

static bool points_at(int dir_fd, const char *name, const char *target) {
    char held[PATH_NODE_WIDTH + 1];
    ssize_t length = readlinkat(dir_fd, name, held, sizeof held);
    return length >= 0 && static_cast<size_t>(length) == strlen(target) &&
           memcmp(held, target, static_cast<size_t>(length)) == 0;
}

// mkdir -p: every missing folder on the way, 0755.
static int make_dir_with_parents(const char *path) {
    char partial[PATH_NODE_WIDTH];
    for (const char *slash = strchr(path + 1, '/');; slash = strchr(slash + 1, '/')) {
        size_t length = slash == nullptr ? strlen(path) : static_cast<size_t>(slash - path);
        if (copy_text_prefix(partial, sizeof partial, path, length) != 0) return errno = ENAMETOOLONG, -1;
        if (mkdir(partial, 0755) != 0 && errno != EEXIST) return -1;
        if (slash == nullptr) return 0;
    }
}

int check_link_dir() {
    struct stat status;
    if (lstat(LINK_DIR, &status) != 0) return errno == ENOENT ? 0 : -1;
    if (S_ISDIR(status.st_mode)) return 0;
    errno = S_ISLNK(status.st_mode) ? ELOOP : ENOTDIR;
    return -1;
}

int open_link_dir() {
    int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
    int dir_fd = open(LINK_DIR, flags);
    if (dir_fd == -1 && errno == ENOENT && make_dir_with_parents(LINK_DIR) == 0)
        dir_fd = open(LINK_DIR, flags);
    struct stat status;
    if (dir_fd == -1 && errno == ENOTDIR && lstat(LINK_DIR, &status) == 0 && S_ISLNK(status.st_mode))
        errno = ELOOP;
    return dir_fd;
}

// What "rm DIR/*" removed, dot names too: entries that are not folders. A
// wanted name stays for the rename that replaces it.
static int remove_stale_entries(int dir_fd, const NameIndex *wanted, RunFailure *failure) {
    DIR *listing = fdopendir(dup(dir_fd));
    if (listing == nullptr) return note_failure(failure, "cannot read", LINK_DIR, errno);
    rewinddir(listing);
    int result = 0;
    for (;;) {
        errno = 0;
        const struct dirent *entry = readdir(listing);
        if (entry == nullptr) {
            if (errno != 0) result = note_failure(failure, "cannot read", LINK_DIR, errno);
            break;
        }
        const char *name = entry->d_name;
        if (strcmp(name, ".") == 0 || strcmp(name, "..") == 0 || name_index_find(wanted, name)) continue;
        if (entry->d_type == DT_DIR) continue;
        struct stat status;
        if (entry->d_type == DT_UNKNOWN && fstatat(dir_fd, name, &status, AT_SYMLINK_NOFOLLOW) != 0) {
            if (errno == ENOENT) continue;
            result = note_failure(failure, "cannot read", LINK_DIR, errno);
            break;
        }
        if (entry->d_type == DT_UNKNOWN && S_ISDIR(status.st_mode)) continue;
        if (unlinkat(dir_fd, name, 0) != 0 && errno != ENOENT) {
            result = note_failure(failure, "cannot remove a link from", LINK_DIR, errno);
            break;
        }
    }
    closedir(listing);
    return result;
}

static int make_link(int dir_fd, const LinkRequest *request, const char *command) {
    // Most links are right already: one call tells.
    if (points_at(dir_fd, request->name, request->target)) return 0;
    struct stat status;
    if (fstatat(dir_fd, request->name, &status, AT_SYMLINK_NOFOLLOW) != 0) {
        if (errno != ENOENT) return -1;
        return symlinkat(request->target, dir_fd, request->name);
    }
    if (S_ISDIR(status.st_mode)) {
        log_event(LOG_WARNING, "%s: cannot link %s in %s: a folder stands at its name", command,
                  request->name, LINK_DIR);
        return 0;
    }
    if (strcmp(request->name, NEW_LINK) == 0) {
        if (unlinkat(dir_fd, request->name, 0) != 0) return -1;
        return symlinkat(request->target, dir_fd, request->name);
    }
    if ((unlinkat(dir_fd, NEW_LINK, 0) != 0 && errno != ENOENT) ||
        symlinkat(request->target, dir_fd, NEW_LINK) != 0)
        return -1;
    return renameat(dir_fd, NEW_LINK, dir_fd, request->name);
}

int sync_link_dir(int dir_fd, const LinkRequest *wanted, const char *command, RunFailure *failure) {
    NameIndex by_name = {};
    int result = 0;
    for (const LinkRequest *request = wanted; request != nullptr && result == 0; request = request->next)
        if (name_index_add(&by_name, request->name, const_cast<LinkRequest *>(request)) < 0)
            result = note_failure(failure, "cannot make room for the links of", LINK_DIR, ENOMEM);
    if (result == 0) result = remove_stale_entries(dir_fd, &by_name, failure);
    name_index_free(&by_name);
    for (const LinkRequest *request = wanted; request != nullptr && result == 0; request = request->next)
        if (make_link(dir_fd, request, command) != 0)
            result = note_failure(failure, "cannot link", request->name, errno);
    return result;
}
