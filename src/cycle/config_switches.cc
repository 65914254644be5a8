#include "cycle/config_switches.h"

#include "platform/config_db.h"

bool config_switch_on(const char *slash_path) {
    char value[8] = {};
    xml_get_str(slash_path, sizeof value, value);
    return value[0] == '1' && value[1] == '\0';
}

int read_webdav_enable_flag() { return config_switch_on("/system_mgr/webdav/enable") ? 1 : 0; }
