#include "commands/download_share.h"

#include <cstdint>
#include <cstdio>
#include <cstring>
#include <sys/file.h>

#include "base/text_field.h"
#include "cycle/regeneration.h"
#include "platform/apkg_lib.h"
#include "platform/config_db.h"

static const CycleVariant DOWNLOAD_SHARE_VARIANT = {
    /*lock_taken_first=*/false, /*wait_start_lock=*/false, /*clear_start_lock=*/false,
    /*read_enable_flag=*/true, RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG, WRITE_ALL_VOLUMES,
    /*prepare_link_dir=*/true, /*remove_links_after_conf=*/false,
};

static const char VOLUME_MARK[] = "/mnt/HD/HD_";

// A download folder sits at the root of a volume: 13 characters, then "/P2P"
// or "/aMule". Its kind is told by the path alone.
struct DownloadKind {
    const char *shared_name;
    const char *folder;  // "/P2P" or "/aMule"
};
static const DownloadKind P2P_KIND = {"P2P", "/P2P"};
static const DownloadKind AMULE_KIND = {"aMule", "/aMule"};

static bool is_of_kind(const DavShareEntry *entry, const DownloadKind *kind) {
    return strlen(entry->path) == VOLUME_PREFIX_LENGTH + strlen(kind->folder) &&
           strcmp(entry->path + VOLUME_PREFIX_LENGTH, kind->folder) == 0;
}

// Replaces every entry of the kind by one entry on the given volume, keeping
// RW and enable of an entry that already had that path.
static int add_download_entry(DavShareEntry *entries, int volume_index, const DownloadKind *kind) {
    char target[1024];
    format_text_field(target, sizeof target, "/mnt/HD/HD_%c2%s", 'a' + volume_index, kind->folder);
    int rw = 1;
    int enable = 1;
    DavShareEntry *last = entries;
    for (DavShareEntry *entry = entries; entry != nullptr; entry = entry->next) {
        last = entry;
        if (entry->path[0] == '\0' || !is_of_kind(entry, kind)) continue;
        if (strcmp(entry->path, target) == 0) {
            rw = entry->RW;
            enable = entry->enable;
        }
        memset(entry->shared_name, 0, sizeof entry->shared_name);
        memset(entry->path, 0, sizeof entry->path);
        entry->RW = 0;
        entry->enable = 0;
    }
    DavShareEntry *added = new_dav_share_entry();
    if (added == nullptr) return -1;
    copy_text(added->shared_name, kind->shared_name);
    copy_text(added->path, target);
    added->RW = rw;
    added->enable = enable;
    last->next = added;
    return volume_index;
}

static char volume_letter_in(const char *text) {
    const char *mark = strstr(text, VOLUME_MARK);
    return mark == nullptr ? '\0' : mark[sizeof VOLUME_MARK - 1];
}

// The stretch of the line from "save_path" up to the next "save_path": on one
// line that is the element's name, its content and the start of its end tag.
static int volume_index_in_save_path_line(const char *line) {
    const char *first = strstr(line, "save_path");
    const char *second = strstr(first + 1, "save_path");
    if (second == nullptr) return -1;
    char stretch[128];
    copy_text_prefix(stretch, sizeof stretch, first, static_cast<size_t>(second - first));
    if (strstr(stretch, VOLUME_MARK) == nullptr) return -1;
    int index = static_cast<signed char>(volume_letter_in(stretch)) - 'a';
    return index < 0 ? -1 : index;
}

int read_p2p_save_volume() { return read_p2p_save_volume_from("/etc/NAS_CFG/p2psettings.xml"); }

int read_p2p_save_volume_from(const char *settings_path) {
    FILE *settings = fopen(settings_path, "r");
    if (settings == nullptr) return -1;
    if (flock(fileno(settings), LOCK_EX) != 0) {
        fclose(settings);
        return -1;
    }
    char line[1024] = {};
    bool found = false;
    while (!found && fgets(line, sizeof line, settings) != nullptr)
        found = strstr(line, "save_path") != nullptr;
    flock(fileno(settings), LOCK_UN);
    fclose(settings);
    return found ? volume_index_in_save_path_line(line) : -1;
}

int add_p2p_share_entry(DavShareEntry *entries) {
    if (xml_get_int("/download_mgr/p2p/enable") != 1) return -1;
    int volume_index = read_p2p_save_volume();
    if (volume_index < 0) return -1;
    return add_download_entry(entries, volume_index, &P2P_KIND);
}

// Fields are read at the package library's own byte offsets.
static char amule_volume_letter() {
    const char *header = static_cast<const char *>(p_lib_list);
    if (header == nullptr) return '\0';
    const char *record = nullptr;
    memcpy(&record, header + APKG_HEADER_FIRST, sizeof record);
    for (; record != nullptr; memcpy(&record, record + APKG_RECORD_NEXT, sizeof record)) {
        int32_t state = 0;
        memcpy(&state, record + APKG_RECORD_STATE, sizeof state);
        const char *name = record + APKG_RECORD_NAME;
        const char *path = record + APKG_RECORD_PATH;
        if (strcmp(name, "aMule") == 0 && state == 1 && strstr(path, VOLUME_MARK) != nullptr)
            return volume_letter_in(path);
    }
    return '\0';
}

int add_amule_share_entry(DavShareEntry *entries) {
    if (LIB_Check_ps("apkg") != 1) return -1;
    APKG_COMMAND(1, 0);
    APKG_ReadAllXml();
    char letter = amule_volume_letter();
    APKG_FreeAllXml();
    if (letter == '\0') return -1;
    int volume_index = static_cast<int8_t>(letter - 'a');
    if (volume_index < 0) return -1;
    return add_download_entry(entries, volume_index, &AMULE_KIND);
}

int webdav_p2p_share() {
    CycleRun run;
    if (cycle_begin(&run, &DOWNLOAD_SHARE_VARIANT, -1) < 0) return -1;
    add_p2p_share_entry(run.entries);
    return cycle_finish(&run);
}

int webdav_amule_share() {
    CycleRun run;
    if (cycle_begin(&run, &DOWNLOAD_SHARE_VARIANT, -1) < 0) return -1;
    add_amule_share_entry(run.entries);
    return cycle_finish(&run);
}
