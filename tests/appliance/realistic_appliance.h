// A realistic appliance for the command tests: two data volumes, an iso
// list, a marked USB volume, groups, and a catalogue that matches the lists.
#ifndef DAVSYNC_TESTS_APPLIANCE_REALISTIC_APPLIANCE_H
#define DAVSYNC_TESTS_APPLIANCE_REALISTIC_APPLIANCE_H

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "harness/appliance.h"

class RealisticAppliance : public ::testing::Test {
protected:
    static constexpr const char *A2 = "/mnt/HD/HD_a2";
    static constexpr const char *B2 = "/mnt/HD/HD_b2";
    static constexpr const char *LINKS = "/usr/local/apache2_dav/webdav";
    static constexpr const char *CONF = "/usr/local/apache2_dav/conf/extra/httpd-dav.conf";
    static constexpr const char *NOTE = "/tmp/set_webdav_note";

    appliance::Appliance box;
    std::vector<appliance::Share> shares;

    void SetUp() override {
        box.mount(A2);
        box.mount(B2);
        for (const char *folder : {"/mnt/HD/HD_a2/Public", "/mnt/HD/HD_a2/Music",
                                   "/mnt/HD/HD_a2/Photos", "/mnt/HD/HD_b2/Backup",
                                   "/mnt/isoMount/Disc"})
            box.make_dir(folder);
        box.add_user("alice");
        box.add_user("bob");
        box.add_user("carol");
        box.add_group("staff", {"bob", "carol"});
        shares = {
            {"Public", "/mnt/HD/HD_a2/Public", "#alice#", "", "", "", ""},
            {"Music", "/mnt/HD/HD_a2/Music", "", "", "", "yes", ""},
            {"Photos", "/mnt/HD/HD_a2/Photos", "#@staff#", "#alice#", "", "", ""},
            {"Backup", "/mnt/HD/HD_b2/Backup", "#@staff#", "", "#carol#", "", ""},
            {"Disc", "/mnt/isoMount/Disc", "", "", "", "", "1"},
        };
        box.set_catalogue(shares);
        box.write_share_list(A2, {{"Public", "/Public", 1, 1}, {"Music", "/Music", 0, 1}});
        box.write_share_list(B2, {{"Backup", "/Backup", 1, 0}});
        box.write_share_list(A2, {{"Disc", "/Disc", 0, 1}}, 1, "lighty_iso.xml");
        box.mount("/mnt/USB/USB1", "/dev/sdc1", "vfat");
        box.write_file("/mnt/USB/USB1/.davconf", "ON");
        box.write_file("/etc/shared_name", "usbdisk1 = USB1\n");
    }

    std::vector<std::string> run_ok(const std::vector<std::string> &args) {
        appliance::RunResult result = box.run(args);
        EXPECT_EQ(result.status, 0);
        EXPECT_EQ(result.out, "");
        EXPECT_EQ(result.err, "");  // the tool prints nothing, not even parse errors
        return box.apache_calls();
    }

    // Neither run mark may outlive a run without competitors.
    void expect_no_marks_left() {
        EXPECT_FALSE(box.exists("/tmp/corvane.node"));
        EXPECT_FALSE(box.exists("/tmp/corvane_start_lock"));
        EXPECT_FALSE(box.exists("/tmp/dav.conf"));
    }

    // The volume files, the placed configuration, the links and the server
    // are as a failed run must leave them: untouched.
    void expect_nothing_changed(const std::string &list_a2, const std::string &list_b2) {
        EXPECT_EQ(box.read_share_list(A2), list_a2);
        EXPECT_EQ(box.read_share_list(B2), list_b2);
        EXPECT_FALSE(box.exists(CONF));
        EXPECT_FALSE(box.exists(LINKS));
        EXPECT_TRUE(box.apache_calls().empty());
        expect_no_marks_left();
    }
};

#endif
