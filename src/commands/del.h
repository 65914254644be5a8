// del: withdraw one folder. Removes the first entry with exactly this path
// and rewrites that volume's list; under /mnt/USB/ removes the folder's
// ".davconf" marker first. 0, or -1 when nothing was found or a load failed.
#ifndef DAVSYNC_COMMANDS_DEL_H
#define DAVSYNC_COMMANDS_DEL_H

int webdav_del(const char *path);

#endif
