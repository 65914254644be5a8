#include "platform/volume_lib.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

static const char HIDDEN_FOLDER[] = ".system_data";

// Newly allocated "<volume_dir>/.system_data[/<name>][<suffix>]"; null when
// memory is exhausted. Plain malloc: callers are C code that frees with free().
static char *hidden_path(const char *volume_dir, const char *name, const char *suffix) {
    size_t size = strlen(volume_dir) + sizeof HIDDEN_FOLDER + 2 +
                  (name != nullptr ? strlen(name) : 0) + strlen(suffix);
    char *path = static_cast<char *>(malloc(size));
    if (path == nullptr) return nullptr;
    snprintf(path, size, "%s/%s%s%s%s", volume_dir, HIDDEN_FOLDER, name != nullptr ? "/" : "",
             name != nullptr ? name : "", suffix);
    return path;
}

char *getDataLocationByVolume(const char *name, const char *volume_dir) {
    return hidden_path(volume_dir, name, "");
}

static bool copy_all(int from, int to) {
    char block[8192];
    for (;;) {
        ssize_t got = read(from, block, sizeof block);
        if (got == 0) return true;
        if (got < 0) {
            if (errno == EINTR) continue;
            return false;
        }
        for (ssize_t done = 0; done < got;) {
            ssize_t put = write(to, block + done, static_cast<size_t>(got - done));
            if (put < 0 && errno == EINTR) continue;
            if (put <= 0) return false;
            done += put;
        }
    }
}

// The folder exists afterwards; a new one gets 0755 whatever the umask.
static bool make_hidden_folder(const char *folder) {
    if (mkdir(folder, 0755) == 0) return chmod(folder, 0755) == 0;
    if (errno != EEXIST) return false;
    struct stat status;
    if (stat(folder, &status) == 0 && S_ISDIR(status.st_mode)) return true;
    errno = ENOTDIR;
    return false;
}

// Copies `file` to `temporary` (a mkstemp template, filled in) and flushes it.
static bool write_temporary_copy(const char *file, char *temporary) {
    int from = open(file, O_RDONLY | O_CLOEXEC);
    if (from == -1) return false;
    int to = mkostemp(temporary, O_CLOEXEC);
    if (to == -1) {
        close(from);
        return false;
    }
    bool stored = copy_all(from, to) && fchmod(to, 0644) == 0 && fsync(to) == 0;
    int error = errno;
    close(from);
    if (close(to) != 0 && stored) {
        stored = false;
        error = errno;
    }
    if (!stored) unlink(temporary);
    errno = error;
    return stored;
}

int saveDataToHiddenByVolume(const char *file, const char *volume_dir) {
    if (file == nullptr || volume_dir == nullptr) return -1;
    const char *slash = strrchr(file, '/');
    const char *base = slash != nullptr ? slash + 1 : file;
    if (*base == '\0') return -1;
    char *folder = hidden_path(volume_dir, nullptr, "");
    char *final_name = hidden_path(volume_dir, base, "");
    char *temporary = hidden_path(volume_dir, base, ".XXXXXX");
    int result = -1;
    int error = ENOMEM;
    if (folder != nullptr && final_name != nullptr && temporary != nullptr &&
        make_hidden_folder(folder) && write_temporary_copy(file, temporary)) {
        if (rename(temporary, final_name) == 0) result = 0;
        else error = errno, unlink(temporary);
    } else if (folder != nullptr && final_name != nullptr && temporary != nullptr) {
        error = errno;
    }
    free(folder);
    free(final_name);
    free(temporary);
    errno = error;
    return result;
}
