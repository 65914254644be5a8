// The server's WebDAV configuration: a fixed header, then per published
// entry an Alias line and a Directory block with the Dav switch and the
// share's access rules, and a link for every share whose Dav line says On.
#ifndef DAVSYNC_OUTPUT_DAV_CONF_H
#define DAVSYNC_OUTPUT_DAV_CONF_H

#include "output/conf_build.h"
#include "shares/dav_share_entry.h"
#include "shares/share_lookup.h"

// Whether a share is on: its section says "Dav On" and it is linked. Both
// WebDAV and the entry must be enabled (any non-zero flag).
bool entry_is_on(int webdav_enable, const DavShareEntry *entry);
// Writes into build->conf. An entry is taken when its path is not empty, its
// name is safe in the file and not yet published (it is registered then,
// even when no share matches, so that no USB volume takes it), and a
// catalogue share matches its name and path.
void write_dav_conf(ConfBuild *build, int webdav_enable, const DavShareEntry *entries,
                    const ShareLookup *catalogue);

#endif
