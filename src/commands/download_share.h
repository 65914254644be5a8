// p2pen and amulen: publish a download program's folder ("P2P" or "aMule"
// at the root of the volume holding its download location), replacing any
// earlier entry of that kind, and rewrite every volume's list.
#ifndef DAVSYNC_COMMANDS_DOWNLOAD_SHARE_H
#define DAVSYNC_COMMANDS_DOWNLOAD_SHARE_H

int webdav_p2p_share();
int webdav_amule_share();
// Volume index (letter - 'a') of the p2p download location named in the
// settings text, or -1. The text is scanned in pieces of at most 1,023 bytes
// that end at a newline, as the settings file's other readers do.
int p2p_save_volume_in_text(const char *text);

#endif
