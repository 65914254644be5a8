// The get command: is a folder published, and under which name? The answer
// goes to /tmp/webdav_query.xml. Takes no lock and changes no configuration.
#ifndef DAVSYNC_COMMANDS_GET_H
#define DAVSYNC_COMMANDS_GET_H

#include "shares/dav_share_list.h"

// 0, or -1 when the WebDAV share lists cannot be loaded.
int webdav_get(const char *folder);
// Writes the one-item answer file from the entry's shared name, path and
// enable flag. 0, or -1 when the file cannot be opened or locked.
int write_webdav_query(const DavShareEntry *answer);

#endif
