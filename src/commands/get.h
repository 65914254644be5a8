// The get command: is a folder published, and under which name? The answer
// goes to /tmp/webdav_query.xml, replaced whole; with WebDAV off a query on a
// data volume removes it; when nothing is found (or a list or the switch
// cannot be read, which is logged) it is left as it was. Takes no lock and
// changes nothing else.
#ifndef DAVSYNC_COMMANDS_GET_H
#define DAVSYNC_COMMANDS_GET_H

#include "shares/dav_share_entry.h"

// 0, or -1 when the folder's lists, the switch or the answer could not be
// read or written (logged), or no data volume is mounted.
int webdav_get(const char *folder);
// Writes the one-item answer file from the entry's shared name, path and
// enable flag. 0, or -1 (errno) when it could not be written.
int write_webdav_query(const DavShareEntry *answer);

#endif
