// The note file /tmp/set_webdav_note: one shared name per line, first those
// of the entries, then those of the marked USB volumes.
#ifndef DAVSYNC_OUTPUT_WEBDAV_NOTE_H
#define DAVSYNC_OUTPUT_WEBDAV_NOTE_H

#include <cstdio>

#include "output/conf_build.h"
#include "shares/dav_share_entry.h"

// The note is to be written anew: the name of every entry whose path is not
// empty, into build->note.
void write_webdav_note(ConfBuild *build, const DavShareEntry *entries);
void write_note_line(FILE *note, const char *shared_name);

#endif
