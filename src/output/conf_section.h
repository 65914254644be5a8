// One share's section of the server configuration: the Alias line and the
// Directory block with its Dav switch and access rules. Entry shares and
// USB volumes get the very same sections.
#ifndef DAVSYNC_OUTPUT_CONF_SECTION_H
#define DAVSYNC_OUTPUT_CONF_SECTION_H

#include <cstdio>

#include "access/user_list.h"
#include "shares/share_catalogue.h"

// A shared name stands in double quotes in the configuration, after the
// link directory: one with a double quote, a backslash or a control byte
// would break the file, and one that is no link name ("", ".", "..", or with
// a '/') would name a folder outside the link directory, up to "/".
bool is_conf_safe_name(const char *shared_name);
// Rows Alias to the blank line after </Directory>. `rules` null gives the
// open access block; otherwise the block follows the share's lists: open
// when a list names allaccount, public holds "yes" or web_public is 1, else
// authenticated with the readers and writers less the invalid users.
// Groups come from `groups`. 0, or -1 when memory ran out on the way.
int write_share_section(FILE *conf, GroupTable *groups, const char *shared_name, bool dav_on,
                         const ShareRecord *rules);

#endif
