// The WebDAV configuration and its links, as a start run leaves them.
#include <gmock/gmock.h>

#include <filesystem>

#include "appliance/dav_conf_text.h"
#include "harness/appliance.h"

using appliance::Share;
using namespace dav_conf_text;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::IsEmpty;
using ::testing::Not;

namespace {

Share open_share(const std::string &name, const std::string &folder) {
    return {name, "/mnt/HD/HD_a2/" + folder, "", "", "", "yes", ""};
}

const char *const A2 = "/mnt/HD/HD_a2";
const char *const B2 = "/mnt/HD/HD_b2";

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

    // The catalogue, its folders and the list of A2; publish_on_a2 lists
    // every share under its own name, enabled.
    void publish(const std::vector<Share> &shares, const std::vector<appliance::ListItem> &a2) {
        box.set_catalogue(shares);
        for (const Share &share : shares) box.make_dir(share.path);
        box.write_share_list(A2, a2);
    }
    void publish_on_a2(const std::vector<Share> &shares) {
        std::vector<appliance::ListItem> items;
        for (const Share &share : shares) items.push_back({share.name, share.path.substr(13), 1, 1});
        publish(shares, items);
    }

    std::string start() { return dav_conf_text::start_and_read_conf(box); }
};

TEST_F(ConfFile, RealisticCatalogueGivesExactlyTheDesignedConfigurationLinksAndNote) {
    box.make_dir("/mnt/HD/HD_a2/Lost");
    publish({{"Public", "/mnt/HD/HD_a2/Public", "", "", "", "yes", ""},
             {"Team", "/mnt/HD/HD_a2/Team", "#alice#,#@staff#", "#dave#,#mallory#",
              "#mallory#,#carol#", "", ""},
             {"Empty", "/mnt/HD/HD_a2/Empty", "", "", "", "", ""},
             {"Paused", "/mnt/HD/HD_a2/Paused", "#alice#", "", "", "", "1"},
             {"My Files", "/mnt/HD/HD_a2/My Files", "#alice#,#alice#", "#bob#", "#@allaccount#",
              "no", "2"},
             {"Public", "/mnt/HD/HD_b2/Public", "", "", "", "yes", ""}},
            {{"Public", "/Public", 1, 1}, {"Team", "/Team", 1, 1}, {"Empty", "/Empty", 1, 1},
             {"Paused", "/Paused", 1, 0}, {"Lost", "/Lost", 1, 1}, {"My Files", "/My Files", 1, 1}});
    box.write_share_list(B2, {{"Public", "/Public", 1, 1}});
    auto expected = [](const std::string &dav) {
        return HEADER + section("Public", dav, OPEN) +
               section("Team", dav, authenticated("alice bob dave ", "dave ")) +
               section("Empty", dav, authenticated("", "")) + section("Paused", "Off", OPEN) +
               section("My Files", dav, authenticated("alice alice bob ", "bob "));
    };
    EXPECT_EQ(start(), expected("On"));
    // A disabled entry and the second share named Public get no link.
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Empty", "My Files", "Public", "Team"));
    for (const char *name : {"Public", "Team", "My Files"})
        EXPECT_EQ(box.link_target(LINKS + "/" + name), std::string(A2) + "/" + name);
    EXPECT_EQ(box.read_file(NOTE), "Public\nTeam\nEmpty\nPaused\nMy Files\nPublic\n");

    box.set_config("/system_mgr/webdav/enable", "0");
    EXPECT_EQ(start(), expected("Off"));
    EXPECT_THAT(box.list_dir(LINKS), IsEmpty());

    // Something already at a link path survives the "rm" of the old links.
    box.set_config("/system_mgr/webdav/enable", "1");
    box.write_file(LINKS + "/Team/keep", "x");
    EXPECT_EQ(start(), expected("On"));
    EXPECT_THAT(box.list_dir(LINKS + "/Team"), ElementsAre("keep"));
}

