#include "cycle/config_switches.h"

#include <cerrno>

#include "platform/config_db.h"

static const char CONFIG_DATABASE[] = "the configuration database";

// The database client tells a missing value (ENOENT) and a file that does
// not parse (EBADMSG) from one it could not read.
static bool is_state_of_data(int error) { return error == ENOENT || error == EBADMSG; }

int read_config_switch(const char *slash_path, bool *on, RunFailure *failure) {
    char value[8] = {};
    errno = 0;
    if (xml_get_str(slash_path, sizeof value, value) != 0 && !is_state_of_data(errno))
        return note_failure(failure, "cannot read", CONFIG_DATABASE, errno);
    *on = value[0] == '1' && value[1] == '\0';
    return 0;
}

int read_p2p_switch(bool *on, RunFailure *failure) {
    errno = 0;
    int value = xml_get_int(P2P_SWITCH);
    if (value == -1 && errno != 0 && !is_state_of_data(errno))
        return note_failure(failure, "cannot read", CONFIG_DATABASE, errno);
    *on = value == 1;
    return 0;
}
