// Switches of the appliance's configuration database. A switch is on only
// when its text is exactly "1"; a missing or unreadable value is off.
#ifndef DAVSYNC_CYCLE_CONFIG_SWITCHES_H
#define DAVSYNC_CYCLE_CONFIG_SWITCHES_H

bool config_switch_on(const char *slash_path);
// The WebDAV enable flag: 1 exactly when /system_mgr/webdav/enable is "1".
int read_webdav_enable_flag();

#endif
