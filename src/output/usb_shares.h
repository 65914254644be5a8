// The marked USB volumes' part of the configuration: a section (always
// "Dav On") and a link for each volume with a usable shared name not
// published yet, and a note line for every marked volume.
#ifndef DAVSYNC_OUTPUT_USB_SHARES_H
#define DAVSYNC_OUTPUT_USB_SHARES_H

#include "output/conf_build.h"
#include "shares/usb_volumes.h"

// Appends to build->conf and build->note (which is then wanted) when
// /mnt/USB was scanned; nothing otherwise.
void append_usb_shares(ConfBuild *build, const UsbScan *scan);

#endif
