// The server's WebDAV configuration: a fixed header, then per published
// entry an Alias line and a Directory block with the Dav switch and the
// share's access rules, and a link request for every share whose Dav line
// says On.
#ifndef DAVSYNC_OUTPUT_DAV_CONF_H
#define DAVSYNC_OUTPUT_DAV_CONF_H

#include "output/conf_build.h"
#include "shares/dav_share_list.h"
#include "shares/share_lookup.h"

// Writes into build->conf. An entry is taken when its path is not empty, its
// name is safe in the file and not yet in build->published (it is added
// there), and a catalogue share matches its name and path.
void write_dav_conf(ConfBuild *build, int webdav_enable, const DavShareEntry *entries,
                    const ShareLookup *catalogue);

#endif
