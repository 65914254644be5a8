// What the black-box families share: a realistic appliance, the fixed rows of
// the configuration text, and one way to state and check the files a run
// must leave.
#ifndef DAVSYNC_TESTS_APPLIANCE_FIXTURE_H
#define DAVSYNC_TESTS_APPLIANCE_FIXTURE_H

#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <functional>
#include <cstdio>
#include <string>
#include <utility>
#include <vector>

#include "harness/appliance.h"

namespace fixture {

using namespace appliance;
using Words = std::vector<std::string>;
using Files = std::vector<std::pair<std::string, std::string>>;  // inside path, expected

inline const std::string A2 = "/mnt/HD/HD_a2", B2 = "/mnt/HD/HD_b2", D2 = "/mnt/HD/HD_d2";
inline const std::string LINKS = "/usr/local/apache2_dav/webdav";
inline const std::string CONF = "/usr/local/apache2_dav/conf/extra/httpd-dav.conf";
inline const std::string NOTE = "/tmp/set_webdav_note", QUERY = "/tmp/webdav_query.xml";
inline const std::string ENABLE = "/system_mgr/webdav/enable";
inline const std::string GONE = "<nothing there>";
inline const std::string ISO = "lighty_iso.xml";
inline std::string list_of(const std::string &volume, const std::string &name = "lighty.xml") {
    return volume + "/.system_data/" + name;
}

inline const std::string HEADER = [] {
    std::string text = "DavLockDB \"/usr/local/apache2_dav/var/DavLock\"\n";
    for (const char *agent : {"Microsoft Data Access Internet Publishing Provider", "MS FrontPage", "^WebDrive",
                              "^WebDAVFS/1.[0123]", "^gnome-vfs/1.0", "^XML Spy", "^Dreamweaver-WebDAV-SCM1"})
        text += "BrowserMatch \"" + std::string(agent) + "\" redirect-carefully\n";
    return text + "\n";
}();
inline const std::string OPEN = "\tAuthType None\n";

// The texts after "Require user " on the read and the write line.
inline std::string authenticated(const std::string &readers, const std::string &writers) {
    return "\tAuthType Basic\n\tAuthName DAV-upload\n\tAuthUserFile \"/etc/passwd.webdav\"\n\n"
           "\t<Limit GET HEAD PROPFIND OPTIONS>\n\t\tRequire user " + readers + "\n\t</Limit>\n\n"
           "\t<LimitExcept GET PROPFIND HEAD OPTIONS>\n\t\tRequire user " + writers +
           "\n\t</LimitExcept>\n\n";
}

inline std::string section(const std::string &name, const std::string &dav, const std::string &access) {
    return "Alias \"/" + name + "\" \"" + LINKS + "/" + name + "\"\n<Directory \"" + LINKS + "/" +
           name + "\">\n\tDav " + dav + "\n\tOptions FollowSymLinks\n\tAllowOverride None\n"
           "\tOrder Allow,Deny\n\tAllow from all\n" + access + "</Directory>\n\n";
}

// Three data volumes (the fourth letter, d, too), an iso list, a marked USB
// volume and a group. Lists are stored with allen 7, a value the tool never
// writes, so any rewrite shows.
inline const std::vector<ListItem> A2_ITEMS = {{"Public", "/Public", 1, 1}, {"Music", "/Music", 0, 1}},
                                   B2_ITEMS = {{"Backup", "/Backup", 1, 0}},
                                   D2_ITEMS = {{"Docs", "/Docs", 1, 1}},
                                   ISO_ITEMS = {{"Disc", "/Disc", 0, 1}};
inline std::vector<Share> realistic_shares() {
    return {{"Public", A2 + "/Public", "#alice#"}, {"Music", A2 + "/Music", "", "", "", "yes"},
            {"Photos", A2 + "/Photos", "#@staff#", "#alice#"},
            {"Backup", B2 + "/Backup", "#@staff#", "", "#carol#"}, {"Docs", D2 + "/Docs", "", "", "", "yes"},
            {"Disc", "/mnt/isoMount/Disc", "", "", "", "", "1"}};
}
inline void publish(Appliance &box, const std::vector<Share> &shares) {
    box.set_catalogue(shares);
    for (const Share &share : shares) box.make_dir(share.path);
}
inline void realistic(Appliance &box) {
    for (const auto &[volume, items] : {std::make_pair(A2, A2_ITEMS), {B2, B2_ITEMS}, {D2, D2_ITEMS}})
        box.mount(volume), box.write_list(volume, items, 7);
    box.write_list(A2, ISO_ITEMS, 7, ISO);
    box.add_group("staff", {"bob", "carol"});
    publish(box, realistic_shares());
    box.mount_usb("USB1");
    box.write("/etc/shared_name", "usbdisk1 = USB1\n");
}

// A set-up: more shares (and their folders), a do/merge input file, then anything else.
inline auto with(const std::vector<Share> &more, const std::vector<ListItem> &input = {},
                 std::function<void(Appliance &)> then = nullptr) {
    return [=](Appliance &box) {
        std::vector<Share> shares = realistic_shares();
        shares.insert(shares.end(), more.begin(), more.end());
        publish(box, shares);
        box.write("/tmp/input.xml", share_list_xml(1, input));
        if (then) then(box);
    };
}
inline Share open_share(const std::string &path) { return {path.substr(path.rfind('/') + 1), path, "", "", "", "yes"}; }

// What is at `path`, in the form `want` takes: the exact content; "-> T", a
// link to T; "mode 755", the permission bits; for a path ending in '/', the
// names in that folder joined by spaces; GONE, nothing.
inline std::string found(const Appliance &box, const std::string &path, const std::string &want) {
    namespace fs = std::filesystem;
    std::string names;
    if (!box.exists(path)) return GONE;
    if (want.rfind("-> ", 0) == 0) return "-> " + box.link_target(path);
    if (want.rfind("mode ", 0) == 0) {
        char mode[16];
        snprintf(mode, sizeof mode, "mode %o", unsigned(fs::status(box.host(path)).permissions() & fs::perms::all));
        return mode;
    }
    if (path.back() != '/') return box.read(path);
    for (const std::string &name : box.list(path)) names += (names.empty() ? "" : " ") + name;
    return names;
}

inline void expect_files(const Appliance &box, const Files &files) {
    for (const auto &[path, want] : files) EXPECT_EQ(found(box, path, want), want) << path;
}

// Each logged line holds its text of `want`, in order; a normal run logs nothing.
inline void expect_logged(Appliance &box, const Words &want) {
    Words lines = box.log_lines();
    EXPECT_EQ(lines.size(), want.size()) << testing::PrintToString(lines);
    for (size_t i = 0; i < lines.size() && i < want.size(); ++i)
        EXPECT_NE(lines[i].find(want[i]), std::string::npos) << lines[i];
}

// One scenario: the set-up after the family's base, what the command leaves.
struct Row {
    const char *what;
    std::function<void(Appliance &)> setup;
    Files files;
    Words command = {"start"};
    Words server_calls = {"restart dav"};
    double at_least_seconds = 0;
    Words logged = {};
};
inline void PrintTo(const Row &row, std::ostream *out) { *out << row.what; }

// Runs the row in a fresh appliance built by `base`; the tool prints nothing.
inline void check(const Row &row, const std::function<void(Appliance &)> &base) {
    SCOPED_TRACE(row.what);
    Appliance box;
    base(box);
    if (row.setup) row.setup(box);
    auto began = std::chrono::steady_clock::now();
    RunResult run = box.run(row.command);
    EXPECT_GE(std::chrono::duration<double>(std::chrono::steady_clock::now() - began).count(),
              row.at_least_seconds);
    EXPECT_EQ(run.status, 0) << run.err;
    EXPECT_EQ(run.out + run.err, "");
    expect_files(box, row.files);
    EXPECT_EQ(box.apache_calls(), row.server_calls);
    expect_logged(box, row.logged);
}

}  // namespace fixture

#endif
