#include "base/safe_file.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fcntl.h>
#include <sys/file.h>
#include <sys/stat.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/text_field.h"

static const int NO_SURPRISES = O_NOFOLLOW | O_NONBLOCK | O_CLOEXEC;

static int keep_if_own_regular(int fd) {
    struct stat status;
    if (fd == -1) return -1;
    if (fstat(fd, &status) != 0 || !S_ISREG(status.st_mode) || status.st_uid != geteuid() ||
        fcntl(fd, F_SETFL, fcntl(fd, F_GETFL) & ~O_NONBLOCK) != 0) {
        close(fd);
        return -1;
    }
    return fd;
}

int open_own_regular(const char *path, int flags, mode_t mode) {
    return keep_if_own_regular(open(path, flags | NO_SURPRISES, mode));
}

int open_own_regular_at(int dir_fd, const char *name, int flags, mode_t mode) {
    return keep_if_own_regular(openat(dir_fd, name, flags | NO_SURPRISES, mode));
}

int touch_own_file(const char *path) {
    int fd = open_own_regular(path, O_WRONLY | O_CREAT, 0644);
    if (fd == -1) return -1;
    int result = futimens(fd, nullptr);
    return close(fd) == 0 ? result : -1;
}

// "<dir>/.<name>.XXXXXX": beside the target, so the rename stays on one
// file system, and hidden from a reader of the folder.
static int temporary_beside(char (&temporary)[4096], const char *path) {
    const char *slash = strrchr(path, '/');
    int dir_length = slash == nullptr ? 0 : static_cast<int>(slash - path + 1);
    return format_text_field(temporary, sizeof temporary, "%.*s.%s.XXXXXX", dir_length, path,
                             path + dir_length);
}

FILE *replacement_open(Replacement *replacement, const char *path) {
    replacement->path = path;
    replacement->temporary[0] = '\0';
    if (temporary_beside(replacement->temporary, path) != 0) return nullptr;
    int fd = mkostemp(replacement->temporary, O_CLOEXEC);
    FILE *file = fd == -1 ? nullptr : fdopen(fd, "w");
    if (file != nullptr) return file;
    if (fd != -1) close(fd);
    replacement_abandon(replacement);
    return nullptr;
}

// /tmp does not outlive a restart, so a file there needs no sync: the rename
// alone keeps readers from a half-written one.
static bool outlives_restart(const char *path) { return strncmp(path, "/tmp/", 5) != 0; }

int replacement_close(Replacement *replacement, FILE *file, mode_t mode) {
    bool written = fflush(file) == 0 && ferror(file) == 0 && fchmod(fileno(file), mode) == 0 &&
                   (!outlives_restart(replacement->path) || fsync(fileno(file)) == 0);
    written = fclose(file) == 0 && written;
    if (written) return 0;
    replacement_abandon(replacement);
    return -1;
}

int replacement_write(Replacement *replacement, const char *path, const char *data,
                      size_t length, mode_t mode) {
    FILE *file = replacement_open(replacement, path);
    if (file == nullptr) return -1;
    fwrite(data, 1, length, file);
    return replacement_close(replacement, file, mode);
}

int replacement_commit(Replacement *replacement) {
    if (replacement->temporary[0] == '\0') return -1;
    if (rename(replacement->temporary, replacement->path) == 0) {
        replacement->temporary[0] = '\0';
        return 0;
    }
    replacement_abandon(replacement);
    return -1;
}

void replacement_abandon(Replacement *replacement) {
    if (replacement->temporary[0] != '\0') unlink(replacement->temporary);
    replacement->temporary[0] = '\0';
}

static bool is_temporary_name(const char *name, const char *prefix) {
    size_t length = strlen(prefix);
    return strncmp(name, prefix, length) == 0 && strlen(name) == length + 6;
}