TEST_F(ConfFile, GroupsAddOnlyListedMembersAndAllaccountAnywhereInTheRawListsOpens) {
    // erin's primary group is staff, but staff does not list her.
    std::string groups = box.read_file("/etc/group");
    size_t gid_at = groups.find("staff:x:") + 8;
    std::string gid = groups.substr(gid_at, groups.find(':', gid_at) - gid_at);
    box.write_file("/etc/passwd",
                   box.read_file("/etc/passwd") + "erin:x:1077:" + gid + "::/home/erin:/bin/sh\n");
    publish_on_a2({
        {"G1", "/mnt/HD/HD_a2/G1", "#bob#,#@staff#", "#@staff#,#bob#", "", "", ""},
        {"G2", "/mnt/HD/HD_a2/G2", "#@staff#,#@team#,#@ghosts#", "", "", "", ""},
        {"G3", "/mnt/HD/HD_a2/G3", "#@staff#,#@AllAccount#", "#@ghosts#", "#@team#", "", ""},
        {"R", "/mnt/HD/HD_a2/R", "#@allaccount#", "#bob#", "", "", ""},
        {"W", "/mnt/HD/HD_a2/W", "#bob#", "#@allaccount#", "#bob#", "", "0"},
        {"U", "/mnt/HD/HD_a2/U", "#allaccountant#", "", "", "", ""},
    });
    EXPECT_EQ(start(), HEADER +
                           section("G1", "On", authenticated("bob carol bob carol bob ", "bob carol bob ")) +
                           section("G2", "On", authenticated("bob carol dave ", "")) +
                           section("G3", "On", authenticated("bob ", "")) + section("R", "On", OPEN) +
                           section("W", "On", OPEN) + section("U", "On", OPEN));
}

TEST_F(ConfFile, CommandLinesCarryNoDataTheShellWouldRun) {
    box.write_file("/tmp/payload.sh", "#!/bin/sh\ntouch /pwned-by-script\n", 0755);
    const std::string neutralised = "x$(touch${IFS}pwned7)`touch pwned8`";
    publish_on_a2({open_share("x|touch /pwned", "x1"), open_share("x\\;touch /pwned", "x2"),
                   open_share("x|/tmp/payload.sh", "x3"), open_share("Q", "q|/tmp/payload.sh"),
                   open_share(neutralised, "x4"), open_share("../../../../etc/evil", "x5")});
    for (const std::string usb : {"USB1", "USB2;touch${IFS}pwned6"}) {
        box.mount("/mnt/USB/" + usb, "/dev/sdc1", "vfat");
        box.write_file("/mnt/USB/" + usb + "/.davconf", "ON");
    }
    box.write_file("/etc/shared_name",
                   "x;touch${IFS}/pwned5 = USB1\nevil2 = USB2;touch${IFS}pwned6\n");

    std::string conf = start();
    for (const char *planted : {"/pwned", "/pwned-by-script", "/pwned5", "/etc/evil"})
        EXPECT_FALSE(box.exists(planted)) << planted;
    for (const auto &entry : std::filesystem::recursive_directory_iterator(box.root()))
        for (const char *planted : {"pwned6", "pwned7", "pwned8"})
            EXPECT_NE(entry.path().filename(), planted) << entry.path();
    // Names the configuration can carry keep their sections; one with a '/'
    // would name a folder outside the link directory.
    for (const char *name : {"Q", "evil2"}) EXPECT_THAT(conf, HasSubstr(section(name, "On", OPEN))) << name;
    for (const char *name : {"x|touch /pwned", "x|/tmp/payload.sh", "x;touch${IFS}/pwned5"})
        EXPECT_THAT(conf, Not(HasSubstr("Alias \"/" + std::string(name)))) << name;
    EXPECT_THAT(conf, Not(HasSubstr("x\\;touch")));
    // Links are made without a shell, so only names with a '/' get none.
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Q", "evil2", neutralised));
    EXPECT_EQ(box.link_target(LINKS + "/Q"), "/mnt/HD/HD_a2/q|/tmp/payload.sh");
    EXPECT_EQ(box.link_target(LINKS + "/" + neutralised), "/mnt/HD/HD_a2/x4");
}

TEST_F(ConfFile, NamesThatWouldBreakTheConfigurationGetOnlyANoteLine) {
    publish_on_a2({open_share("say \"hi\"", "n1"), open_share("back\\slash", "n2"),
                   open_share("new\nline", "n3"), open_share("caf\xc3\xa9 & #1", "n4")});
    EXPECT_EQ(start(), HEADER + section("caf\xc3\xa9 & #1", "On", OPEN));
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("caf\xc3\xa9 & #1"));
    EXPECT_EQ(box.read_file(NOTE), "say \"hi\"\nback\\slash\nnew\nline\ncaf\xc3\xa9 & #1\n");
}

TEST_F(ConfFile, APlantedOrLeftOverConfigurationFileIsNeverPlaced) {
    publish_on_a2({open_share("Safe", "Safe")});
    const std::string built = HEADER + section("Safe", "On", OPEN);
    box.write_file("/etc/victim", "keep");
    box.make_symlink("/etc/victim", "/tmp/dav.conf");
    EXPECT_EQ(start(), built);
    EXPECT_EQ(box.read_file("/etc/victim"), "keep");

    box.remove("/tmp/dav.conf");
    box.write_file("/tmp/dav.conf", "ErrorLog \"|/bin/sh -c id\"\n");
    EXPECT_EQ(start(), built);
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Safe"));
}

}  // namespace
