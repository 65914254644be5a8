// do and merge: apply a share list file prepared by the back end. Items on
// data volumes update the entry with their path or are inserted before the
// first entry of their volume; items under /mnt/USB/ get a ".davconf" marker.
// merge keeps an existing entry's RW. Only the touched volumes' lists are
// rewritten. 0, or -1 on failure.
#ifndef DAVSYNC_COMMANDS_DO_MERGE_H
#define DAVSYNC_COMMANDS_DO_MERGE_H

int webdav_do_merge(const char *file_name, int merge);

#endif
