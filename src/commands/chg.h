// chg: entries whose path begins with the old folder path get the new one
// (only while the old folder still exists, and only when the new one can be
// shared), then the start cycle runs. 0, or -1 after the failure exit or for
// a path longer than an entry's (told).
#ifndef DAVSYNC_COMMANDS_CHG_H
#define DAVSYNC_COMMANDS_CHG_H

int webdav_chg(const char *old_path, const char *new_path);

#endif
