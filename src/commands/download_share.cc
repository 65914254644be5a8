#include "commands/download_share.h"

#include <cerrno>
#include <cstdint>
#include <cstdio>
#include <cstring>

#include "base/appliance_paths.h"
#include "base/file_read.h"
#include "base/text_field.h"
#include "cycle/config_switches.h"
#include "cycle/regeneration.h"
#include "platform/apkg_lib.h"

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
static int add_download_entry(CycleRun *run, int volume_index, const DownloadKind *kind) {
    DavShareEntry *entries = run->entries;
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
        empty_entry(entry);
    }
    DavShareEntry *added = new_dav_share_entry();
    if (added == nullptr) return note_failure(&run->failure, "cannot make room for", target, ENOMEM);
    copy_text(added->shared_name, kind->shared_name);
    copy_text(added->path, target);
    added->RW = rw;
    added->enable = enable;
    last->next = added;
    return 0;
}

static char volume_letter_in(const char *text) {
    const char *mark = strstr(text, VOLUME_MARK);
    return mark == nullptr ? '\0' : mark[sizeof VOLUME_MARK - 1];
}

// The stretch of the piece from "save_path" up to the next "save_path": on
// one line that is the element's name, its content and the start of its end
// tag.
static int volume_index_in_save_path_piece(const char *piece) {
    const char *first = strstr(piece, "save_path");
    const char *second = strstr(first + 1, "save_path");
    if (second == nullptr) return -1;
    char stretch[128];
    copy_text_prefix(stretch, sizeof stretch, first, static_cast<size_t>(second - first));
    if (strstr(stretch, VOLUME_MARK) == nullptr) return -1;
    int index = static_cast<signed char>(volume_letter_in(stretch)) - 'a';
    return index < 0 ? -1 : index;
}

int p2p_save_volume_in_text(const char *text) {
    static const size_t PIECE_WIDTH = 1024;
    for (const char *at = text; *at != '\0';) {
        size_t length = strcspn(at, "\n");
        if (at[length] == '\n') ++length;
        if (length > PIECE_WIDTH - 1) length = PIECE_WIDTH - 1;
        char piece[PIECE_WIDTH];
        copy_text_prefix(piece, sizeof piece, at, length);
        if (strstr(piece, "save_path") != nullptr) return volume_index_in_save_path_piece(piece);
        at += length;
    }
    return -1;
}

// The download volume of the p2p manager; -1 when there is none, -2 with the
// failure noted.
static int p2p_save_volume(CycleRun *run) {
    static const char SETTINGS[] = "/etc/NAS_CFG/p2psettings.xml";
    FileBytes bytes = {};
    FileState state = read_whole_file(SETTINGS, &bytes, READ_LOCKED);
    if (state == FileState::failed) return note_failure(&run->failure, "cannot read", SETTINGS, errno), -2;
    int index = state == FileState::read ? p2p_save_volume_in_text(bytes.data) : -1;
    free_file_bytes(&bytes);
    return index;
}

static int add_p2p_share_entry(CycleRun *run) {
    bool on = false;
    if (read_p2p_switch(&on, &run->failure) != 0) return -1;
    if (!on) return 0;
    int volume_index = p2p_save_volume(run);
    if (volume_index == -2) return -1;
    if (volume_index < 0) return 0;
    return add_download_entry(run, volume_index, &P2P_KIND);
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

static int add_amule_share_entry(CycleRun *run) {
    if (LIB_Check_ps("apkg") != 1) return 0;
    APKG_COMMAND(1, 0);
    if (APKG_ReadAllXml() != 0) {
        APKG_FreeAllXml();
        return note_failure(&run->failure, "cannot make room for", "the package list", ENOMEM);
    }
    char letter = amule_volume_letter();
    APKG_FreeAllXml();
    if (letter == '\0') return 0;
    int volume_index = static_cast<int8_t>(letter - 'a');
    if (volume_index < 0) return 0;
    return add_download_entry(run, volume_index, &AMULE_KIND);
}

int webdav_p2p_share() {
    CycleRun run;
    if (cycle_begin(&run, CYCLE_P2PEN) < 0) return -1;
    if (add_p2p_share_entry(&run) != 0) return cycle_abort(&run);
    return cycle_finish(&run);
}

int webdav_amule_share() {
    CycleRun run;
    if (cycle_begin(&run, CYCLE_AMULEN) < 0) return -1;
    if (add_amule_share_entry(&run) != 0) return cycle_abort(&run);
    return cycle_finish(&run);
}
