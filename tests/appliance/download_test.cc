// p2pen and amulen through the installed binary.
#include "appliance/fixture.h"

using namespace fixture;

namespace {

void download_base(Appliance &box) {
    realistic(box);
    std::vector<Share> shares = realistic_shares();
    shares.insert(shares.end(), {{"P2P", A2 + "/P2P"}, {"P2P", B2 + "/P2P"}, {"aMule", B2 + "/aMule"},
                                 {"Mine", B2 + "/P2P"}, {"Deeper", B2 + "/P2P/"}});
    publish(box, shares);
    box.set_config("/download_mgr/p2p/enable", "1");
    box.write("/etc/NAS_CFG/p2psettings.xml", "<p2p>\n<save_path>/mnt/HD/HD_b2/Download</save_path>\n</p2p>\n");
    box.write("/etc/NAS_CFG/apkg.xml", "<apkg><item><name>aMule</name><state>0</state><path>/mnt/HD/HD_a2/x</path></item>"
              "<item><name>aMule</name><state>1</state><path>/mnt/HD/HD_b2/x</path></item>"
              "<item><name>other</name><state>1</state><path>/mnt/HD/HD_a2/x</path></item></apkg>");
}

const std::vector<ListItem> BACKUP = {{"Backup", "/Backup", 1, 0}};

const Row ROWS[] = {
    {"p2pen moves its share to the download volume, keeping the choices made there",
     [](Appliance &box) {
         box.write_list(A2, {{"Public", "/Public"}, {"P2P", "/P2P"}}, 7);
         box.write_list(B2, {{"Backup", "/Backup", 1, 0}, {"Mine", "/P2P", 0, 0}, {"Deeper", "/P2P/"}}, 7);
     },
     {{list_of(A2), share_list_xml(1, {{"Public", "/Public"}})},
      {list_of(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}, {"Deeper", "/P2P/"}, {"P2P", "/P2P", 0, 0}})},
      {list_of(D2), share_list_xml(1, D2_ITEMS)}, {list_of(A2, ISO), share_list_xml(7, ISO_ITEMS)}},
     {"p2pen"}},
    {"p2pen onto the first volume",
     [](Appliance &box) { box.write("/etc/NAS_CFG/p2psettings.xml", "<p2p><save_path>/mnt/HD/HD_a2/x</save_path></p2p>"); },
     {{list_of(A2), share_list_xml(1, {{"Public", "/Public"}, {"Music", "/Music", 0, 1}, {"P2P", "/P2P"}})}}, {"p2pen"}},
    {"p2pen with the download manager off", [](Appliance &box) { box.set_config("/download_mgr/p2p/enable", "0"); },
     {{list_of(B2), share_list_xml(1, BACKUP)}}, {"p2pen"}},
    {"amulen without the package manager", nullptr, {{list_of(B2), share_list_xml(1, BACKUP)}}, {"amulen"}},
    {"amulen takes the first running package", [](Appliance &box) {
         box.write("/opt/alongside/apkg", "#!/bin/sh\nsleep 30\n", 0755);  // the package manager, by its name
     },
     {{list_of(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}, {"aMule", "/aMule"}})}}, {"amulen"}},
};

class DownloadShares : public testing::TestWithParam<Row> {};
TEST_P(DownloadShares, LeaveExactlyTheseFiles) { check(GetParam(), download_base); }
INSTANTIATE_TEST_SUITE_P(Rows, DownloadShares, testing::ValuesIn(ROWS));

}  // namespace
