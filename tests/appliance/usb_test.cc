// Sections, links and note lines of marked USB volumes after a start run.
#include <gmock/gmock.h>

#include <algorithm>

#include "appliance/dav_conf_text.h"
#include "harness/appliance.h"

using appliance::Share;
using dav_conf_text::authenticated;
using dav_conf_text::count_of;
using dav_conf_text::HEADER;
using dav_conf_text::OPEN;
using dav_conf_text::section;
using ::testing::AnyOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::StartsWith;

namespace {

const std::string LINKS = "/usr/local/apache2_dav/webdav";
const char *const CONF = "/usr/local/apache2_dav/conf/extra/httpd-dav.conf";
const char *const NOTE = "/tmp/set_webdav_note";

class UsbShares : public ::testing::Test {
protected:
    appliance::Appliance box;
    const std::string public_section = section("Public", "On", OPEN);

    // One published entry share, "Public", and an empty /mnt/USB.
    void SetUp() override {
        box.mount("/mnt/HD/HD_a2");
        box.make_dir("/mnt/HD/HD_a2/Public");
        box.set_catalogue({{"Public", "/mnt/HD/HD_a2/Public", "", "", "", "yes", ""}});
        box.write_share_list("/mnt/HD/HD_a2", {{"Public", "/Public", 1, 1}});
        box.set_config("/system_mgr/webdav/enable", "1");
        box.set_config("/system_mgr/samba/ads_enable", "0");
        box.make_dir("/mnt/USB");
    }

    void mount_usb(const std::string &dir, bool marked) {
        box.mount("/mnt/USB/" + dir, "/dev/sdc1", "vfat");
        if (marked) box.write_file("/mnt/USB/" + dir + "/.davconf", "ON");
    }

    std::string start() {
        appliance::RunResult result = box.run({"start"});
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_EQ(result.out, "");
        return box.read_file(CONF);
    }

    std::vector<std::string> sorted_note_lines() const {
        std::vector<std::string> lines;
        std::string note = box.read_file(NOTE);
        for (size_t at = 0, end; (end = note.find('\n', at)) != std::string::npos; at = end + 1)
            lines.push_back(note.substr(at, end - at));
        std::sort(lines.begin(), lines.end());
        return lines;
    }
};

TEST_F(UsbShares, OnlyMarkedMountedVolumesGetSectionsLinksAndNoteLines) {
    mount_usb("USB1", true);
    mount_usb("USB2", true);
    // The first named share counts, not the later one that is public.
    box.write_file("/mnt/USB/USB2/.smbm.xml",
                   appliance::catalogue_xml({{"first", "/mnt/USB/USB2", "#alice#", "#bob#", "", "", "0"},
                                             {"second", "/mnt/USB/USB2", "", "", "", "yes", "1"}}));
    mount_usb("USB3", false);
    mount_usb("USB5", true);
    box.write_file("/mnt/USB/USB5/.smbm.xml", "not a catalogue");
    box.write_file("/mnt/USB/USB4/.davconf", "ON");  // a folder, not mounted
    box.write_file("/mnt/USB/plain", "file");
    box.write_file("/etc/shared_name",
                   "usbdisk1 = USB1\nusbdisk2 = USB2\nusbdisk3 = USB3\nusbdisk4 = USB4\n"
                   "usbdisk5 = USB5\n");

    std::string conf = start();
    // Volumes come in directory reading order, after the entry shares.
    EXPECT_THAT(conf, StartsWith(HEADER + public_section));
    EXPECT_THAT(conf, HasSubstr(section("usbdisk1", "On", OPEN)));
    EXPECT_THAT(conf, HasSubstr(section("usbdisk2", "On", authenticated("alice bob ", "bob "))));
    EXPECT_THAT(conf, HasSubstr(section("usbdisk5", "On", authenticated("", ""))));
    EXPECT_EQ(conf.size(), (HEADER + public_section + section("usbdisk1", "On", OPEN) +
                            section("usbdisk2", "On", authenticated("alice bob ", "bob ")) +
                            section("usbdisk5", "On", authenticated("", "")))
                               .size());
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Public", "usbdisk1", "usbdisk2", "usbdisk5"));
    EXPECT_EQ(box.link_target(LINKS + "/usbdisk1"), "/mnt/USB/USB1");
    EXPECT_EQ(box.link_target(LINKS + "/usbdisk2"), "/mnt/USB/USB2");
    EXPECT_THAT(box.read_file(NOTE), StartsWith("Public\n"));
    EXPECT_THAT(sorted_note_lines(), ElementsAre("Public", "usbdisk1", "usbdisk2", "usbdisk5"));
}

TEST_F(UsbShares, VolumesAreOnAndLinkedWhateverTheWebdavSwitch) {
    box.set_config("/system_mgr/webdav/enable", "0");
    mount_usb("USB1", true);
    box.write_file("/etc/shared_name", "usbdisk1 = USB1\n");
    EXPECT_EQ(start(), HEADER + section("Public", "Off", OPEN) + section("usbdisk1", "On", OPEN));
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("usbdisk1"));
}

TEST_F(UsbShares, APublishedNameGetsOneSectionButEveryVolumeItsNoteLine) {
    mount_usb("USB1", true);
    mount_usb("USB2", true);
    box.write_file("/etc/shared_name", "same = USB1\nsame = USB2\n");
    std::string conf = start();
    EXPECT_EQ(count_of(conf, "Alias \"/same\""), 1u);
    EXPECT_THAT(box.link_target(LINKS + "/same"), AnyOf("/mnt/USB/USB1", "/mnt/USB/USB2"));
    EXPECT_EQ(box.read_file(NOTE), "Public\nsame\nsame\n");

    // A volume cannot take the name of an entry share.
    box.remove("/mnt/USB/USB2/.davconf");
    box.write_file("/etc/shared_name", "Public = USB1\n");
    EXPECT_EQ(start(), HEADER + public_section);
    EXPECT_EQ(box.link_target(LINKS + "/Public"), "/mnt/HD/HD_a2/Public");
    EXPECT_EQ(box.read_file(NOTE), "Public\nPublic\n");
}

TEST_F(UsbShares, SharedNameIsTheFirstLineThatContainsTheDirectoryName) {
    mount_usb("USB1", true);
    struct Case {
        const char *file;
        std::string name;  // empty: no line names the volume
    } cases[] = {
        {"ten = USB10\none = USB1\n", "ten"},
        {"other = USB7\nlast = USB1", "last"},
        {"usbdisk1 = USB1 and more words\n", "usbdisk1"},
        {"other = USB7\n", ""},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.file);
        box.write_file("/etc/shared_name", c.file);
        std::string conf = start();
        EXPECT_EQ(box.read_file(NOTE), "Public\n" + c.name + "\n");
        if (c.name.empty()) {
            EXPECT_EQ(conf, HEADER + public_section);
            EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Public"));
            continue;
        }
        EXPECT_EQ(conf, HEADER + public_section + section(c.name, "On", OPEN));
        EXPECT_EQ(box.link_target(LINKS + "/" + c.name), "/mnt/USB/USB1");
    }
}

}  // namespace
