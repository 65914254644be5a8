// The web server's WebDAV configuration, written to /tmp/dav.conf: a fixed
// header, then per published entry an Alias line and a Directory block with
// the Dav switch and the share's access rules, and a link in
// /usr/local/apache2_dav/webdav for every share whose Dav line says On.
#ifndef DAVSYNC_OUTPUT_DAV_CONF_H
#define DAVSYNC_OUTPUT_DAV_CONF_H

#include "shares/dav_share_list.h"
#include "shares/path_list.h"
#include "shares/share_catalogue.h"

// 0 when the file was written (the header at least); -1 when /tmp/dav.conf
// already exists or cannot be opened or locked: then nothing is written and
// no command is run. Every shared name it takes is added to `published`.
int write_dav_conf(int webdav_enable, const DavShareEntry *entries, PathNode *published,
                   const ShareRecord *catalogue);

#endif
