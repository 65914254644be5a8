// The link directory /usr/local/apache2_dav/webdav: one symbolic link per
// share whose section says "Dav On", pointing at the shared folder. The
// links a run needs are collected while the configuration is built and the
// directory is brought in line in one pass.
#ifndef DAVSYNC_OUTPUT_LINK_DIR_H
#define DAVSYNC_OUTPUT_LINK_DIR_H

#include "shares/path_list.h"

struct LinkRequest {
    char name[PATH_NODE_WIDTH];
    char target[PATH_NODE_WIDTH];
    LinkRequest *next;
};

// A link name must name an entry directly in the link directory: a '/' or a
// name of "." or ".." would let a share name place a link elsewhere.
bool is_link_name(const char *shared_name);
// Adds a request at the front of `*list`; names that are no link names, and
// texts too long to hold, are not requested.
void request_link(LinkRequest **list, const char *name, const char *target);
void free_link_requests(LinkRequest *list);

// Creates the directory (with its parents) when missing. Removes every
// entry whose name does not start with a dot and that is not a folder,
// except a link that already points where a request wants it; then makes
// each requested link where nothing exists. A link directory that is itself
// a link is left alone. Nothing outside the directory is ever written.
void sync_link_dir(const LinkRequest *wanted);

#endif
