// p2pen and amulen: publish a download program's folder ("P2P" or "aMule"
// at the root of the volume holding its download location), replacing any
// earlier entry of that kind, and rewrite every volume's list.
#ifndef DAVSYNC_COMMANDS_DOWNLOAD_SHARE_H
#define DAVSYNC_COMMANDS_DOWNLOAD_SHARE_H

#include "shares/dav_share_list.h"

int webdav_p2p_share();
int webdav_amule_share();
// Volume index (letter - 'a') of the entry added, or -1 when none was.
int add_p2p_share_entry(DavShareEntry *entries);
int add_amule_share_entry(DavShareEntry *entries);
// Volume index of the p2p download location in the settings file, or -1.
int read_p2p_save_volume();
// The same scan of another settings file.
int read_p2p_save_volume_from(const char *settings_path);

#endif
