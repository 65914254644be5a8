// du: realign the lists and the configuration with the catalogue after a
// user was deleted. The user name is not consulted. 0, or -1 on failure.
#ifndef DAVSYNC_COMMANDS_DEL_USER_H
#define DAVSYNC_COMMANDS_DEL_USER_H

int webdav_del_user(const char *user);

#endif
