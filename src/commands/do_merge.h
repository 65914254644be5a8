// do and merge: apply a share list file prepared by the back end. Items on
// data volumes update the entry with their path or are inserted before the
// first entry of their volume; items under /mnt/USB/ mark their folder with
// ".davconf". merge keeps an existing entry's RW. Only the touched volumes'
// lists are rewritten. An input that cannot be read whole, or is no share
// list, changes nothing. 0, or -1 after the failure exit.
#ifndef DAVSYNC_COMMANDS_DO_MERGE_H
#define DAVSYNC_COMMANDS_DO_MERGE_H

int webdav_do_merge(const char *file_name, int merge);

#endif
