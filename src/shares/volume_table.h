// The volume table: the mounted data volumes, i.e. every mount directory in
// /etc/mtab that contains "/mnt/HD/", in mount-table order. Walkers skip an
// entry whose mount_dir is empty.
#ifndef DAVSYNC_SHARES_VOLUME_TABLE_H
#define DAVSYNC_SHARES_VOLUME_TABLE_H

#include "base/appliance_paths.h"

constexpr int MOUNT_DIR_WIDTH = 32;

struct VolumeEntry {
    char mount_dir[MOUNT_DIR_WIDTH];
    VolumeEntry *next;
};

// Zero-filled entry, or null when memory is exhausted.
[[nodiscard]] VolumeEntry *new_volume_entry();
// Fills the table at `head` (non-null, zero-filled): the first volume goes
// into head, the rest are appended. 0 when at least one volume was found,
// -1 when none was, /etc/mtab cannot be opened or memory runs out. Mount
// directories too long for mount_dir are skipped.
int scan_data_volumes(VolumeEntry *head);
void free_volume_list(VolumeEntry *head);

#endif
