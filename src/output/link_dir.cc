#include "output/link_dir.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/name_index.h"
#include "base/record_list.h"
#include "base/text_field.h"

bool is_link_name(const char *shared_name) {
    return shared_name[0] != '\0' && strchr(shared_name, '/') == nullptr &&
           strcmp(shared_name, ".") != 0 && strcmp(shared_name, "..") != 0;
}

void request_link(LinkRequest **list, const char *name, const char *target) {
    if (!is_link_name(name)) return;
    LinkRequest *request = new_zeroed_record<LinkRequest>();
    if (request == nullptr) return;
    if (copy_text(request->name, name) != 0 || copy_text(request->target, target) != 0) {
        free(request);
        return;
    }
    request->next = *list;
    *list = request;
}

void free_link_requests(LinkRequest *list) { free_record_list(list); }


static bool points_at(int dir_fd, const char *name, const char *target) {
    char held[PATH_NODE_WIDTH + 1];
    ssize_t length = readlinkat(dir_fd, name, held, sizeof held);
    return length >= 0 && static_cast<size_t>(length) == strlen(target) &&
           memcmp(held, target, static_cast<size_t>(length)) == 0;
}

// What "rm DIR/*" removes: visible entries that are not folders. A link
// that is already right stays, so a share does not vanish mid-run.
static void remove_stale_entries(int dir_fd, const LinkRequest *wanted) {
    NameIndex by_name = {};
    for (const LinkRequest *request = wanted; request != nullptr; request = request->next)
        (void)name_index_add(&by_name, request->name, const_cast<LinkRequest *>(request));
    DIR *listing = fdopendir(dup(dir_fd));
    if (listing == nullptr) {
        name_index_free(&by_name);
        return;
    }
    while (const struct dirent *entry = readdir(listing)) {
        if (entry->d_name[0] == '.') continue;
        struct stat status;
        if (fstatat(dir_fd, entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0) continue;
        if (S_ISDIR(status.st_mode)) continue;
        const LinkRequest *request =
            static_cast<const LinkRequest *>(name_index_find(&by_name, entry->d_name));
        if (S_ISLNK(status.st_mode) && request != nullptr &&
            points_at(dir_fd, entry->d_name, request->target))
            continue;
        unlinkat(dir_fd, entry->d_name, 0);
    }
    closedir(listing);
    name_index_free(&by_name);
}

// mkdir -p: every missing folder on the way, 0755.
static void make_dir_with_parents(const char *path) {
    char partial[PATH_NODE_WIDTH];
    for (const char *slash = strchr(path + 1, '/');; slash = strchr(slash + 1, '/')) {
        size_t length = slash == nullptr ? strlen(path) : static_cast<size_t>(slash - path);
        if (copy_text_prefix(partial, sizeof partial, path, length) != 0) return;
        if (mkdir(partial, 0755) != 0 && errno != EEXIST) return;
        if (slash == nullptr) return;
    }
}

static int open_link_dir() {
    int flags = O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC;
    int dir_fd = open(LINK_DIR, flags);
    if (dir_fd == -1 && errno == ENOENT) {
        make_dir_with_parents(LINK_DIR);
        dir_fd = open(LINK_DIR, flags);
    }
    return dir_fd;
}

void sync_link_dir(const LinkRequest *wanted) {
    int dir_fd = open_link_dir();
    if (dir_fd == -1) return;
    remove_stale_entries(dir_fd, wanted);
    for (const LinkRequest *request = wanted; request != nullptr; request = request->next) {
        struct stat status;
        if (fstatat(dir_fd, request->name, &status, AT_SYMLINK_NOFOLLOW) == 0) continue;
        symlinkat(request->target, dir_fd, request->name);
    }
    close(dir_fd);
}
