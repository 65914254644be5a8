// The note file /tmp/set_webdav_note: one shared name per line, first those
// of the entries (written here), then those of the marked USB volumes.
#ifndef DAVSYNC_OUTPUT_WEBDAV_NOTE_H
#define DAVSYNC_OUTPUT_WEBDAV_NOTE_H

#include "shares/dav_share_list.h"

constexpr const char *WEBDAV_NOTE_FILE = "/tmp/set_webdav_note";

// Rewrites the file with the name of every entry whose path is not empty.
// 0, or -1 when it cannot be opened or locked.
int write_webdav_note(const DavShareEntry *entries);

#endif
