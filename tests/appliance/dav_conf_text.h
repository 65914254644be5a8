// The configuration text the tool must write, assembled from its fixed rows,
// for the black-box tests to compare against byte for byte; and where a
// start run leaves it, the links and the note.
#ifndef DAVSYNC_TESTS_APPLIANCE_DAV_CONF_TEXT_H
#define DAVSYNC_TESTS_APPLIANCE_DAV_CONF_TEXT_H

#include <gtest/gtest.h>

#include <string>

#include "harness/appliance.h"

namespace dav_conf_text {

inline const std::string LINKS = "/usr/local/apache2_dav/webdav";
inline const char *const CONF = "/usr/local/apache2_dav/conf/extra/httpd-dav.conf";
inline const char *const NOTE = "/tmp/set_webdav_note";

// Runs "start", which must succeed silently, and returns the placed configuration.
inline std::string start_and_read_conf(const appliance::Appliance &box) {
    appliance::RunResult result = box.run({"start"});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out, "");
    return box.read_file(CONF);
}

inline const std::string HEADER =
    "DavLockDB \"/usr/local/apache2_dav/var/DavLock\"\n"
    "BrowserMatch \"Microsoft Data Access Internet Publishing Provider\" redirect-carefully\n"
    "BrowserMatch \"MS FrontPage\" redirect-carefully\n"
    "BrowserMatch \"^WebDrive\" redirect-carefully\n"
    "BrowserMatch \"^WebDAVFS/1.[0123]\" redirect-carefully\n"
    "BrowserMatch \"^gnome-vfs/1.0\" redirect-carefully\n"
    "BrowserMatch \"^XML Spy\" redirect-carefully\n"
    "BrowserMatch \"^Dreamweaver-WebDAV-SCM1\" redirect-carefully\n\n";

inline const std::string OPEN = "\tAuthType None\n";

// `readers` and `writers` are what follows "Require user " on the two lines.
inline std::string authenticated(const std::string &readers, const std::string &writers) {
    return "\tAuthType Basic\n\tAuthName DAV-upload\n\tAuthUserFile \"/etc/passwd.webdav\"\n\n"
           "\t<Limit GET HEAD PROPFIND OPTIONS>\n\t\tRequire user " + readers + "\n\t</Limit>\n\n"
           "\t<LimitExcept GET PROPFIND HEAD OPTIONS>\n\t\tRequire user " + writers +
           "\n\t</LimitExcept>\n\n";
}

inline std::string section(const std::string &name, const std::string &dav,
                           const std::string &access) {
    return "Alias \"/" + name + "\" \"" + LINKS + "/" + name + "\"\n<Directory \"" + LINKS + "/" +
           name + "\">\n\tDav " + dav + "\n\tOptions FollowSymLinks\n\tAllowOverride None\n"
           "\tOrder Allow,Deny\n\tAllow from all\n" + access + "</Directory>\n\n";
}

}  // namespace dav_conf_text

#endif
