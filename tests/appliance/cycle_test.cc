// start, stop and get through the installed binary.
#include <chrono>
#include <gmock/gmock.h>

#include "appliance/realistic_appliance.h"

using appliance::share_list_xml;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::Not;

namespace {

std::string section_dav_line(const std::string &conf, const std::string &name) {
    std::string head = "<Directory \"/usr/local/apache2_dav/webdav/" + name + "\">\n";
    size_t at = conf.find(head);
    if (at == std::string::npos) return "";
    size_t end = conf.find('\n', at + head.size());
    return conf.substr(at + head.size(), end - at - head.size());
}

std::string query_xml(const std::string &name, const std::string &path, int enable) {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n\t\t<item>\n"
           "\t\t\t<shared_name>" + name + "</shared_name>\n\t\t\t<path>" + path +
           "</path>\n\t\t\t<enable>" + std::to_string(enable) +
           "</enable>\n\t\t</item>\n\t</WebDAV>\n</config>\n";
}

double seconds_to_run(appliance::Appliance &box, const std::vector<std::string> &args) {
    auto begin = std::chrono::steady_clock::now();
    box.run(args);
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - begin).count();
}

}  // namespace

using StartCommand = RealisticAppliance;
using StopCommand = RealisticAppliance;
using GetCommand = RealisticAppliance;

TEST_F(StartCommand, RegeneratesListsConfigurationLinksAndNoteAndRestarts) {
    box.write_share_list(A2, {{"Old name", "/Public", 1, 1}, {"Music", "/Music", 0, 1},
                              {"Gone", "/Gone", 1, 1}});
    box.make_dir("/mnt/HD/HD_a2/Gone");
    box.write_file(std::string(LINKS) + "/stale", "");

    EXPECT_THAT(run_ok({"start"}), ElementsAre("restart dav"));

    // The path rule names an entry after the share at its path; an entry that
    // no share covers is dropped although its folder exists.
    EXPECT_EQ(box.read_share_list(A2),
              share_list_xml(1, {{"Public", "/Public", 1, 1}, {"Music", "/Music", 0, 1}}));
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}}));
    for (const char *volume : {A2, B2})
        EXPECT_EQ(box.read_share_list(volume, "lighty_iso.xml"),
                  share_list_xml(1, {{"Disc", "/Disc", 0, 1}}));

    std::string conf = box.read_file(CONF);
    EXPECT_EQ(section_dav_line(conf, "Public"), "\tDav On");
    EXPECT_EQ(section_dav_line(conf, "Backup"), "\tDav Off");
    EXPECT_EQ(section_dav_line(conf, "usbdisk1"), "\tDav On");
    EXPECT_THAT(conf, Not(HasSubstr("Gone")));
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Disc", "Music", "Public", "usbdisk1"));
    EXPECT_EQ(box.link_target(std::string(LINKS) + "/Public"), "/mnt/HD/HD_a2/Public");
    EXPECT_EQ(box.link_target(std::string(LINKS) + "/usbdisk1"), "/mnt/USB/USB1");
    EXPECT_EQ(box.read_file(NOTE), "Public\nMusic\nBackup\nDisc\nusbdisk1\n");
    expect_no_marks_left();
}

TEST_F(StartCommand, OnlyTheExactValueOneEnablesWebdav) {
    struct Case {
        const char *value;  // null: no such element
        const char *server;
        const char *dav;
    } cases[] = {{"1", "restart dav", "\tDav On"}, {"0", "stop dav", "\tDav Off"},
                 {"11", "stop dav", "\tDav Off"}, {"10", "stop dav", "\tDav Off"},
                 {"", "stop dav", "\tDav Off"},   {" 1", "stop dav", "\tDav Off"},
                 {nullptr, "stop dav", "\tDav Off"}};
    for (const Case &c : cases) {
        SCOPED_TRACE(c.value ? c.value : "(missing)");
        box.remove("/var/log/apache_calls");
        if (c.value) box.set_config("/system_mgr/webdav/enable", c.value);
        else box.unset_config("/system_mgr/webdav/enable");
        EXPECT_THAT(run_ok({"start"}), ElementsAre(c.server));
        EXPECT_EQ(section_dav_line(box.read_file(CONF), "Public"), c.dav);
        EXPECT_EQ(box.exists(std::string(LINKS) + "/Public"), c.value && std::string(c.value) == "1");
    }
}

