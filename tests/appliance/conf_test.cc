// The WebDAV configuration and its links, as a start run leaves them.
#include <gmock/gmock.h>

#include <filesystem>
#include <set>

#include "appliance/dav_conf_text.h"
#include "harness/appliance.h"

using appliance::ListItem;
using appliance::Share;
using dav_conf_text::authenticated;
using dav_conf_text::HEADER;
using dav_conf_text::OPEN;
using dav_conf_text::section;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

namespace {

const char *const A2 = "/mnt/HD/HD_a2";
const char *const B2 = "/mnt/HD/HD_b2";
const std::string LINKS = "/usr/local/apache2_dav/webdav";
const char *const CONF = "/usr/local/apache2_dav/conf/extra/httpd-dav.conf";
const char *const NOTE = "/tmp/set_webdav_note";

std::string replace_all(std::string text, const std::string &from, const std::string &to) {
    for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
        text.replace(at, from.size(), to);
    return text;
}

class ConfFile : public ::testing::Test {
protected:
    appliance::Appliance box;

    void SetUp() override {
        box.mount(A2);
        box.mount(B2);
        box.set_config("/system_mgr/webdav/enable", "1");
        box.set_config("/system_mgr/samba/ads_enable", "0");
        for (const char *user : {"alice", "bob", "carol", "dave", "mallory"}) box.add_user(user);
        box.add_group("staff", {"bob", "carol"});
        box.add_group("team", {"carol", "dave"});
    }

    // Publishes every share on A2 under its own name, enabled unless listed
    // in `disabled`; the folders are made.
    void publish_on_a2(const std::vector<Share> &shares, const std::set<std::string> &disabled = {}) {
        box.set_catalogue(shares);
        std::vector<ListItem> items;
        for (const Share &share : shares) {
            box.make_dir(share.path);
            items.push_back({share.name, share.path.substr(13), 1, disabled.count(share.name) ? 0 : 1});
        }
        box.write_share_list(A2, items);
    }

    std::string start() {
        appliance::RunResult result = box.run({"start"});
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_EQ(result.out, "");
        return box.read_file(CONF);
    }

    // Names of files anywhere in the root, links not followed.
    bool any_file_named(const std::set<std::string> &names) const {
        namespace fs = std::filesystem;
        for (const auto &entry : fs::recursive_directory_iterator(box.root()))
            if (names.count(entry.path().filename().string())) return true;
        return false;
    }
};

class RealisticCatalogue : public ConfFile {
protected:
    void SetUp() override {
        ConfFile::SetUp();
        std::vector<Share> shares = {
            {"Public", "/mnt/HD/HD_a2/Public", "", "", "", "yes", ""},
            {"Team", "/mnt/HD/HD_a2/Team", "#alice#,#@staff#", "#dave#,#mallory#",
             "#mallory#,#carol#", "", ""},
            {"Empty", "/mnt/HD/HD_a2/Empty", "", "", "", "", ""},
            {"Paused", "/mnt/HD/HD_a2/Paused", "#alice#", "", "", "", "1"},
            {"My Files", "/mnt/HD/HD_a2/My Files", "#alice#,#alice#", "#bob#", "#@allaccount#",
             "no", "2"},
            {"Public", "/mnt/HD/HD_b2/Public", "", "", "", "yes", ""},
        };
        box.set_catalogue(shares);
        for (const Share &share : shares) box.make_dir(share.path);
        box.make_dir("/mnt/HD/HD_a2/Lost");
        box.write_share_list(A2, {{"Public", "/Public", 1, 1}, {"Team", "/Team", 1, 1},
                                  {"Empty", "/Empty", 1, 1}, {"Paused", "/Paused", 1, 0},
                                  {"Lost", "/Lost", 1, 1}, {"My Files", "/My Files", 1, 1}});
        box.write_share_list(B2, {{"Public", "/Public", 1, 1}});
    }

