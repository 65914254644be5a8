// Configuration database client (stand-in). Values live in
// /etc/NAS_CFG/config_db.xml and are found by slash path from the root
// element: "/system_mgr/webdav/enable" is the first <system_mgr>, in it the
// first <webdav>, in it the first <enable>. Values are returned untrimmed.
#ifndef DAVSYNC_PLATFORM_CONFIG_DB_H
#define DAVSYNC_PLATFORM_CONFIG_DB_H

extern "C" {
// Copies at most size-1 bytes of the value and a NUL into buf; 0. On a missing
// file, unparsable file or missing element: buf untouched, -1.
int xml_get_str(const char *path, int size, char *buf);
// The value converted with strtol base 10; -1 when the value is missing.
int xml_get_int(const char *path);
}

// The same lookups in another file (the functions above use the fixed one).
int xml_get_str_in(const char *file, const char *path, int size, char *buf);
int xml_get_int_in(const char *file, const char *path);

#endif
