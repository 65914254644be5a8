// del: withdraw one folder. Removes the first entry with exactly this path
// and rewrites that volume's list; under /mnt/USB/ removes the folder's
// ".davconf" marker too (as part of the same change). 0, or -1 after the
// failure exit (also when no entry has the path and it is no USB folder).
#ifndef DAVSYNC_COMMANDS_DEL_H
#define DAVSYNC_COMMANDS_DEL_H

int webdav_del(const char *path);

#endif
