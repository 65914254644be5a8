// do, merge, del, du, p2pen, amulen and chg through the installed binary.
#include <csignal>
#include <cstdlib>
#include <gmock/gmock.h>
#include <sys/wait.h>
#include <unistd.h>

#include "appliance/realistic_appliance.h"

using appliance::ListItem;
using appliance::share_list_xml;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

namespace {

// A list left in a form the tool never writes, so a rewrite shows.
const std::string UNTOUCHED_B2 = share_list_xml(7, {{"Backup", "/Backup", 1, 0}});
const std::string UNTOUCHED_ISO = share_list_xml(5, {{"Disc", "/Disc", 0, 1}});

}  // namespace

class ShareCommands : public RealisticAppliance {
protected:
    void SetUp() override {
        RealisticAppliance::SetUp();
        box.write_share_list(B2, {{"Backup", "/Backup", 1, 0}}, 7);
        box.write_share_list(A2, {{"Disc", "/Disc", 0, 1}}, 5, "lighty_iso.xml");
    }

    void add_shares(const std::vector<appliance::Share> &more) {
        shares.insert(shares.end(), more.begin(), more.end());
        box.set_catalogue(shares);
    }

    // do or merge with an input file of these items (full paths).
    std::vector<std::string> apply(const char *command, const std::vector<ListItem> &items) {
        box.write_file("/tmp/input.xml", share_list_xml(1, items));
        return run_ok({command, "/tmp/input.xml"});
    }
};

TEST_F(ShareCommands, DoInsertsInFrontOfItsVolumeAndRewritesOnlyThatVolume) {
    box.make_dir("/mnt/USB/USB2");
    add_shares({{"New1", "/mnt/HD/HD_b2/New1", "", "", "", "yes", ""},
                {"New2", "/mnt/HD/HD_b2/New2", "", "", "", "yes", ""}});
    box.make_dir("/mnt/HD/HD_b2/New1");
    box.make_dir("/mnt/HD/HD_b2/New2");

    EXPECT_THAT(apply("do", {{"Photos", "/mnt/HD/HD_a2/Photos", 0, 1},
                             {"ignored", "/mnt/USB/USB2", 1, 0},
                             {"New1", "/mnt/HD/HD_b2/New1", 1, 1},
                             {"New2", "/mnt/HD/HD_b2/New2", 1, 1},
                             {"Nowhere", "/mnt/HD/HD_a2/Nowhere", 1, 1}}),
                ElementsAre("restart dav"));

    EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, {{"Photos", "/Photos", 0, 1},
                                                          {"Public", "/Public", 1, 1},
                                                          {"Music", "/Music", 0, 1}}));
    // New entries of one volume stand in reverse input order.
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"New2", "/New2", 1, 1},
                                                          {"New1", "/New1", 1, 1},
                                                          {"Backup", "/Backup", 1, 0}}));
    EXPECT_EQ(box.read_share_list(A2, "lighty_iso.xml"), UNTOUCHED_ISO);
    EXPECT_EQ(box.read_file("/mnt/USB/USB2/.davconf"), "ON");
    EXPECT_EQ(box.read_file(NOTE), "Photos\nPublic\nMusic\nNew2\nNew1\nBackup\nDisc\nusbdisk1\n");
    EXPECT_EQ(box.link_target(std::string(LINKS) + "/Photos"), "/mnt/HD/HD_a2/Photos");
    expect_no_marks_left();
}

TEST_F(ShareCommands, MergeKeepsReadWriteFlagDoReplacesIt) {
    ListItem music{"Music", "/mnt/HD/HD_a2/Music", 1, 0};
    apply("merge", {music});
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, {{"Public", "/Public", 1, 1},
                                                          {"Music", "/Music", 0, 0}}));
    EXPECT_EQ(box.read_share_list(B2), UNTOUCHED_B2);
    apply("do", {music});
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, {{"Public", "/Public", 1, 1},
                                                          {"Music", "/Music", 1, 0}}));
}

