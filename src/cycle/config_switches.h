// Switches of the appliance's configuration database. A switch is on only
// when its text is exactly "1"; a missing value, and a database that is
// missing or does not parse, count as off (states of the data). A database
// that could not be read is no state of the data: the run stops.
#ifndef DAVSYNC_CYCLE_CONFIG_SWITCHES_H
#define DAVSYNC_CYCLE_CONFIG_SWITCHES_H

#include "base/diagnostics.h"

constexpr char WEBDAV_SWITCH[] = "/system_mgr/webdav/enable";
constexpr char DIRECTORY_SERVICE_SWITCH[] = "/system_mgr/samba/ads_enable";
constexpr char P2P_SWITCH[] = "/download_mgr/p2p/enable";

// 0 with *on set, or -1 with the failure noted.
int read_config_switch(const char *slash_path, bool *on, RunFailure *failure);
// The p2p switch is on when its value converts to exactly 1.
int read_p2p_switch(bool *on, RunFailure *failure);

#endif
