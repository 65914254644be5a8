#include "platform/volume_lib.h"

#include <cerrno>
#include <climits>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fcntl.h>
#include <string>
#include <sys/stat.h>
#include <unistd.h>

static std::string hidden_location(const char *volume_dir) {
    return std::string(volume_dir) + "/.system_data";
}

char *getDataLocationByVolume(const char *name, const char *volume_dir) {
    std::string location = hidden_location(volume_dir) + "/" + name;
    return strdup(location.c_str());
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

int saveDataToHiddenByVolume(const char *file, const char *volume_dir) {
    if (file == nullptr || volume_dir == nullptr) return -1;
    std::string folder = hidden_location(volume_dir);
    if (mkdir(folder.c_str(), 0755) != 0 && errno != EEXIST) return -1;
    const char *slash = strrchr(file, '/');
    std::string final_name = folder + "/" + (slash != nullptr ? slash + 1 : file);
    std::string temporary = final_name + ".XXXXXX";

    int from = open(file, O_RDONLY | O_CLOEXEC);
    if (from == -1) return -1;
    int to = mkostemp(&temporary[0], O_CLOEXEC);
    if (to == -1) {
        close(from);
        return -1;
    }
    bool stored = copy_all(from, to) && fchmod(to, 0644) == 0 && fsync(to) == 0;
    close(from);
    stored = close(to) == 0 && stored;
    if (stored && rename(temporary.c_str(), final_name.c_str()) == 0) return 0;
    unlink(temporary.c_str());
    return -1;
}
