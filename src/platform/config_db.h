// Configuration database client (stand-in). Values live in
// /etc/NAS_CFG/config_db.xml and are found by slash path from the root
// element: "/system_mgr/webdav/enable" is the first <system_mgr>, in it the
// first <webdav>, in it the first <enable>. Values are returned untrimmed.
// The file is parsed once per process and again only when it has changed
// since (another file, size or time).
#ifndef DAVSYNC_PLATFORM_CONFIG_DB_H
#define DAVSYNC_PLATFORM_CONFIG_DB_H

extern "C" {
// Copies at most size-1 bytes of the value and a NUL into buf; 0. On a missing
// file, unparsable file or missing element: buf untouched, -1. On -1, errno
// is ENOENT for a missing file or element, EBADMSG for a file that does not
// parse, and otherwise the error that kept the file from being read.
int xml_get_str(const char *path, int size, char *buf);
// The value converted with strtol base 10; -1 when the value is missing
// (errno as above; a value of -1 leaves errno 0).
int xml_get_int(const char *path);
}

#endif
