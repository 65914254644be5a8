// USB volumes mounted directly under /mnt/USB, read before anything is
// written: whether each carries the ".davconf" marker (as this run's own
// change leaves it), its shared name from /etc/shared_name and its own share
// catalogue ".smbm.xml". A volume belongs to whoever plugged it in: no link
// on it is followed.
#ifndef DAVSYNC_SHARES_USB_VOLUMES_H
#define DAVSYNC_SHARES_USB_VOLUMES_H

#include "base/commit_record.h"
#include "base/diagnostics.h"
#include "base/mount_table.h"
#include "shares/path_list.h"
#include "shares/share_catalogue.h"

constexpr int SHARED_NAME_WIDTH = 512;

struct UsbVolume {
    char path[PATH_NODE_WIDTH];             // "/mnt/USB/<name>"
    char shared_name[SHARED_NAME_WIDTH];    // "" when /etc/shared_name names none
    ShareRecord *rules;  // its catalogue's shares; null without one, empty when it does not parse
    UsbVolume *next;
};

struct UsbScan {
    bool scanned;         // /mnt/USB exists and was read
    UsbVolume *volumes;   // the marked ones, in the folder's reading order
};

// Fills `scan`. A marker counts as the steps in `changes` leave it. 0, or -1
// with the failure noted when something could not be read.
int read_usb_volumes(const MountPoint *mounts, const ChangeSet *changes, UsbScan *scan,
                     RunFailure *failure);
void free_usb_scan(UsbScan *scan);

// NAME of the first line "NAME = VALUE" of the text that contains `dir_name`
// anywhere: what comes before the line's first blank, cut to 255 bytes;
// "" when no line contains it.
void shared_name_in(const char *text, const char *dir_name, char (&name)[SHARED_NAME_WIDTH]);

#endif
