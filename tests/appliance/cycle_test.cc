// start, stop and get through the installed binary, and the node lock.
#include <sys/stat.h>

#include <algorithm>

#include "appliance/fixture.h"

using namespace fixture;

namespace {

std::string answer(const std::string &name, const std::string &path, int enable = 1) {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n\t\t<item>\n\t\t\t<shared_name>" + name +
           "</shared_name>\n\t\t\t<path>" + path + "</path>\n\t\t\t<enable>" + std::to_string(enable) +
           "</enable>\n\t\t</item>\n\t</WebDAV>\n</config>\n";
}

// Longer than any answer, so an answer written without truncating shows.
const std::string EARLIER(3000, 'e');
// Each fits its field, but not once escaped.
const std::string LONG_NAME = std::string(240, 'n') + "&&&&", LONG_PATH = "/" + std::string(230, 'p') + "&&&&&";
const std::string WIDEST_NAME(255, 'w');  // fills its field exactly

void for_get(Appliance &box) {
    box.write_list(A2, {{"Public", "/Public"}, {"a&b \"q\"", "/Music"}, {"Whole", "/"}, {"R&D", "/R&D"},
                        {LONG_NAME, "/Long"}, {"Deep", LONG_PATH}, {"Later", "/Public"}, {WIDEST_NAME, "/Widest"}});
    box.write(QUERY, EARLIER);
}
void get_off(Appliance &box) { for_get(box), box.set_config(ENABLE, "0"); }

const Files NOTHING_CHANGED = {{list_of(A2), share_list_xml(7, A2_ITEMS)}, {list_of(B2), share_list_xml(7, B2_ITEMS)},
                               {CONF, GONE}, {LINKS, GONE}, {"/tmp/corvane.node", GONE},
                               {"/tmp/corvane_start_lock", GONE}, {"/tmp/dav.conf", GONE}};
const std::string START_CONF = HEADER + section("Public", "On", authenticated("alice ", "")) +
                               section("Music", "On", OPEN) + section("Backup", "Off", authenticated("bob ", "")) +
                               section("Docs", "On", OPEN) + section("Disc", "On", OPEN) + section("usbdisk1", "On", OPEN);
const std::string STOP_CONF = HEADER + section("Music", "Off", OPEN) + section("Backup", "Off", authenticated("bob ", "")) +
                              section("Docs", "Off", OPEN) + section("Disc", "Off", OPEN) + section("usbdisk1", "On", OPEN);

const Row ROWS[] = {
    {"start names by path, drops what no share covers or is too long, rewrites every list, the fourth volume's too",
     [](Appliance &box) {
         box.write_list(A2, {{"Old name", "/Public"}, {"Music", "/Music", 0, 1}, {"Gone", "/Gone"},
                             {std::string(256, 'n'), "/Photos"}}, 7);  // a name too long for its field
         box.write_list(B2, {{"Backup", "/Backup", 1, 0}, {"Root", "/"}}, 7);  // named after the first share below
         box.write_list(B2, ISO_ITEMS, 7, ISO);  // only the first readable iso list counts
         box.write(list_of(A2, ISO), "<refused");  // rewritten: every entry is in the one read
         box.make_dir(A2 + "/Gone"), box.make_dir("/mnt/HD/HD_c2");
         box.write(LINKS + "/stale", ""), box.write(NOTE, "stale\n");
     },
     {{list_of(A2), share_list_xml(1, A2_ITEMS)}, {list_of(B2), share_list_xml(1, {{"Backup", "/Backup", 1, 0}, {"Backup", "/"}})},
      {list_of(D2), share_list_xml(1, D2_ITEMS)}, {list_of("/mnt/HD/HD_c2"), share_list_xml(1, {})},
      {"/mnt/HD/HD_c2/.system_data", "mode 755"}, {list_of(A2, ISO), share_list_xml(1, ISO_ITEMS)},
      {list_of(D2, ISO), share_list_xml(1, ISO_ITEMS)}, {CONF, START_CONF},
      {NOTE, "Public\nMusic\nBackup\nBackup\nDocs\nDisc\nusbdisk1\n"}, {LINKS + "/", "Disc Docs Music Public usbdisk1"},
      {LINKS + "/Public", "-> " + A2 + "/Public"}, {LINKS + "/usbdisk1", "-> /mnt/USB/USB1"},
      {"/tmp/corvane.node", GONE}, {"/tmp/corvane_start_lock", GONE}, {"/tmp/dav.conf", GONE}},
     {"start"}, {"restart dav"}, 0, {"cannot use " + list_of(A2, ISO)}},
    {"start removes a marker an interrupted run staged on a USB volume",
     [](Appliance &box) { box.write("/mnt/USB/USB1/.davconf.davsync", "ON"); },
     {{"/mnt/USB/USB1/.davconf.davsync", GONE}, {"/mnt/USB/USB1/.davconf", "ON"}}, {"start"}, {"restart dav"}, 0,
     {"start: discarded what an interrupted run left (1 files)"}},
    {"stop keeps what matches name and path, all off, only the USB link",
     [](Appliance &box) {
         box.write("/tmp/corvane_start_lock", "");
         box.write_list(A2, {{"Old name", "/Public"}, {"Music", "/Music", 0, 1}}, 7);
     },
     {{list_of(A2), share_list_xml(0, {{"Music", "/Music", 0, 1}})}, {list_of(D2), share_list_xml(0, D2_ITEMS)},
      {CONF, STOP_CONF}, {LINKS + "/", "usbdisk1"}, {"/tmp/corvane_start_lock", GONE}, {"/tmp/corvane.node", GONE}},
     {"stop"}, {"stop dav"}},
    {"enable 11 is off", [](Appliance &box) { box.set_config(ENABLE, "11"); }, {{LINKS + "/", "usbdisk1"}}, {"start"}, {"stop dav"}},
    {"directory service on: only the USB note lines",
     [](Appliance &box) { box.write(NOTE, "stale\n"), box.set_config("/system_mgr/samba/ads_enable", "1"); },
     {{NOTE, "usbdisk1\n"}}},
    {"another start under way: two seconds", [](Appliance &box) { box.write("/tmp/corvane_start_lock", ""); },
     {{"/tmp/corvane_start_lock", GONE}}, {"start"}, {"restart dav"}, 2.0},
    {"no data volume", [](Appliance &box) { box.write("/etc/mtab", "/dev/sdc1 /mnt/USB/USB1 vfat rw 0 0\n"); },
     NOTHING_CHANGED, {"start"}, {}, 0, {"start: no data volume is mounted; nothing was changed"}},
    {"catalogue without samba", [](Appliance &box) { box.write("/var/www/xml/smb.xml", "<config/>"); }, NOTHING_CHANGED,
     {"start"}, {}, 0, {"start: cannot use the share catalogue /var/www/xml/smb.xml; nothing was changed"}},
    {"get", for_get, {{QUERY, answer("Public", A2 + "/Public")}}, {"get", A2 + "/Public"}, {}},
    {"get in a list padded with NULs, as a crash can leave it",
     [](Appliance &box) { box.write(list_of(A2), share_list_xml(7, {{"Public", "/Public"}}) + std::string(99, '\0')); },
     {{QUERY, answer("Public", A2 + "/Public")}}, {"get", A2 + "/Public"}, {}},
    {"get prefix", for_get, {{QUERY, EARLIER}}, {"get", A2 + "/Pub"}, {}},
    {"get volume root", for_get, {{QUERY, answer("Whole", A2 + "/")}}, {"get", A2}, {}},
    {"get escapes", for_get, {{QUERY, answer("a&amp;b &quot;q&quot;", A2 + "/Music")}}, {"get", A2 + "/Music"}, {}},
    {"get decodes", for_get, {{QUERY, answer("R&amp;D", A2 + "/R&amp;D")}}, {"get", A2 + "/R&amp;D"}, {}},
    {"get a name that fills its field", for_get, {{QUERY, answer(WIDEST_NAME, A2 + "/Widest")}}, {"get", A2 + "/Widest"}, {}},
    {"get escaped name too long", for_get, {{QUERY, EARLIER}}, {"get", A2 + "/Long"}, {}},
    {"get escaped path too long", for_get, {{QUERY, EARLIER}}, {"get", A2 + LONG_PATH}, {}},
    {"get USB folder of 13", for_get, {{QUERY, answer("USB1/", "/mnt/USB/USB1/")}}, {"get", "/mnt/USB/USB1"}, {}},
    {"get unmarked USB folder", for_get, {{QUERY, EARLIER}}, {"get", "/mnt/USB/NONE"}, {}},
    {"get with WebDAV off", get_off, {{QUERY, GONE}}, {"get", A2 + "/Public"}, {}},
    {"get USB with WebDAV off", get_off, {{QUERY, answer("USB1/", "/mnt/USB/USB1/")}},
     {"get", "/mnt/USB/USB1/"}, {}},
    {"get without volumes", [](Appliance &box) { get_off(box), box.write("/etc/mtab", ""); }, {{QUERY, EARLIER}}, {"get", A2 + "/Public"}, {},
     0, {"get: no data volume is mounted; no answer was written"}},
};

class StartStopGet : public testing::TestWithParam<Row> {};
TEST_P(StartStopGet, LeaveExactlyTheseFiles) { check(GetParam(), realistic); }
INSTANTIATE_TEST_SUITE_P(Rows, StartStopGet, testing::ValuesIn(ROWS));

// Volumes spin down: a start that changes nothing writes no list again.
TEST(StartStop, ASecondStartRewritesNothing) {
    Appliance box;
    realistic(box);
    box.run({"start"});
    auto inodes = [&box] {
        std::vector<ino_t> found;
        for (const std::string &path : {list_of(A2), list_of(B2), list_of(D2), list_of(A2, ISO), CONF}) {
            struct stat status {};
            found.push_back(stat(box.host(path).c_str(), &status) == 0 ? status.st_ino : 0);
        }
        return found;
    };
    std::vector<ino_t> first = inodes();
    EXPECT_EQ(std::count(first.begin(), first.end(), 0), 0);
    box.run({"start"});
    EXPECT_EQ(inodes(), first);
}

// Every release removes the lock file, yet no two holders ever overlap.
TEST(NodeLock, ManyContendingProcessesAreNeverInsideTogether) {
    Appliance box;
    RunResult run = box.run({"8", "250"}, {{}, 0, DAVSYNC_LOCK_STRESS});
    EXPECT_EQ(run.status, 0) << run.out << run.err;
    EXPECT_FALSE(box.exists("/tmp/corvane.node"));
}

}  // namespace
