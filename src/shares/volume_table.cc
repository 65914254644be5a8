#include "shares/volume_table.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <mntent.h>

#include "base/record_list.h"
#include "base/text_field.h"

VolumeEntry *new_volume_entry() { return new_zeroed_record<VolumeEntry>(); }

void free_volume_list(VolumeEntry *head) { free_record_list(head); }

int scan_data_volumes(VolumeEntry *head) {
    if (head == nullptr) return -1;
    FILE *table = setmntent("/etc/mtab", "r");
    if (table == nullptr) return -1;
    VolumeEntry *tail = nullptr;
    int result = 0;
    while (struct mntent *mount = getmntent(table)) {
        if (strstr(mount->mnt_dir, "/mnt/HD/") == nullptr) continue;
        if (strlen(mount->mnt_dir) >= sizeof head->mount_dir) continue;
        VolumeEntry *entry = tail == nullptr ? head : new_volume_entry();
        if (entry == nullptr) {
            result = -1;
            break;
        }
        copy_text(entry->mount_dir, mount->mnt_dir);
        if (tail != nullptr) tail->next = entry;
        tail = entry;
    }
    endmntent(table);
    return (result == 0 && tail != nullptr) ? 0 : -1;
}