TEST_F(StartCommand, DirectoryServiceSwitchDecidesTheNoteFile) {
    box.write_file(NOTE, "stale\n");
    box.set_config("/system_mgr/samba/ads_enable", "1");
    run_ok({"start"});
    EXPECT_EQ(box.read_file(NOTE), "usbdisk1\n");  // only the USB portion

    box.remove("/mnt/USB");
    run_ok({"start"});
    EXPECT_FALSE(box.exists(NOTE));

    box.set_config("/system_mgr/samba/ads_enable", "11");
    run_ok({"start"});
    EXPECT_EQ(box.read_file(NOTE), "Public\nMusic\nBackup\nDisc\n");
}

TEST_F(StartCommand, FailureChangesNothingAndTouchesNoServer) {
    std::string list_a2 = box.read_share_list(A2);
    std::string list_b2 = box.read_share_list(B2);
    struct Case {
        const char *what;
        std::string mtab;
        std::string catalogue;  // "-": no file
    } cases[] = {
        {"no data volume", "/dev/sdc1 /mnt/USB/USB1 vfat rw 0 0\n", appliance::catalogue_xml(shares)},
        {"no catalogue", box.read_file("/etc/mtab"), "-"},
        {"catalogue not well-formed", box.read_file("/etc/mtab"), "<config><samba><item>"},
        {"catalogue without samba", box.read_file("/etc/mtab"), "<config><smb/></config>"},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.what);
        box.write_file("/etc/mtab", c.mtab);
        if (c.catalogue == "-") box.remove("/var/www/xml/smb.xml");
        else box.write_file("/var/www/xml/smb.xml", c.catalogue);
        for (const char *command : {"start", "stop", "du", "p2pen", "amulen"}) {
            SCOPED_TRACE(command);
            std::vector<std::string> args{command};
            if (args[0] == "du") args.push_back("alice");
            run_ok(args);
            expect_nothing_changed(list_a2, list_b2);
        }
    }
}

TEST_F(StartCommand, WaitsTwoSecondsOnlyWhenAnotherStartIsUnderWay) {
    EXPECT_LT(seconds_to_run(box, {"start"}), 2.0);
    box.write_file("/tmp/corvane_start_lock", "");
    EXPECT_GE(seconds_to_run(box, {"start"}), 2.0);
    expect_no_marks_left();
}

TEST_F(StartCommand, ConcurrentRunsBothCompleteAndLeaveNoMarks) {
    pid_t first = box.start({"start"});
    pid_t second = box.start({"start"});
    EXPECT_EQ(box.finish(first).status, 0);
    EXPECT_EQ(box.finish(second).status, 0);
    EXPECT_THAT(box.apache_calls(), ElementsAre("restart dav", "restart dav"));
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}}));
    expect_no_marks_left();
}

TEST_F(StartCommand, PlantedLockFileLinkIsNotFollowed) {
    box.write_file("/etc/important", "keep");
    box.make_symlink("/etc/important", "/tmp/corvane.node");
    box.make_symlink("/etc/important", "/tmp/lighty.xml");
    box.make_symlink("/etc/important", "/tmp/set_webdav_note");
    box.make_symlink("/etc/important", "/tmp/webdav_query.xml");
    run_ok({"start"});
    run_ok({"get", "/mnt/HD/HD_a2/Public"});
    EXPECT_EQ(box.read_file("/etc/important"), "keep");
}

