// USB volumes mounted directly under /mnt/USB that carry a ".davconf" marker:
// a section (always "Dav On") appended to /tmp/dav.conf, a link, and a line
// in the note file for each. Names come from /etc/shared_name, access rules
// from the volume's own ".smbm.xml".
#ifndef DAVSYNC_OUTPUT_USB_SHARES_H
#define DAVSYNC_OUTPUT_USB_SHARES_H

#include "shares/path_list.h"

// 0, or -1 when /mnt/USB is missing, the scan fails, or /tmp/dav.conf or the
// note file cannot be opened or locked.
int append_usb_shares(PathNode *published);
// The mounted subdirectories of `directory` in reading order, as
// "<directory>/<name>", followed by one empty node. Null on failure.
PathNode *scan_mounted_dirs(const char *directory);
// 0 when /etc/mtab has an entry whose mount directory is exactly `path`.
int is_mount_point(const char *path);
// NAME of the first line of /etc/shared_name that contains `dir_name`
// anywhere, into `result` (512 characters, zero-filled by the caller).
// 0 when the file was searched, -1 when it cannot be opened or locked.
int lookup_shared_name(const char *dir_name, char *result);
// The same lookup in another file of that format.
int lookup_shared_name_in(const char *file_path, const char *dir_name, char *result);

#endif