    const std::string expected = HEADER + section("Public", "On", OPEN) +
                                 section("Team", "On", authenticated("alice bob dave ", "dave ")) +
                                 section("Empty", "On", authenticated("", "")) +
                                 section("Paused", "Off", OPEN) +
                                 section("My Files", "On", authenticated("alice alice bob ", "bob "));
};

TEST_F(RealisticCatalogue, ConfigurationLinksAndNoteAreExactlyAsDesigned) {
    EXPECT_EQ(start(), expected);
    // A disabled entry and the second share named Public get no link.
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Empty", "My Files", "Public", "Team"));
    EXPECT_EQ(box.link_target(LINKS + "/Public"), "/mnt/HD/HD_a2/Public");
    EXPECT_EQ(box.link_target(LINKS + "/Team"), "/mnt/HD/HD_a2/Team");
    EXPECT_EQ(box.link_target(LINKS + "/My Files"), "/mnt/HD/HD_a2/My Files");
    EXPECT_EQ(box.read_file(NOTE), "Public\nTeam\nEmpty\nPaused\nMy Files\nPublic\n");
}

TEST_F(RealisticCatalogue, WebdavOffTurnsEverySectionOffAndMakesNoLink) {
    box.set_config("/system_mgr/webdav/enable", "0");
    EXPECT_EQ(start(), replace_all(expected, "\tDav On\n", "\tDav Off\n"));
    EXPECT_THAT(box.list_dir(LINKS), IsEmpty());
}

TEST_F(RealisticCatalogue, SomethingAlreadyAtTheLinkPathIsLeftAlone) {
    box.make_dir(LINKS + "/Team");  // a directory survives the "rm" of the old links
    box.write_file(LINKS + "/Team/keep", "x");
    EXPECT_EQ(start(), expected);
    EXPECT_THAT(box.list_dir(LINKS + "/Team"), ElementsAre("keep"));
}

TEST_F(ConfFile, GroupsAddOnlyTheirListedMembersAndNeverRepeatAName) {
    // erin's primary group is staff, but staff does not list her.
    std::string groups = box.read_file("/etc/group");
    size_t line = groups.find("\nstaff:") == std::string::npos ? 0 : groups.find("\nstaff:") + 1;
    ASSERT_EQ(groups.compare(line, 6, "staff:"), 0) << groups;
    size_t gid_at = groups.find(':', groups.find(':', line) + 1) + 1;
    std::string gid = groups.substr(gid_at, groups.find(':', gid_at) - gid_at);
    box.write_file("/etc/passwd",
                   box.read_file("/etc/passwd") + "erin:x:1077:" + gid + "::/home/erin:/bin/sh\n");

    publish_on_a2({
        {"G1", "/mnt/HD/HD_a2/G1", "#bob#,#@staff#", "#@staff#,#bob#", "", "", ""},
        {"G2", "/mnt/HD/HD_a2/G2", "#@staff#,#@team#,#@ghosts#", "", "", "", ""},
        {"G3", "/mnt/HD/HD_a2/G3", "#@staff#,#@AllAccount#", "#@ghosts#", "#@team#", "", ""},
    });
    EXPECT_EQ(start(), HEADER +
                           section("G1", "On", authenticated("bob carol bob carol bob ", "bob carol bob ")) +
                           section("G2", "On", authenticated("bob carol dave ", "")) +
                           section("G3", "On", authenticated("bob ", "")));
}

TEST_F(ConfFile, AllaccountAnywhereInTheRawListsOpensTheShare) {
    publish_on_a2({
        {"R", "/mnt/HD/HD_a2/R", "#@allaccount#", "#bob#", "", "", ""},
        {"W", "/mnt/HD/HD_a2/W", "#bob#", "#@allaccount#", "#bob#", "", "0"},
        {"U", "/mnt/HD/HD_a2/U", "#allaccountant#", "", "", "", ""},
        {"I", "/mnt/HD/HD_a2/I", "#alice#", "", "#@allaccount#", "", ""},
    });
    EXPECT_EQ(start(), HEADER + section("R", "On", OPEN) + section("W", "On", OPEN) +
                           section("U", "On", OPEN) +
                           section("I", "On", authenticated("alice ", "")));
}

TEST_F(ConfFile, CommandLinesCarryNoDataTheShellWouldRun) {
    box.write_file("/tmp/payload.sh", "#!/bin/sh\ntouch /pwned-by-script\n", 0755);
    const std::string neutralised = "x$(touch${IFS}pwned7)`touch pwned8`";
    publish_on_a2({
        {"x|touch /pwned", "/mnt/HD/HD_a2/x1", "", "", "", "yes", ""},
        {"x\\;touch /pwned", "/mnt/HD/HD_a2/x2", "", "", "", "yes", ""},
        {"x|/tmp/payload.sh", "/mnt/HD/HD_a2/x3", "", "", "", "yes", ""},
        {"Q", "/mnt/HD/HD_a2/q|/tmp/payload.sh", "", "", "", "yes", ""},
        {neutralised, "/mnt/HD/HD_a2/x4", "", "", "", "yes", ""},
        {"../../../../etc/evil", "/mnt/HD/HD_a2/x5", "", "", "", "yes", ""},
    });
    box.mount("/mnt/USB/USB1", "/dev/sdc1", "vfat");
    box.write_file("/mnt/USB/USB1/.davconf", "ON");
    box.mount("/mnt/USB/USB2;touch${IFS}pwned6", "/dev/sdd1", "vfat");
    box.write_file("/mnt/USB/USB2;touch${IFS}pwned6/.davconf", "ON");
    box.write_file("/etc/shared_name",
                   "x;touch${IFS}/pwned5 = USB1\nevil2 = USB2;touch${IFS}pwned6\n");

    std::string conf = start();
    for (const char *planted : {"/pwned", "/pwned-by-script", "/pwned5", "/etc/evil"})
        EXPECT_FALSE(box.exists(planted)) << planted;
    EXPECT_FALSE(any_file_named({"pwned6", "pwned7", "pwned8"}));
    // Names the configuration can carry keep their sections; only the links go.
    for (const char *name : {"x|touch /pwned", "x|/tmp/payload.sh", "Q", "x;touch${IFS}/pwned5",
                             "evil2"})
        EXPECT_THAT(conf, HasSubstr(section(name, "On", OPEN))) << name;
    EXPECT_THAT(conf, Not(HasSubstr("x\\;touch")));
    // Escaping alone makes this one harmless, so it is linked.
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre(neutralised));
    EXPECT_EQ(box.link_target(LINKS + "/" + neutralised), "/mnt/HD/HD_a2/x4");
}