TEST_F(ShareCommands, DoPublishesAVolumeRootAndWritesAllenFromTheSwitch) {
    add_shares({{"Volume", "/mnt/HD/HD_a2/", "", "", "", "yes", ""}});
    box.set_config("/system_mgr/webdav/enable", "0");
    EXPECT_THAT(apply("do", {{"Volume", "/mnt/HD/HD_a2", 1, 1}}), ElementsAre("stop dav"));
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(0, {{"Volume", "/", 1, 1},
                                                          {"Public", "/Public", 1, 1},
                                                          {"Music", "/Music", 0, 1}}));
}

TEST_F(ShareCommands, DoWithABrokenInputFileChangesNothing) {
    std::string list_a2 = box.read_share_list(A2);
    box.write_file("/tmp/input.xml", "<config><WebDAV><item>");
    run_ok({"do", "/tmp/input.xml"});
    EXPECT_EQ(box.read_share_list(A2), list_a2);
    EXPECT_EQ(box.read_share_list(B2), UNTOUCHED_B2);
    EXPECT_TRUE(box.apache_calls().empty());
    expect_no_marks_left();
}

TEST_F(ShareCommands, DelRemovesTheExactEntryAndRewritesItsVolumeOnly) {
    box.write_share_list(A2, {{"Public", "/Public", 1, 1}, {"Music", "/Music", 0, 1},
                              {"Photos", "/Photos", 1, 1}, {"Whole", "/", 1, 1}});
    add_shares({{"Whole", "/mnt/HD/HD_a2/", "", "", "", "yes", ""}});
    struct Case {
        const char *argument;
        std::vector<ListItem> left;
    } cases[] = {
        {"/mnt/HD/HD_a2/Music/", {{"Public", "/Public", 1, 1}, {"Photos", "/Photos", 1, 1},
                                  {"Whole", "/", 1, 1}}},
        {"/mnt/HD/HD_a2/Public", {{"Photos", "/Photos", 1, 1}, {"Whole", "/", 1, 1}}},
        {"/mnt/HD/HD_a2", {{"Photos", "/Photos", 1, 1}}},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.argument);
        run_ok({"del", c.argument});
        EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, c.left));
    }
    EXPECT_EQ(box.read_share_list(B2), UNTOUCHED_B2);
    EXPECT_EQ(box.read_share_list(A2, "lighty_iso.xml"), UNTOUCHED_ISO);
    EXPECT_THAT(box.read_file(CONF), Not(HasSubstr("Alias \"/Public\"")));
    EXPECT_EQ(box.apache_calls().size(), 3u);
}

TEST_F(ShareCommands, DelOfAnUnknownPathChangesNothing) {
    std::string list_a2 = box.read_share_list(A2);
    run_ok({"del", "/mnt/HD/HD_a2/Pub"});
    EXPECT_EQ(box.read_share_list(A2), list_a2);
    EXPECT_TRUE(box.apache_calls().empty());
    EXPECT_FALSE(box.exists(CONF));
    expect_no_marks_left();
}

TEST_F(ShareCommands, DelOfTheOnlyEntryLeavesAnEmptyList) {
    box.write_share_list(B2, {});
    box.remove("/mnt/HD/HD_a2/.system_data/lighty_iso.xml");
    box.write_share_list(A2, {{"Public", "/Public", 1, 1}});
    box.set_config("/system_mgr/webdav/enable", "0");
    EXPECT_THAT(run_ok({"del", "/mnt/HD/HD_a2/Public"}), ElementsAre("stop dav"));
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(0, {}));
}

TEST_F(ShareCommands, DelOfAUsbVolumeRemovesItsMarker) {
    std::string list_a2 = box.read_share_list(A2);
    EXPECT_THAT(run_ok({"del", "/mnt/USB/USB1/"}), ElementsAre("restart dav"));
    EXPECT_FALSE(box.exists("/mnt/USB/USB1/.davconf"));
    EXPECT_EQ(box.read_share_list(A2), list_a2);
    EXPECT_THAT(box.read_file(CONF), Not(HasSubstr("usbdisk1")));
    EXPECT_EQ(box.read_file(NOTE), "Public\nMusic\nBackup\nDisc\n");
}

