// The share catalogue: the appliance's file shares, one ShareRecord per
// <item> of <samba> in /var/www/xml/smb.xml (or a USB volume's .smbm.xml).
// An item without a name is overwritten by the next item, so only the last
// record can have an empty name. name, comment and path have "&amp;"
// replaced by "&"; overlong values are cut to their field.
#ifndef DAVSYNC_SHARES_SHARE_CATALOGUE_H
#define DAVSYNC_SHARES_SHARE_CATALOGUE_H

constexpr int ACCESS_LIST_WIDTH = 55296;

struct ShareRecord {
    int volume_raid;
    char hd_serial[512];
    char name[1024];
    char comment[512];
    char path[4096];
    char browseable[8];
    char public_[8];  // element "public"; a C++ keyword does not allow the bare name
    char oplocks[8];
    char map_archive[8];
    char read_list[ACCESS_LIST_WIDTH];
    char write_list[ACCESS_LIST_WIDTH];
    char invalid_users[ACCESS_LIST_WIDTH];
    int recycle_enable;
    int recycle_tree;
    int web_public;
    ShareRecord *next;
};

// Zero-filled record with a null next, or null when memory is exhausted.
ShareRecord *new_share_record();
// Read the catalogue into the list at a fresh `head`. 0 on success, also
// when <samba> holds no <item>; -1 for a null head, a missing or unparsable
// file, no root or no <samba>, or memory exhausted (records read so far stay).
int read_share_catalogue(ShareRecord *head);
int read_share_catalogue_file(ShareRecord *head, const char *file_path);
// Clears and frees every record from head along next; null does nothing.
void free_share_catalogue(ShareRecord *head);

#endif
