// Share list files round-tripped through start: escaping, left-out entries,
// a volume root and the iso list.
#include <gmock/gmock.h>

#include "appliance/realistic_appliance.h"

using appliance::share_list_xml;

using ShareData = RealisticAppliance;

TEST_F(ShareData, MarkupInANameRoundTripsByteForByte) {
    const std::string name = "Tom & \"Jerry\" <x> 'y'";
    box.make_dir("/mnt/HD/HD_b2/Odd & <dir>");
    shares.push_back({name, "/mnt/HD/HD_b2/Odd & <dir>", "", "", "", "yes", ""});
    box.set_catalogue(shares);
    box.write_share_list(B2, {{"Backup", "/Backup", 1, 0}, {name, "/Odd & <dir>", 0, 1}});

    for (int run = 0; run < 2; ++run) run_ok({"start"});

    EXPECT_EQ(box.read_share_list(B2),
              "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n"
              "\t\t<count>2</count>\n\t\t<allen>1</allen>\n"
              "\t\t\t<item>\n\t\t\t\t<shared_name>Backup</shared_name>\n"
              "\t\t\t\t<path>/Backup</path>\n\t\t\t\t<RW>1</RW>\n\t\t\t\t<enable>0</enable>\n"
              "\t\t\t</item>\n"
              "\t\t\t<item>\n"
              "\t\t\t\t<shared_name>Tom &amp; &quot;Jerry&quot; &lt;x&gt; 'y'</shared_name>\n"
              "\t\t\t\t<path>/Odd &amp; &lt;dir&gt;</path>\n\t\t\t\t<RW>0</RW>\n"
              "\t\t\t\t<enable>1</enable>\n\t\t\t</item>\n"
              "\t</WebDAV>\n</config>\n");
}

TEST_F(ShareData, EntriesWhoseFolderIsMissingAreLeftOutAndNotCounted) {
    shares.push_back({"Gone", "/mnt/HD/HD_a2/Gone", "", "", "", "yes", ""});
    box.set_catalogue(shares);
    box.write_share_list(A2, {{"Public", "/Public", 1, 1}, {"Gone", "/Gone", 1, 1},
                              {"Music", "/Music", 0, 1}});

    run_ok({"start"});

    EXPECT_EQ(box.read_share_list(A2),
              share_list_xml(1, {{"Public", "/Public", 1, 1}, {"Music", "/Music", 0, 1}}));
}

TEST_F(ShareData, VolumeRootAndAnIsoListReadFromTheSecondVolumeRoundTrip) {
    // First in the catalogue: the path rule names a root entry after the
    // first share whose path begins with the volume's.
    shares.insert(shares.begin(), {"Volume", "/mnt/HD/HD_b2/", "", "", "", "yes", ""});
    box.set_catalogue(shares);
    box.write_share_list(B2, {{"Volume", "/", 1, 1}, {"Backup", "/Backup", 1, 0}});
    box.remove("/mnt/HD/HD_a2/.system_data/lighty_iso.xml");
    box.write_share_list(B2, {{"Disc", "/Disc", 0, 1}}, 0, "lighty_iso.xml");

    run_ok({"start"});

    EXPECT_EQ(box.read_share_list(B2),
              share_list_xml(1, {{"Volume", "/", 1, 1}, {"Backup", "/Backup", 1, 0}}));
    for (const char *volume : {A2, B2})
        EXPECT_EQ(box.read_share_list(volume, "lighty_iso.xml"),
                  share_list_xml(1, {{"Disc", "/Disc", 0, 1}}))
            << volume;
}
