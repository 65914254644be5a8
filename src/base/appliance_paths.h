// The appliance's fixed paths and the widths shared by several layers, and
// the path rules that go with them. One place each.
#ifndef DAVSYNC_BASE_APPLIANCE_PATHS_H
#define DAVSYNC_BASE_APPLIANCE_PATHS_H

#include <cstddef>

constexpr const char *LINK_DIR = "/usr/local/apache2_dav/webdav";
constexpr const char *CONF_DIR = "/usr/local/apache2_dav/conf/extra";
constexpr const char *PLACED_CONF_FILE = "/usr/local/apache2_dav/conf/extra/httpd-dav.conf";
constexpr const char *NOTE_FILE = "/tmp/set_webdav_note";
constexpr const char *QUERY_FILE = "/tmp/webdav_query.xml";
constexpr const char *NODE_LOCK_FILE = "/tmp/corvane.node";
constexpr const char *START_LOCK_FILE = "/tmp/corvane_start_lock";
constexpr const char *USB_DIR = "/mnt/USB";
constexpr const char *ISO_DIR = "/mnt/isoMount";
constexpr const char *USB_MARKER = ".davconf";
// The record of a change being made real (see commit_record.h): beside the
// configuration, in a folder only the appliance writes, on a disk that
// outlives a restart.
constexpr const char *COMMIT_RECORD_FILE = "/usr/local/apache2_dav/conf/extra/.davsync-commit";

// Every data volume directory ("/mnt/HD/HD_a2") and "/mnt/isoMount" is this long.
constexpr size_t VOLUME_PREFIX_LENGTH = 13;
// Lines, commands, argument and list work areas.
constexpr size_t LINE_BUFFER_WIDTH = 12800;

// "<folder>/.davconf", the folder's trailing slashes dropped. -1 when it
// does not fit `width`.
int usb_marker_path(const char *folder, char *marker, size_t width);
// Whether the path lies on the iso mount: its first 13 characters are
// "/mnt/isoMount".
bool is_iso_path(const char *path);
// Below "/mnt/USB/".
bool is_usb_path(const char *path);
// The name of a USB folder: what follows "/mnt/USB/".
const char *usb_folder_name(const char *usb_path);
// A volume directory gains the '/' its root folder is held with
// ("/mnt/HD/HD_a2" becomes "/mnt/HD/HD_a2/"); `path` has room for it.
void append_volume_root_slash(char *path, size_t width);
// A path that can be shared at all: a volume folder ("/mnt/HD/HD_" letter
// "2", "/mnt/isoMount", "/mnt/USB/" name) or below one, with no "." or ".."
// component.
bool is_shareable_path(const char *path);

#endif
