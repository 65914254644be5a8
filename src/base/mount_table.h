// The mount table /etc/mtab, read whole once per run under an exclusive
// flock (as its writers expect) and kept as the list of mount directories in
// table order. Fields are read as getmntent(3) reads them: separated by
// blanks, with \040, \011, \012, \134 and \\ decoded; lines that are empty or
// start with '#' are skipped.
#ifndef DAVSYNC_BASE_MOUNT_TABLE_H
#define DAVSYNC_BASE_MOUNT_TABLE_H

#include <cstddef>

struct MountPoint {
    char *dir;  // owned, NUL-terminated
    MountPoint *next;
};

// The table's mount directories, or null for a table with none (and when
// there is no table). 0, or -1 with errno set when it could not be read.
int read_mount_table(MountPoint **table_out);
// Whether `dir` is exactly one of the table's mount directories.
bool is_mount_dir(const MountPoint *table, const char *dir);
void free_mount_table(MountPoint *table);

#endif