TEST_F(ConfFile, NamesThatWouldBreakTheConfigurationGetOnlyANoteLine) {
    publish_on_a2({
        {"say \"hi\"", "/mnt/HD/HD_a2/n1", "", "", "", "yes", ""},
        {"back\\slash", "/mnt/HD/HD_a2/n2", "", "", "", "yes", ""},
        {"new\nline", "/mnt/HD/HD_a2/n3", "", "", "", "yes", ""},
        {"caf\xc3\xa9 & #1", "/mnt/HD/HD_a2/n4", "", "", "", "yes", ""},
    });
    EXPECT_EQ(start(), HEADER + section("caf\xc3\xa9 & #1", "On", OPEN));
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("caf\xc3\xa9 & #1"));
    EXPECT_EQ(box.read_file(NOTE), "say \"hi\"\nback\\slash\nnew\nline\ncaf\xc3\xa9 & #1\n");
}

TEST_F(ConfFile, APlantedOrLeftOverConfigurationFileIsNotWritten) {
    publish_on_a2({{"Safe", "/mnt/HD/HD_a2/Safe", "", "", "", "yes", ""}});
    box.write_file("/etc/victim", "keep");
    box.make_symlink("/etc/victim", "/tmp/dav.conf");
    start();
    EXPECT_EQ(box.read_file("/etc/victim"), "keep");
    EXPECT_THAT(box.list_dir(LINKS), IsEmpty());

    box.remove(CONF);
    box.write_file("/tmp/dav.conf", "left over\n");
    EXPECT_EQ(start(), "left over\n");
    EXPECT_THAT(box.list_dir(LINKS), IsEmpty());
}

}  // namespace