static void remove_folder_files(int dir_fd, const char *name) {
    int fd = openat(dir_fd, name, O_RDONLY | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
    DIR *folder = fd == -1 ? nullptr : fdopendir(fd);
    if (folder == nullptr) {
        if (fd != -1) close(fd);
        return;
    }
    while (const struct dirent *entry = readdir(folder))
        if (entry->d_name[0] != '.' || (strcmp(entry->d_name, ".") && strcmp(entry->d_name, "..")))
            unlinkat(dirfd(folder), entry->d_name, 0);
    closedir(folder);
}

void remove_stale_temporaries(const char *dir, const char *prefix) {
    DIR *listing = opendir(dir);
    if (listing == nullptr) return;
    int dir_fd = dirfd(listing);
    while (const struct dirent *entry = readdir(listing)) {
        struct stat status;
        if (!is_temporary_name(entry->d_name, prefix) ||
            fstatat(dir_fd, entry->d_name, &status, AT_SYMLINK_NOFOLLOW) != 0 ||
            status.st_uid != geteuid())
            continue;
        if (S_ISDIR(status.st_mode)) {
            remove_folder_files(dir_fd, entry->d_name);
            unlinkat(dir_fd, entry->d_name, AT_REMOVEDIR);
        } else if (S_ISREG(status.st_mode)) {
            unlinkat(dir_fd, entry->d_name, 0);
        }
    }
    closedir(listing);
}

void remove_stale_replacements(const char *path) {
    const char *slash = strrchr(path, '/');
    if (slash == nullptr || slash == path) return;
    char dir[4096];
    char prefix[4096];
    if (copy_text_prefix(dir, sizeof dir, path, static_cast<size_t>(slash - path)) != 0 ||
        format_text_field(prefix, sizeof prefix, ".%s.", slash + 1) != 0)
        return;
    remove_stale_temporaries(dir, prefix);
}

int replace_file(const char *path, const char *data, size_t length, mode_t mode) {
    Replacement replacement;
    if (replacement_write(&replacement, path, data, length, mode) != 0) return -1;
    return replacement_commit(&replacement);
}

int open_dir_no_links(const char *path) {
    if (path[0] != '/') return -1;
    int dir_fd = open("/", O_PATH | O_DIRECTORY | O_CLOEXEC);
    for (const char *at = path + 1; dir_fd != -1 && *at != '\0';) {
        size_t length = strcspn(at, "/");
        char name[LINE_BUFFER_WIDTH];
        if (copy_text_prefix(name, sizeof name, at, length) != 0 || strcmp(name, ".") == 0 ||
            strcmp(name, "..") == 0) {
            close(dir_fd);
            return -1;
        }
        at += length;
        while (*at == '/') ++at;
        if (name[0] == '\0') continue;
        int next = openat(dir_fd, name, O_PATH | O_DIRECTORY | O_NOFOLLOW | O_CLOEXEC);
        close(dir_fd);
        dir_fd = next;
    }
    return dir_fd;
}

FILE *open_locked_for_reading(const char *path) {
    FILE *file = fopen(path, "re");
    if (file == nullptr) return nullptr;
    if (flock(fileno(file), LOCK_EX) != 0) {
        fclose(file);
        return nullptr;
    }
    return file;
}

void close_locked(FILE *file) {
    flock(fileno(file), LOCK_UN);
    fclose(file);
}

int memory_file_open(MemoryFile *file) {
    file->text = nullptr;
    file->length = 0;
    file->stream = open_memstream(&file->text, &file->length);
    return file->stream != nullptr ? 0 : -1;
}

int memory_file_close(MemoryFile *file) {
    if (file->stream == nullptr) return -1;
    bool failed = ferror(file->stream) != 0;
    failed = fclose(file->stream) != 0 || failed;
    file->stream = nullptr;
    return failed ? -1 : 0;
}

void memory_file_free(MemoryFile *file) {
    if (file->stream != nullptr) fclose(file->stream);
    free(file->text);
    file->stream = nullptr;
    file->text = nullptr;
    file->length = 0;
}
