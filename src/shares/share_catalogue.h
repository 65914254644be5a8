// The share catalogue: the appliance's file shares, one ShareRecord per
// <item> of <samba> in /var/www/xml/smb.xml (or a USB volume's .smbm.xml).
// An item without a name is overwritten by the next item, so only the last
// record can have an empty name. name, comment and path have "&amp;"
// replaced by "&"; a value longer than its width (which counts the NUL) is
// cut to it at a character boundary.
//
// A catalogue holds thousands of shares whose access lists may each be
// 55,295 characters long but are mostly short, so a record holds its texts
// compactly: every text field points into one block the record owns, and is
// never null (an empty text is "").
#ifndef DAVSYNC_SHARES_SHARE_CATALOGUE_H
#define DAVSYNC_SHARES_SHARE_CATALOGUE_H

#include <cstddef>

#include "base/diagnostics.h"

constexpr size_t ACCESS_LIST_WIDTH = 55296;

struct ShareRecord {
    int volume_raid;
    const char *hd_serial;      // width 512
    const char *name;           // width 1024
    const char *comment;        // width 512
    const char *path;           // width 4096
    const char *browseable;     // width 8
    const char *public_;        // width 8; element "public", a C++ keyword
    const char *oplocks;        // width 8
    const char *map_archive;    // width 8
    const char *read_list;      // width ACCESS_LIST_WIDTH
    const char *write_list;     // width ACCESS_LIST_WIDTH
    const char *invalid_users;  // width ACCESS_LIST_WIDTH
    int recycle_enable;
    int recycle_tree;
    int web_public;
    char *texts;  // the block every text field points into
    ShareRecord *next;
};

// An empty record (every text "", every number 0) with a null next, or null
// when memory is exhausted.
[[nodiscard]] ShareRecord *new_share_record();
// Reads /var/www/xml/smb.xml whole into the list at a fresh `head`. 0 on
// success, also when <samba> holds no <item>; -1 with the failure noted when
// the file is missing, cannot be read, does not parse, has no root or no
// <samba>, or memory runs out (records read so far stay).
int read_share_catalogue(ShareRecord *head, RunFailure *failure);
// The same from a catalogue's text (read up to its first NUL byte): 0, or -1.
int read_share_catalogue_text(ShareRecord *head, const char *text, size_t length);
// Clears and frees every record from head along next; null does nothing.
void free_share_catalogue(ShareRecord *head);

#endif
