#include "commands/get.h"

#include <cerrno>
#include <cstring>
#include <syslog.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/diagnostics.h"
#include "base/file_read.h"
#include "base/mount_table.h"
#include "base/safe_file.h"
#include "base/text_field.h"
#include "cycle/config_switches.h"
#include "shares/share_lists.h"
#include "shares/xml_helpers.h"

static const char COMMAND[] = "get";

int write_webdav_query(const DavShareEntry *answer) {
    char text[LINE_BUFFER_WIDTH];
    if (format_text_field(text, sizeof text,
                          "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n"
                          "\t\t<item>\n\t\t\t<shared_name>%s</shared_name>\n\t\t\t<path>%s</path>\n"
                          "\t\t\t<enable>%d</enable>\n\t\t</item>\n\t</WebDAV>\n</config>\n",
                          answer->shared_name, answer->path, answer->enable) != 0)
        return errno = ENAMETOOLONG, -1;
    return replace_file(QUERY_FILE, text, strlen(text), 0644);
}

static int answer(RunFailure *failure, const DavShareEntry *found) {
    if (write_webdav_query(found) != 0) return note_failure(failure, "cannot write", QUERY_FILE, errno);
    return 0;
}

// A USB folder is published when its ".davconf" marker exists; WebDAV's own
// switch is not consulted for it.
static int answer_usb_folder(RunFailure *failure, const char *query_path, DavShareEntry *found) {
    char marker[LINE_BUFFER_WIDTH];
    if (format_text_field(marker, sizeof marker, "%s/%s", query_path, USB_MARKER) != 0) return 0;
    int marked = path_exists(marker);
    if (marked < 0) return note_failure(failure, "cannot tell whether this volume is marked:", query_path, errno);
    if (marked == 0) return 0;
    copy_text(found->shared_name, usb_folder_name(query_path));
    copy_text(found->path, query_path);
    found->enable = 1;
    return answer(failure, found);
}

// Escaping can grow a text sixfold; an answer that no longer fits its field is
// refused rather than cut in the middle of an entity.
static bool copy_escaped(const char *text, char *field, size_t width) {
    char escaped[XML_ESCAPE_WIDTH] = {};
    if (escape_xml_text(text, escaped) != 0) return false;
    return copy_text_field(field, width, escaped) == 0;
}

static int answer_from_lists(RunFailure *failure, const char *query_path, const DavShareEntry *entries,
                             DavShareEntry *found) {
    bool on = false;
    if (read_config_switch(WEBDAV_SWITCH, &on, failure) != 0) return -1;
    if (!on) {
        if (unlink(QUERY_FILE) != 0 && errno != ENOENT)
            return note_failure(failure, "cannot remove", QUERY_FILE, errno);
        return 0;
    }
    const DavShareEntry *entry = find_entry_by_path(entries, query_path);
    if (entry == nullptr || !copy_escaped(entry->shared_name, found->shared_name, sizeof found->shared_name) ||
        !copy_escaped(entry->path, found->path, sizeof found->path))
        return 0;
    found->enable = entry->enable;
    return answer(failure, found);
}

static int answer_volume_folder(RunFailure *failure, const char *query_path, DavShareEntry *found) {
    MountPoint *mounts = nullptr;
    if (read_mount_table(&mounts) != 0) return note_failure(failure, "cannot read", "/etc/mtab", errno);
    VolumeEntry *volumes = new_volume_entry();
    DavShareEntry *entries = new_dav_share_entry();
    int result = -1;
    if (volumes == nullptr || entries == nullptr) {
        note_failure(failure, "cannot make room", "", ENOMEM);
    } else {
        scan_data_volumes(mounts, volumes);
        if (load_share_lists_for(volumes, entries, query_path, COMMAND, failure) == 0)
            result = answer_from_lists(failure, query_path, entries, found);
    }
    free_dav_share_list(entries);
    free_volume_list(volumes);
    free_mount_table(mounts);
    return result;
}

int webdav_get(const char *folder) {
    char query_path[DAV_TEXT_WIDTH];
    if (copy_text(query_path, folder) != 0) {  // no folder has so long a path
        log_event(LOG_WARNING, "%s: refused a path longer than %d bytes", COMMAND, DAV_TEXT_WIDTH - 1);
        return 0;
    }
    append_volume_root_slash(query_path, sizeof query_path);
    DavShareEntry found = {};
    RunFailure failure = {};
    int result = is_usb_path(query_path) ? answer_usb_folder(&failure, query_path, &found)
                                         : answer_volume_folder(&failure, query_path, &found);
    if (result != 0) log_failure(COMMAND, &failure, "no answer was written");
    return result;
}
