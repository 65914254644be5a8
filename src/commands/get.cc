#include "commands/get.h"

#include <cstdio>
#include <cstring>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"
#include "base/text_field.h"
#include "cycle/config_switches.h"

// Replaced whole, so the caller never reads a half-written answer.
int write_webdav_query(const DavShareEntry *answer) {
    char text[LINE_BUFFER_WIDTH];
    if (format_text_field(text, sizeof text,
                          "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n"
                          "\t\t<item>\n\t\t\t<shared_name>%s</shared_name>\n\t\t\t<path>%s</path>\n"
                          "\t\t\t<enable>%d</enable>\n\t\t</item>\n\t</WebDAV>\n</config>\n",
                          answer->shared_name, answer->path, answer->enable) != 0)
        return -1;
    return replace_file(QUERY_FILE, text, strlen(text), 0644);
}

// A USB folder is published when its ".davconf" marker exists; WebDAV's own
// switch is not consulted for it.
static int answer_usb_folder(const char *query_path, DavShareEntry *answer) {
    char marker[LINE_BUFFER_WIDTH];
    if (format_text_field(marker, sizeof marker, "%s/%s", query_path, USB_MARKER) != 0) return 0;
    if (access(marker, F_OK) != 0) return 0;
    copy_text(answer->shared_name, usb_folder_name(query_path));
    copy_text(answer->path, query_path);
    answer->enable = 1;
    write_webdav_query(answer);
    return 0;
}

// Escaping can grow a text sixfold; an answer that no longer fits its field is
// refused rather than cut in the middle of an entity.
static bool copy_escaped(const char *text, char *field, size_t width) {
    char escaped[XML_ESCAPE_WIDTH] = {};
    if (escape_xml_text(text, escaped) != 0) return false;
    return copy_text_field(field, width, escaped) == 0;
}

static int answer_volume_folder(const char *query_path, DavShareEntry *answer) {
    DavShareEntry *entries = new_dav_share_entry();
    int allen_unused = 0;
    if (entries == nullptr || load_dav_share_lists_for(entries, &allen_unused, query_path) < 0) {
        free_dav_share_list(entries);
        return -1;
    }
    if (read_webdav_enable_flag() != 1) {
        free_dav_share_list(entries);
        unlink(QUERY_FILE);
        return 0;
    }
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next) {
        if (entry->path[0] == '\0' || strcmp(entry->path, query_path) != 0) continue;
        if (copy_escaped(entry->shared_name, answer->shared_name, sizeof answer->shared_name) &&
            copy_escaped(entry->path, answer->path, sizeof answer->path)) {
            answer->enable = entry->enable;
            write_webdav_query(answer);
        }
        break;
    }
    free_dav_share_list(entries);
    return 0;
}

int webdav_get(const char *folder) {
    char query_path[DAV_TEXT_WIDTH];
    if (copy_text(query_path, folder) != 0) return 0;  // no folder has so long a path
    append_volume_root_slash(query_path, sizeof query_path);
    DavShareEntry *answer = new_dav_share_entry();
    if (answer == nullptr) return -1;
    int result = is_usb_path(query_path)
                     ? answer_usb_folder(query_path, answer)
                     : answer_volume_folder(query_path, answer);
    free_dav_share_list(answer);
    return result;
}
