// USB volumes mounted directly under /mnt/USB that carry a ".davconf" marker:
// a section (always "Dav On"), a link request and a note line for each.
// Names come from /etc/shared_name, access rules from the volume's own
// ".smbm.xml".
#ifndef DAVSYNC_OUTPUT_USB_SHARES_H
#define DAVSYNC_OUTPUT_USB_SHARES_H

#include "output/conf_build.h"
#include "shares/path_list.h"

// Appends to build->conf and build->note (which is then wanted). 0, or -1
// when /mnt/USB is missing or cannot be scanned (nothing appended).
int append_usb_shares(ConfBuild *build);
// The mounted subdirectories of `directory` in reading order, as
// "<directory>/<name>", followed by one empty node. Null on failure.
[[nodiscard]] PathNode *scan_mounted_dirs(const char *directory);
// 0 when /etc/mtab has an entry whose mount directory is exactly `path`.
int is_mount_point(const char *path);
// NAME of the first line of /etc/shared_name ("NAME = VALUE") that contains
// `dir_name` anywhere, into `result` (512 characters, zero-filled by the
// caller). 0 when the file was searched, -1 when it cannot be opened or
// locked. The _in form reads the given file.
int lookup_shared_name(const char *dir_name, char *result);
int lookup_shared_name_in(const char *file_path, const char *dir_name, char *result);

#endif
