// chg: entries whose path begins with the old folder path get the new one
// (only while the old folder still exists), then the start cycle runs.
#ifndef DAVSYNC_COMMANDS_CHG_H
#define DAVSYNC_COMMANDS_CHG_H

int webdav_chg(const char *old_path, const char *new_path);

#endif
