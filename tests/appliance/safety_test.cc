// What no user and no failing machine may make a run do: use something
// planted where it writes, follow a link out of a USB volume, publish what
// lies outside the volume folders, replace a list it could not read, store
// or place what it did not finish, or lose an edit to another run.
#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <map>
#include <random>

#include "appliance/fixture.h"

using namespace fixture;

namespace {

const std::string VICTIM = "/etc/victim";
const std::string A2_LIST = A2 + "/.system_data/lighty.xml";
// Every name the tool writes or opens in /tmp, the world-writable folder.
const Words TMP_NAMES = {"/tmp/dav.conf", "/tmp/corvane.node", "/tmp/corvane_start_lock",
                         "/tmp/set_webdav_note", "/tmp/lighty.xml", "/tmp/lighty_iso.xml", QUERY};

// The stored lists and the placed configuration.
Files stored(const Appliance &box) {
    Files files = {{CONF, ""}};
    for (const std::string &volume : {A2, B2, D2})
        for (const std::string list : {"lighty.xml", "lighty_iso.xml"}) files.push_back({volume + "/.system_data/" + list, ""});
    for (auto &[path, text] : files) text = box.exists(path) ? box.read(path) : GONE;
    return files;
}

// What a start on the realistic appliance leaves when nothing is in its way.
const Files &clean_start() {
    static const Files files = [] { Appliance box; realistic(box), box.run({"start"}); return stored(box); }();
    return files;
}

void expect_quiet(const RunResult &run) { EXPECT_EQ(std::to_string(run.status) + run.out + run.err, "0"); }

TEST(Safety, NothingPlantedInTmpIsUsed) {
    const std::vector<std::pair<const char *, std::function<void(Appliance &, const std::string &)>>> plants = {
        {"link", [](Appliance &box, const std::string &at) { box.plant_link(VICTIM, at); }},
        {"fifo", [](Appliance &box, const std::string &at) { box.plant_fifo(at); }},
        {"folder", [](Appliance &box, const std::string &at) { box.make_dir(at + "/x"); }},
        {"foreign file", [](Appliance &box, const std::string &at) { box.plant_foreign(at); }}};
    for (const auto &[kind, plant] : plants) {
        SCOPED_TRACE(kind);
        Appliance box;
        realistic(box);
        box.write(VICTIM, "keep");
        for (const std::string &name : TMP_NAMES) plant(box, name);
        expect_quiet(box.run({"start"}));
        expect_quiet(box.run({"get", A2 + "/Public"}));
        expect_files(box, clean_start());
        EXPECT_EQ(box.read(VICTIM), "keep");
        if (std::string(kind) == "folder") continue;  // what cannot be removed stays; runs go on without it
        expect_files(box, {{"/tmp/corvane.node", GONE}, {"/tmp/corvane_start_lock", GONE}});
        EXPECT_NE(box.read(QUERY).find("<shared_name>Public<"), std::string::npos);
        Words lines = box.log_lines();
        EXPECT_TRUE(std::any_of(lines.begin(), lines.end(), [](const std::string &line) {
            return line.find("start: cleared what another user planted at /tmp/corvane.node") != std::string::npos;
        })) << testing::PrintToString(lines);
    }
}

// Input items whose path is no volume folder, or goes through a link on a
// USB volume, change nothing but what the good item asks for.
TEST(Safety, ItemsOutsideTheVolumeFoldersAndLinksOnAUsbVolumeAreNotFollowed) {
    Appliance box;
    realistic(box);
    box.set_catalogue({{"Public", A2 + "/Public", "", "", "", "yes"}, {"Root", "/", "", "", "", "yes"}});
    box.plant_link("/etc", "/mnt/USB/USB1/sub");
    box.write("/etc/.davconf", "keep");
    box.mount_usb("USB2", false);
    box.plant_link(VICTIM, "/mnt/USB/USB2/.davconf");
    box.write(VICTIM, "keep");
    box.write("/tmp/in.xml", share_list_xml(1, {{"Root", "/"}, {"Root2", A2 + "/../../etc"}, {"Root3", "/etc"},
                                                 {"Root4", "/mnt/HD/HD_A2/x"}, {"Sub", "/mnt/USB/USB1/sub"},
                                                 {"Usb2", "/mnt/USB/USB2"}, {"Dot", A2 + "/./Public"}}));
    expect_quiet(box.run({"do", "/tmp/in.xml"}));
    expect_quiet(box.run({"del", "/mnt/USB/USB1/sub"}));
    expect_files(box, {{"/etc/.davconf", "keep"}, {VICTIM, "keep"}, {"/mnt/USB/USB2/.davconf", "-> " + VICTIM}});
    expect_logged(box, {"do: refused to mark /mnt/USB/USB1/sub: a link or a dot name on the way",
                        "do: refused to mark /mnt/USB/USB2: something else stands at the marker's name",
                        "del: refused to unmark /mnt/USB/USB1/sub: a link or a dot name on the way"});
    EXPECT_EQ(box.read(CONF).find("Root"), std::string::npos);
    expect_quiet(box.run({"chg", A2 + "/Public", "/"}));
    EXPECT_NE(box.read(CONF).find(section("Public", "On", OPEN)), std::string::npos);
    expect_files(box, {{LINKS + "/Public", "-> " + A2 + "/Public"}});
}

// Emptying a link planted as the link directory would empty its target, and
// a share named like a file there would serve it: the run stops first.
TEST(Safety, ALinkPlantedAsTheLinkDirectoryStopsTheRun) {
    Appliance box;
    realistic(box);
    box.plant_link("/etc", LINKS);
    box.write("/etc/keep", "keep");
    expect_quiet(box.run({"start"}));
    expect_files(box, {{"/etc/keep", "keep"}, {CONF, GONE}});
    expect_logged(box, {"start: cannot use the link directory /usr/local/apache2_dav/webdav: Too many levels"});
    EXPECT_EQ(box.apache_calls(), Words{});
}

// A list the reader refuses, whatever the reason, stays byte for byte, is
// told and contributes nothing; an edit that would store entries in its place
// changes nothing; once it reads again its entries come back.
// A list in the tool's own layout with a name no XML reader takes.
std::string own_layout_with(const std::string &name) {
    std::string own = share_list_xml(1, {{"aXb", "/Public"}});
    return own.replace(own.find("aXb"), 3, name);
}

TEST(Safety, AListTheReaderRefusesIsKept) {
    const std::string list = "<?xml version=\"1.0\"?>\n<config>\n\t<WebDAV>\n", end = "</WebDAV></config>\n",
                      counts = "<count>1</count><allen>1</allen>",
                      item = "<item><shared_name>Public</shared_name><path>/Public</path></item>";
    for (const std::string &refused :
         {std::string(), list + "\t\t<count>2", std::string("\xff\xfe not xml"), list + "<!-- x -->" + counts + item + end,
          list + "<?pi x?>" + counts + item + end, list + item + counts + end, list + "<count>1</count>" + item + end,
          "<!DOCTYPE c>" + list + counts + item + end, "<config>text" + list.substr(list.find("\t<")) + counts + end,
          own_layout_with("a]]>b"), own_layout_with("a\xc3(b"), own_layout_with("a\x01b")}) {
        SCOPED_TRACE(refused);
        Appliance box;
        realistic(box);
        box.write(A2_LIST, refused);
        box.write("/tmp/in.xml", share_list_xml(1, {{"Photos", A2 + "/Photos"}}));
        expect_quiet(box.run({"start"}));
        std::string conf = box.read(CONF);
        EXPECT_EQ(conf.find("Public"), std::string::npos);
        EXPECT_NE(conf.find("Backup"), std::string::npos);
        expect_quiet(box.run({"do", "/tmp/in.xml"}));
        expect_files(box, {{A2_LIST, refused}, {CONF, conf}});
        expect_logged(box, {"start: cannot use " + A2_LIST, "do: cannot use " + A2_LIST,
                            "do: cannot store entries in a list left as it is: " + A2_LIST + "; nothing was changed"});
        box.write_list(A2, A2_ITEMS, 7);
        expect_quiet(box.run({"start"}));
        expect_files(box, clean_start());
    }
}

// A catalogue name cut to the 255 bytes of an entry keeps whole characters,
// so the list written from it parses and is stored.
TEST(Safety, ANameCutAtItsWidthStaysReadable) {
    Appliance box;
    realistic(box);
    std::string e_acute_150;
    while (e_acute_150.size() < 300) e_acute_150 += "\xc3\xa9";
    box.set_catalogue({{e_acute_150, A2 + "/Public", "", "", "", "yes"}});
    expect_quiet(box.run({"start"}));
    EXPECT_NE(box.read(A2_LIST).find("<shared_name>" + e_acute_150.substr(0, 254) + "<"), std::string::npos);
}

// With /tmp full the lists cannot be staged, with a volume full they cannot
// be stored: then neither list nor configuration changes (the configuration
// would publish a share its list still holds, or drop one it holds), and the
// failure is told.
TEST(Safety, AListThatCannotBeStoredChangesNothing) {
    // The fillers leave no page of the 64k free beside what is there already.
    for (const auto &[full, filler_kb] : {std::make_pair(std::string("/tmp"), 60), std::make_pair(B2, 56)}) {
        SCOPED_TRACE(full);
        Appliance box;
        realistic(box);
        box.run({"start"});
        Files before = stored(box);
        box.write(full + "/filler", std::string(filler_kb * 1024, 'f'));
        expect_quiet(box.run({"del", B2 + "/Backup"}, RunOptions{{{full, "64k"}}}));
        expect_files(box, before);
        expect_logged(box, {"del: cannot "});
        EXPECT_EQ(box.apache_calls(), Words{"restart dav"});
    }
}

// Killed at any moment, a run leaves each list as it was or as a whole run
// writes it, and the next start places a complete configuration.
TEST(Safety, AKilledRunLeavesOldOrNewAndTheNextStartCompletes) {
    int trials = getenv("DAVSYNC_KILL_TRIALS") ? atoi(getenv("DAVSYNC_KILL_TRIALS")) : 30;
    std::mt19937 random(7);
    Appliance box;
    realistic(box);
    const Files old = stored(box);
    for (int trial = 0; trial < trials; ++trial) {
        for (size_t i = 1; i < old.size(); ++i) old[i].second == GONE ? box.remove(old[i].first) : box.write(old[i].first, old[i].second);
        box.run({"start"}, RunOptions{{}, static_cast<int>(random() % 120) + 1});
        Files now = stored(box);
        for (size_t i = 1; i < old.size(); ++i)
            EXPECT_TRUE(now[i].second == old[i].second || now[i].second == clean_start()[i].second) << now[i].first << trial;
        expect_quiet(box.run({"start"}));
        expect_files(box, clean_start());
        expect_files(box, {{A2 + "/.system_data/", "lighty.xml lighty_iso.xml"}, {B2 + "/.system_data/", "lighty.xml lighty_iso.xml"},
                           {"/usr/local/apache2_dav/conf/extra/", "httpd-dav.conf"}, {"/tmp/", "set_webdav_note"}});
    }
}

TEST(Safety, ConcurrentRunsLoseNoEditAndLeaveNoMark) {
    Appliance box;
    realistic(box);
    std::vector<Share> shares = realistic_shares();
    std::vector<pid_t> runs;
    for (int i = 0; i < 32; ++i) {
        std::string name = "New" + std::to_string(i);
        shares.push_back({name, A2 + "/" + name, "", "", "", "yes"});
        box.write("/tmp/" + name, share_list_xml(1, {{name, A2 + "/" + name}}));
    }
    publish(box, shares);
    box.write("/tmp/corvane.node/planted/file", "x");  // as any local user may
    for (int i = 0; i < 32; ++i) runs.push_back(box.start({"do", "/tmp/New" + std::to_string(i)}));
    for (const Words &words : {Words{"start"}, {"get", A2 + "/Public"}, {"del", B2 + "/Backup"}, {"stop"}, {"du", "x"}})
        runs.push_back(box.start(words));
    for (pid_t run : runs) expect_quiet(box.finish(run));
    for (int i = 0; i < 32; ++i)
        EXPECT_NE(box.read(A2_LIST).find("<path>/New" + std::to_string(i) + "</path>"), std::string::npos) << i;
    expect_files(box, {{"/tmp/corvane.node", GONE}, {"/tmp/corvane_start_lock", GONE}});
    Words lines = box.log_lines();
    EXPECT_FALSE(lines.empty());
    for (const std::string &line : lines) EXPECT_NE(line.find("cleared what another user planted at /tmp/corvane.node"), line.npos) << line;
}

// A folder mounted at the lock's name cannot be cleared: the run takes
// the failure exit and changes nothing.
TEST(Safety, ALockThatCannotBeHadChangesNothing) {
    Appliance box;
    realistic(box);
    std::string list = box.read(A2_LIST);
    expect_quiet(box.run({"start"}, RunOptions{{{"/tmp/corvane.node", "16k"}}}));
    expect_files(box, {{CONF, GONE}, {A2_LIST, list}, {LINKS, GONE}});
    EXPECT_EQ(box.apache_calls(), Words{});
    expect_logged(box, {"start: cannot take the run lock /tmp/corvane.node: Device or resource busy; nothing was changed"});
}

// Every file of the root but those the tool writes: its type, size and time.
std::map<std::string, std::string> outside_tool_files(const Appliance &box) {
    namespace fs = std::filesystem;
    std::map<std::string, std::string> files;
    std::string root = box.host("");
    for (const auto &entry : fs::recursive_directory_iterator(root)) {
        std::string path = entry.path().string().substr(root.size());
        if (path.rfind("/tmp/", 0) && path.rfind("/usr/local/apache2_dav/", 0) && path.find("/.system_data/") == path.npos &&
            path.find("/.davconf") == path.npos && path != "/var/log/apache_calls")
            files[path] = fs::is_regular_file(entry.symlink_status())
                              ? box.read(path) + std::to_string(fs::last_write_time(entry).time_since_epoch().count())
                              : std::to_string(static_cast<int>(entry.symlink_status().type()));
    }
    return files;
}

// Catalogues, lists, names and widths a user can shape: no run crashes,
// hangs, prints, or writes anything but the tool's own files.
TEST(Safety, HostileInputsTouchNothingButTheToolsFiles) {
    std::string punctuation = "!\"#$%&'()*+,-./:;<=>?@[\\]^_`{|}~\t\n x";
    std::string laughs = "<!DOCTYPE c [<!ENTITY a \"aaaaaaaaaa\">";
    for (char level = 'b'; level <= 'k'; ++level)
        laughs += std::string("<!ENTITY ") + level + " \"" + std::string(10, '&') + "\">";
    const std::vector<std::pair<const char *, std::function<void(Appliance &)>>> inputs = {
        {"20 MB list", [](Appliance &box) { box.set_catalogue({{"Public", A2 + "/Public", std::string(20 << 20, 'r')}}); }},
        {"external entity", [](Appliance &box) {
             box.write("/var/www/xml/smb.xml", "<!DOCTYPE c [<!ENTITY x SYSTEM \"file:///etc/victim\">]><c><samba><item>"
                                                "<name>Public&x;</name><path>" + A2 + "/Public</path></item></samba></c>"); }},
        {"exponential entities", [laughs](Appliance &box) { box.write(A2_LIST, laughs + "]><c><WebDAV><count>&k;</count></WebDAV></c>"); }},
        {"names of every kind", [punctuation](Appliance &box) {
             publish(box, {{punctuation, A2 + "/P", "#" + punctuation + "#"}, {std::string(256, 'n'), A2 + "/N"}});
             box.write_list(A2, {{punctuation, "/P"}, {std::string(256, 'n'), "/N"}, {"bad\xff\xfe", "/P"}});
             box.write("/etc/shared_name", punctuation + " = USB1\n\xff\xfe = USB1\n"); }}};
    for (const auto &[what, input] : inputs) {
        SCOPED_TRACE(what);
        Appliance box;
        realistic(box);
        box.write(VICTIM, "keep");
        input(box);
        box.write("/tmp/in.xml", share_list_xml(1, {{"Public", A2 + "/Public"}}));
        auto before = outside_tool_files(box);
        for (const Words &words : {Words{"start"}, Words{"do", "/tmp/in.xml"}, Words{"get", A2 + "/Public"}})
            expect_quiet(box.run(words));
        EXPECT_EQ(outside_tool_files(box), before);
        EXPECT_EQ(box.read(CONF).find("keep"), std::string::npos);
    }
}

}  // namespace
