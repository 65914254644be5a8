// Pieces shared by the writers of /tmp/dav.conf and of the note file, so
// that entry shares and USB volumes get the very same sections and lines.
#ifndef DAVSYNC_OUTPUT_CONF_WRITER_H
#define DAVSYNC_OUTPUT_CONF_WRITER_H

#include <cstdio>

#include "shares/share_catalogue.h"

constexpr const char *DAV_CONF_FILE = "/tmp/dav.conf";
constexpr const char *DAV_LINK_DIR = "/usr/local/apache2_dav/webdav";
constexpr int CONF_LINE_WIDTH = 12800;

// Opens a file under /tmp without following a link ("w" or "a") and takes
// an exclusive flock on it. Null when either fails.
FILE *open_locked(const char *path, const char *mode);
// Flushes, releases the lock and closes.
void close_locked(FILE *file);
// True when anything, even a dangling link, is at `path`.
bool path_exists(const char *path);

// A shared name stands in double quotes in the configuration: one with a
// double quote, a backslash or a control byte would break it.
bool is_conf_safe_name(const char *shared_name);
// Rows Alias to the blank line after </Directory>. `rules` null gives the
// open access block; otherwise the block follows the share's lists.
// A link name must name an entry directly in the link directory: a '/' or a
// name of "." or ".." would let a share name place a link elsewhere as root.
bool is_link_name(const char *shared_name);
void write_share_section(FILE *conf, const char *shared_name, bool dav_on,
                         const ShareRecord *rules);
void write_note_line(FILE *note, const char *shared_name);

#endif
