// The link directory /usr/local/apache2_dav/webdav: one symbolic link per
// share whose section says "Dav On", pointing at the share's own folder.
// The links a run needs are collected while the configuration is built; the
// directory is checked before anything is changed (so that one that cannot
// be used stops the run first) and brought in line once the change is stored.
#ifndef DAVSYNC_OUTPUT_LINK_DIR_H
#define DAVSYNC_OUTPUT_LINK_DIR_H

#include "base/diagnostics.h"
#include "shares/path_list.h"

struct LinkRequest {
    char name[PATH_NODE_WIDTH];
    char target[PATH_NODE_WIDTH];
    LinkRequest *next;
};

// A link name must name an entry directly in the link directory: "", a '/' or
// a name of "." or ".." would let a share name place a link elsewhere.
bool is_link_name(const char *shared_name);
// Adds a request at the front of `*list`; names that are no link names, and
// texts too long to hold, are not requested (0). -1 when memory runs out.
int request_link(LinkRequest **list, const char *name, const char *target);
void free_link_requests(LinkRequest *list);

// 0 when the link directory is a folder or missing (it is made later); -1
// (errno) when it cannot be used: ELOOP when a link stands in its place,
// through which nothing is ever removed or made, ENOTDIR for anything else.
int check_link_dir();
// The link directory, made with its parents when missing. -1 (errno) when it
// cannot be used.
[[nodiscard]] int open_link_dir();
// Brings the open directory in line with `wanted`: every entry that is not a
// folder and has no wanted name goes (names that start with a dot too); each
// wanted link is made unless it already points where it is wanted,
// replacing in one rename what else stands at its name, so a share never
// lacks its link while it is re-pointed. A folder at a wanted name stays and is told.
// Nothing outside the directory is written. 0, or -1 with the failure noted.
int sync_link_dir(int dir_fd, const LinkRequest *wanted, const char *command, RunFailure *failure);

#endif