TEST_F(ShareCommands, DuDropsEntriesTheCatalogueNoLongerNamesEverywhere) {
    shares[0].name = "Shared";  // Public renamed in the catalogue
    box.set_catalogue(shares);
    box.set_config("/system_mgr/webdav/enable", "0");
    EXPECT_THAT(run_ok({"du", "alice"}), ElementsAre("stop dav"));
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(0, {{"Music", "/Music", 0, 1}}));
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(0, {{"Backup", "/Backup", 1, 0}}));
    EXPECT_EQ(box.read_share_list(B2, "lighty_iso.xml"), share_list_xml(0, {{"Disc", "/Disc", 0, 1}}));
}

TEST_F(ShareCommands, ChgMovesEveryEntryBelowAnExistingOldFolder) {
    box.make_dir("/mnt/HD/HD_a2/Songs");
    add_shares({{"Songs", "/mnt/HD/HD_a2/Songs", "", "", "", "yes", ""}});
    box.write_share_list(A2, {{"Public", "/Public", 1, 1}, {"Music", "/Music", 0, 1},
                              {"Musical", "/Musical", 1, 0}});
    box.make_dir("/mnt/HD/HD_a2/Musical");

    EXPECT_THAT(run_ok({"chg", "/mnt/HD/HD_a2/Music", "/mnt/HD/HD_a2/Songs"}),
                ElementsAre("restart dav"));
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, {{"Public", "/Public", 1, 1},
                                                          {"Songs", "/Songs", 0, 1},
                                                          {"Songs", "/Songs", 1, 0}}));
    box.remove("/mnt/HD/HD_a2/Public");  // the old folder is gone: nothing moves
    run_ok({"chg", "/mnt/HD/HD_a2/Public", "/mnt/HD/HD_a2/Songs"});
    EXPECT_THAT(box.read_share_list(A2), HasSubstr("<shared_name>Songs</shared_name>\n\t\t\t\t<path>/Songs</path>\n\t\t\t\t<RW>0"));
    expect_no_marks_left();
}

class DownloadShares : public ShareCommands {
protected:
    void SetUp() override {
        ShareCommands::SetUp();
        for (const char *folder : {"/mnt/HD/HD_a2/P2P", "/mnt/HD/HD_b2/P2P", "/mnt/HD/HD_b2/aMule"})
            box.make_dir(folder);
        add_shares({{"P2P", "/mnt/HD/HD_a2/P2P", "", "", "", "yes", ""},
                    {"P2P", "/mnt/HD/HD_b2/P2P", "", "", "", "yes", ""},
                    {"aMule", "/mnt/HD/HD_b2/aMule", "", "", "", "yes", ""}});
        box.set_config("/download_mgr/p2p/enable", "1");
        box.write_file("/etc/NAS_CFG/p2psettings.xml",
                       "<p2p>\n<save_path>/mnt/HD/HD_b2/Download</save_path>\n</p2p>\n");
        box.write_file("/etc/NAS_CFG/apkg.xml",
                       "<apkg><item><name>aMule</name><state>0</state><path>/mnt/HD/HD_a2/Nas_Prog/aMule</path></item>"
                       "<item><name>aMule</name><state>1</state><path>/mnt/HD/HD_b2/Nas_Prog/aMule</path></item></apkg>");
    }

    // The package manager counts as running when a process is named "apkg".
    pid_t start_package_manager() {
        std::string copy = box.host_path("/opt/apkg");
        EXPECT_EQ(system(("cp /bin/sleep " + copy).c_str()), 0);
        pid_t pid = fork();
        if (pid == 0) {
            execl(copy.c_str(), "apkg", "30", static_cast<char *>(nullptr));
            _exit(127);
        }
        usleep(100000);
        return pid;
    }
};

TEST_F(DownloadShares, P2pMovesItsShareToTheDownloadVolumeAndKeepsUserChoices) {
    box.write_share_list(A2, {{"Public", "/Public", 1, 1}, {"P2P", "/P2P", 1, 1}});
    box.write_share_list(B2, {{"Backup", "/Backup", 1, 0}, {"Mine", "/P2P", 0, 0},
                              {"Deeper", "/P2P/", 1, 1}});
    add_shares({{"Mine", "/mnt/HD/HD_b2/P2P", "", "", "", "yes", ""},
                {"Deeper", "/mnt/HD/HD_b2/P2P/", "", "", "", "yes", ""}});
    run_ok({"p2pen"});
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, {{"Public", "/Public", 1, 1}}));
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0},
                                                          {"Deeper", "/P2P/", 1, 1},
                                                          {"P2P", "/P2P", 0, 0}}));
    EXPECT_EQ(box.read_share_list(A2, "lighty_iso.xml"), UNTOUCHED_ISO);
}

