// Sections, links and note lines of marked USB volumes after a start run.
#include <gmock/gmock.h>

#include <utility>

#include "appliance/dav_conf_text.h"
#include "harness/appliance.h"

using namespace dav_conf_text;
using ::testing::AnyOf;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using ::testing::StartsWith;

namespace {


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

    void mount_usb(const std::string &dir, bool marked = true) {
        box.mount("/mnt/USB/" + dir, "/dev/sdc1", "vfat");
        if (marked) box.write_file("/mnt/USB/" + dir + "/.davconf", "ON");
    }

    std::string start() { return dav_conf_text::start_and_read_conf(box); }
};

TEST_F(UsbShares, OnlyMarkedMountedVolumesGetSectionsLinksAndNoteLines) {
    mount_usb("USB1");
    mount_usb("USB2");
    // The first named share counts, not the later one that is public.
    box.write_file("/mnt/USB/USB2/.smbm.xml",
                   appliance::catalogue_xml({{"first", "/mnt/USB/USB2", "#alice#", "#bob#", "", "", "0"},
                                             {"second", "/mnt/USB/USB2", "", "", "", "yes", "1"}}));
    mount_usb("USB3", false);
    mount_usb("USB5");
    box.write_file("/mnt/USB/USB5/.smbm.xml", "not a catalogue");
    box.write_file("/mnt/USB/USB4/.davconf", "ON");  // a folder, not mounted
    box.write_file("/mnt/USB/plain", "file");
    box.write_file("/etc/shared_name",
                   "usbdisk1 = USB1\nusbdisk2 = USB2\nusbdisk3 = USB3\nusbdisk4 = USB4\n"
                   "usbdisk5 = USB5\n");

    // Volumes come in directory reading order, after the entry shares.
    std::string conf = start(), note = box.read_file(NOTE);
    EXPECT_THAT(conf, StartsWith(HEADER + public_section));
    EXPECT_THAT(note, StartsWith("Public\n"));
    size_t conf_size = (HEADER + public_section).size(), note_size = 7;
    const std::pair<std::string, std::string> usb[] = {
        {"usbdisk1", OPEN}, {"usbdisk2", authenticated("alice bob ", "bob ")},
        {"usbdisk5", authenticated("", "")}};
    for (const auto &[name, access] : usb) {
        EXPECT_THAT(conf, HasSubstr(section(name, "On", access)));
        EXPECT_THAT(note, HasSubstr("\n" + name + "\n"));
        conf_size += section(name, "On", access).size();
        note_size += name.size() + 1;
    }
    EXPECT_EQ(conf.size(), conf_size);
    EXPECT_EQ(note.size(), note_size);
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Public", "usbdisk1", "usbdisk2", "usbdisk5"));
    EXPECT_EQ(box.link_target(LINKS + "/usbdisk1"), "/mnt/USB/USB1");
    EXPECT_EQ(box.link_target(LINKS + "/usbdisk2"), "/mnt/USB/USB2");
}

TEST_F(UsbShares, VolumesAreOnAndLinkedWhateverTheWebdavSwitch) {
    box.set_config("/system_mgr/webdav/enable", "0");
    mount_usb("USB1");
    box.write_file("/etc/shared_name", "usbdisk1 = USB1\n");
    EXPECT_EQ(start(), HEADER + section("Public", "Off", OPEN) + section("usbdisk1", "On", OPEN));
    EXPECT_THAT(box.list_dir(LINKS), ElementsAre("usbdisk1"));
}

TEST_F(UsbShares, APublishedNameGetsOneSectionButEveryVolumeItsNoteLine) {
    mount_usb("USB1");
    mount_usb("USB2");
    box.write_file("/etc/shared_name", "same = USB1\nsame = USB2\n");
    EXPECT_EQ(start(), HEADER + public_section + section("same", "On", OPEN));
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
    mount_usb("USB1");
    struct { const char *file; std::string name; } cases[] = {  // "": no line names it
        {"ten = USB10\none = USB1\n", "ten"},
        {"other = USB7\nlast = USB1", "last"},
        {"usbdisk1 = USB1 and more words\n", "usbdisk1"},
        {"other = USB7\n", ""},
    };
    for (const auto &c : cases) {
        SCOPED_TRACE(c.file);
        box.write_file("/etc/shared_name", c.file);
        std::string conf = start();
        EXPECT_EQ(box.read_file(NOTE), "Public\n" + c.name + "\n");
        EXPECT_EQ(conf, HEADER + public_section + (c.name.empty() ? "" : section(c.name, "On", OPEN)));
        if (c.name.empty())
            EXPECT_THAT(box.list_dir(LINKS), ElementsAre("Public"));
        else
            EXPECT_EQ(box.link_target(LINKS + "/" + c.name), "/mnt/USB/USB1");
    }
}

}  // namespace
