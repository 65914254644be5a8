#include "shares/volume_table.h"

#include <cstring>

#include "base/record_list.h"
#include "base/text_field.h"

VolumeEntry *new_volume_entry() { return new_zeroed_record<VolumeEntry>(); }

void free_volume_list(VolumeEntry *head) { free_record_list(head); }

int scan_data_volumes(const MountPoint *mounts, VolumeEntry *head) {
    if (head == nullptr) return -1;
    VolumeEntry *tail = nullptr;
    for (const MountPoint *mount = mounts; mount != nullptr; mount = mount->next) {
        if (strstr(mount->dir, "/mnt/HD/") == nullptr) continue;
        if (strlen(mount->dir) >= sizeof head->mount_dir) continue;
        VolumeEntry *entry = tail == nullptr ? head : new_volume_entry();
        if (entry == nullptr) return -1;
        copy_text(entry->mount_dir, mount->dir);
        if (tail != nullptr) tail->next = entry;
        tail = entry;
    }
    return tail != nullptr ? 0 : -1;
}