TEST_F(DownloadShares, P2pWithTheManagerOffStillRewritesEveryVolume) {
    box.set_config("/download_mgr/p2p/enable", "0");
    run_ok({"p2pen"});
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}}));
}

TEST_F(DownloadShares, AmuleTakesTheFirstRunningPackageOnAVolume) {
    run_ok({"amulen"});  // package manager not running: nothing added
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}}));

    pid_t manager = start_package_manager();
    run_ok({"amulen"});
    kill(manager, SIGKILL);
    waitpid(manager, nullptr, 0);
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0},
                                                          {"aMule", "/aMule", 1, 1}}));
}

// One administrator's day, each step checked on what it leaves behind.
TEST_F(ShareCommands, AUsersDay) {
    box.make_dir("/mnt/HD/HD_a2/Video");
    add_shares({{"Video", "/mnt/HD/HD_a2/Video", "#bob#", "#alice#", "", "", ""}});

    EXPECT_THAT(run_ok({"start"}), ElementsAre("restart dav"));
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}}));

    apply("do", {{"Photos", "/mnt/HD/HD_a2/Photos", 0, 1}, {"Video", "/mnt/HD/HD_a2/Video", 1, 1}});
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, {{"Video", "/Video", 1, 1},
                                                          {"Photos", "/Photos", 0, 1},
                                                          {"Public", "/Public", 1, 1},
                                                          {"Music", "/Music", 0, 1}}));
    EXPECT_THAT(box.read_file(CONF), HasSubstr("\t\tRequire user bob alice \n"));

    apply("merge", {{"Video", "/mnt/HD/HD_a2/Video", 0, 0}});
    EXPECT_THAT(box.read_share_list(A2),
                HasSubstr("<shared_name>Video</shared_name>\n\t\t\t\t<path>/Video</path>\n"
                          "\t\t\t\t<RW>1</RW>\n\t\t\t\t<enable>0</enable>"));
    EXPECT_FALSE(box.exists(std::string(LINKS) + "/Video"));

    run_ok({"get", "/mnt/HD/HD_a2/Video"});
    EXPECT_THAT(box.read_file("/tmp/webdav_query.xml"),
                HasSubstr("<shared_name>Video</shared_name>\n\t\t\t<path>/mnt/HD/HD_a2/Video</path>\n"
                          "\t\t\t<enable>0</enable>"));

    box.make_dir("/mnt/HD/HD_a2/Pictures");
    shares[2] = {"Photos", "/mnt/HD/HD_a2/Pictures", "#@staff#", "#alice#", "", "", ""};
    box.set_catalogue(shares);
    run_ok({"chg", "/mnt/HD/HD_a2/Photos", "/mnt/HD/HD_a2/Pictures"});
    EXPECT_THAT(box.read_share_list(A2), HasSubstr("<path>/Pictures</path>"));
    EXPECT_EQ(box.link_target(std::string(LINKS) + "/Photos"), "/mnt/HD/HD_a2/Pictures");

    run_ok({"del", "/mnt/HD/HD_a2/Public"});
    EXPECT_THAT(box.read_share_list(A2), Not(HasSubstr("Public")));

    shares.back().name = "Films";
    box.set_catalogue(shares);
    run_ok({"du", "alice"});
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(1, {{"Photos", "/Pictures", 0, 1},
                                                          {"Music", "/Music", 0, 1}}));

    run_ok({"stop"});
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(0, {{"Photos", "/Pictures", 0, 1},
                                                          {"Music", "/Music", 0, 1}}));
    EXPECT_THAT(box.apache_calls(), ElementsAre("restart dav", "restart dav", "restart dav",
                                                "restart dav", "restart dav", "restart dav",
                                                "stop dav"));
    expect_no_marks_left();
}