TEST_F(StopCommand, WritesEverythingOffRemovesLinksAndStops) {
    box.write_file("/tmp/corvane_start_lock", "");
    box.write_share_list(A2, {{"Old name", "/Public", 1, 1}, {"Music", "/Music", 0, 1}});
    std::string config = box.read_file("/etc/NAS_CFG/config_db.xml");

    EXPECT_THAT(run_ok({"stop"}), ElementsAre("stop dav"));

    // Name-and-path rule: an entry whose name no longer begins with its share's
    // name is dropped, not renamed.
    EXPECT_EQ(box.read_share_list(A2), share_list_xml(0, {{"Music", "/Music", 0, 1}}));
    EXPECT_EQ(box.read_share_list(B2), share_list_xml(0, {{"Backup", "/Backup", 1, 0}}));
    std::string conf = box.read_file(CONF);
    for (const char *name : {"Music", "Backup", "Disc"})
        EXPECT_EQ(section_dav_line(conf, name), "\tDav Off") << name;
    EXPECT_EQ(section_dav_line(conf, "usbdisk1"), "\tDav On");
    // Only the USB link, made after the links of the shares were removed again.
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("usbdisk1"));
    EXPECT_EQ(box.read_file("/etc/NAS_CFG/config_db.xml"), config);
    expect_no_marks_left();
}

TEST_F(GetCommand, AnswersWhetherAFolderIsPublished) {
    box.write_share_list(A2, {{"Public", "/Public", 1, 1}, {"a&b \"q\"", "/Music", 0, 1},
                              {"Whole", "/", 1, 1}});
    box.mount("/mnt/USB/DISK5", "/dev/sdd1", "vfat");
    box.write_file("/mnt/USB/DISK5/.davconf", "ON");
    struct Case {
        std::string argument;
        std::string answer;  // "-": the earlier file stays
    } cases[] = {
        {"/mnt/HD/HD_a2/Public", query_xml("Public", "/mnt/HD/HD_a2/Public", 1)},
        {"/mnt/HD/HD_a2/Public/", "-"},
        {"/mnt/HD/HD_a2/Pub", "-"},
        {"/mnt/HD/HD_a2", query_xml("Whole", "/mnt/HD/HD_a2/", 1)},
        {"/mnt/HD/HD_a2/Music", query_xml("a&amp;b &quot;q&quot;", "/mnt/HD/HD_a2/Music", 1)},
        {"/mnt/HD/HD_b2/Backup", query_xml("Backup", "/mnt/HD/HD_b2/Backup", 0)},
        {"/mnt/isoMount/Disc", query_xml("Disc", "/mnt/isoMount/Disc", 1)},
        {"/mnt/USB/DISK5", query_xml("DISK5", "/mnt/USB/DISK5", 1)},
        // 13 characters gain a '/', on USB folders too.
        {"/mnt/USB/USB1", query_xml("USB1/", "/mnt/USB/USB1/", 1)},
        {"/mnt/USB/NONE", "-"},
        {"/mnt/HD/HD_a2/P&amp;ublic", "-"},
        {std::string(300, 'x'), "-"},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.argument);
        box.write_file("/tmp/webdav_query.xml", "earlier");
        run_ok({"get", c.argument});
        EXPECT_EQ(box.read_file("/tmp/webdav_query.xml"), c.answer == "-" ? "earlier" : c.answer);
    }
    EXPECT_TRUE(box.apache_calls().empty());
    EXPECT_FALSE(box.exists("/tmp/corvane.node"));
}

TEST_F(GetCommand, DisabledWebdavRemovesTheAnswerExceptForUsbFolders) {
    box.set_config("/system_mgr/webdav/enable", "0");
    box.write_file("/tmp/webdav_query.xml", "earlier");
    run_ok({"get", "/mnt/HD/HD_a2/Nowhere"});
    EXPECT_FALSE(box.exists("/tmp/webdav_query.xml"));
    run_ok({"get", "/mnt/USB/USB1/"});
    std::string usb_answer = query_xml("USB1/", "/mnt/USB/USB1/", 1);
    EXPECT_EQ(box.read_file("/tmp/webdav_query.xml"), usb_answer);

    box.write_file("/etc/mtab", "");
    run_ok({"get", "/mnt/HD/HD_a2/Public"});  // lists cannot be loaded: left alone
    EXPECT_EQ(box.read_file("/tmp/webdav_query.xml"), usb_answer);
}
