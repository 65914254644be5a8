// The volume table: the mounted data volumes, i.e. every mount directory of
// the mount table that contains "/mnt/HD/", in table order. Mount
// directories too long for mount_dir are left out.
#ifndef DAVSYNC_SHARES_VOLUME_TABLE_H
#define DAVSYNC_SHARES_VOLUME_TABLE_H

#include "base/mount_table.h"

constexpr int MOUNT_DIR_WIDTH = 32;

struct VolumeEntry {
    char mount_dir[MOUNT_DIR_WIDTH];
    VolumeEntry *next;
};

// Zero-filled entry, or null when memory is exhausted.
[[nodiscard]] VolumeEntry *new_volume_entry();
// Fills the table at `head` (zero-filled) from the mount table: the first
// volume goes into head, the rest are appended. 0 when at least one volume
// was found, -1 when none was or memory ran out.
int scan_data_volumes(const MountPoint *mounts, VolumeEntry *head);
void free_volume_list(VolumeEntry *head);

#endif
