// The WebDAV configuration, its links and note lines, USB volumes, and what
// the tool must never do with the names it reads: hand them to the shell,
// or break the configuration with them.
#include "appliance/fixture.h"

using namespace fixture;

namespace {

using Setup = std::function<void(Appliance &)>;

void accounts(Appliance &box) {
    box.mount(A2), box.mount(B2);
    box.add_group("staff", {"bob", "carol"});
    box.add_group("team", {"carol", "dave"});
    box.add_group("wide", {std::string(64, 'w'), "dave"});
}

// The shares, each listed on A2 under its own name.
Setup on_a2(const std::vector<Share> &shares, Setup more = nullptr) {
    return [=](Appliance &box) {
        std::vector<ListItem> items;
        for (const Share &share : shares) items.push_back({share.name, share.path.substr(A2.size())});
        publish(box, shares);
        box.write_list(A2, items);
        if (more) more(box);
    };
}
Share open_share(const std::string &name, const std::string &folder) { return {name, A2 + "/" + folder, "", "", "", "yes"}; }
const Share PUBLIC = open_share("Public", "Public");
const std::string PUBLIC_CONF = HEADER + section("Public", "On", OPEN);

// Listed twice, the second "Public" gets nothing: its name is taken.
const std::string N63(63, 'n');
const std::vector<Share> RULES = {
    PUBLIC, PUBLIC, {"Team", A2 + "/Team", "#alice#,#@staff#", "#dave#,#mallory#", "#mallory#,#carol#"}, {"Empty", A2 + "/Empty"},
    {"Paused", A2 + "/Paused", "#alice#", "", "", "", "1"}, {"R", A2 + "/R", "#@allaccount#", "#bob#"},
    {"W", A2 + "/W", "#bob#", "#@allaccount#", "#bob#", "", "0"},
    {"My Files", A2 + "/My Files", "#alice#,#alice#", "#bob#", "#@allaccount#", "no", "2"},
    {"G1", A2 + "/G1", "#bob#,#@staff#", "#@staff#,#bob#"},
    {"G2", A2 + "/G2", "#@staff#,#@team#,#@ghosts#,#" + N63 + "#,#" + N63 + "x#,#@wide#,#@AllAccount#"}};
const std::string RULES_CONF =
    PUBLIC_CONF + section("Team", "On", authenticated("alice bob dave ", "dave ")) +
    section("Empty", "On", authenticated("", "")) + section("Paused", "On", OPEN) + section("R", "On", OPEN) +
    section("W", "On", OPEN) + section("My Files", "On", authenticated("alice alice bob ", "bob ")) +
    section("G1", "On", authenticated("bob carol bob carol bob ", "bob carol bob ")) +
    section("G2", "On", authenticated("bob carol dave " + N63 + " ", ""));

// Entries "#name#," of `count` names of `length` characters, and their user line text.
std::pair<std::string, std::string> names(int first, int count, size_t length) {
    std::pair<std::string, std::string> texts;
    for (int i = first; i < first + count; ++i) {
        std::string name = std::to_string(1000 + i) + std::string(length - 4, 'x');
        texts.first += "#" + name + "#,", texts.second += name + " ";
    }
    return texts;
}
// A line holds 12,799 characters: "\t\tRequire user " and 199 names of 63 leave 48.
const auto READ = names(0, 100, 63), WRITE = names(100, 99, 63), FILLS = names(199, 1, 47),
           TOO_LONG = names(199, 1, 49), SHORT = names(200, 1, 5);
// A list is read up to 12,799 characters: "omega" ends there, or is cut there.
std::string at_list_end(size_t filler) { return std::string(filler, 'y') + ",alpha,omega,next"; }

const std::string NEUTRALISED = "x$(touch${IFS}pwned7)`touch pwned8`";

Setup usb(const std::string &shared_names, Setup more = nullptr) {
    return on_a2({PUBLIC}, [=](Appliance &box) {
        box.mount_usb("USB1"), box.write("/etc/shared_name", shared_names);
        if (more) more(box);
    });
}

const Row ROWS[] = {
    {"access rules", on_a2(RULES),
     {{CONF, RULES_CONF}, {LINKS + "/", "Empty G1 G2 My Files Paused Public R Team W"},
      {LINKS + "/My Files", "-> " + A2 + "/My Files"}, {NOTE, "Public\nPublic\nTeam\nEmpty\nPaused\nR\nW\nMy Files\nG1\nG2\n"}}},
    {"user lines and list texts at their limits",
     on_a2({{"Exact", A2 + "/Exact", READ.first, WRITE.first + FILLS.first},
            {"Over", A2 + "/Over", READ.first, WRITE.first + TOO_LONG.first + SHORT.first},
            {"Whole", A2 + "/Whole", at_list_end(12787)}, {"Cut", A2 + "/Cut", at_list_end(12788)}}),
     {{CONF, HEADER + section("Exact", "On", authenticated(READ.second + WRITE.second + FILLS.second, WRITE.second + FILLS.second)) +
                 section("Over", "On", authenticated(READ.second + WRITE.second, WRITE.second + TOO_LONG.second + SHORT.second)) +
                 section("Whole", "On", authenticated("alpha omega ", "")) + section("Cut", "On", authenticated("alpha ", ""))}}},
    {"names that would break the configuration get only a note line",
     usb("ctl\x1fname = USB1\n", on_a2({open_share("say \"hi\"", "n1"), open_share("back\\slash", "n2"),
                                        open_share("new\nline", "n3"), open_share("del\x7f", "n4"),
                                        open_share("caf\xc3\xa9 & #1", "n5"), open_share("R&amp;D", "RD")})),
     {{CONF, HEADER + section("caf\xc3\xa9 & #1", "On", OPEN) + section("R&D", "On", OPEN)}, {LINKS + "/", "R&D caf\xc3\xa9 & #1"},
      {NOTE, "say \"hi\"\nback\\slash\nnew\nline\ndel\x7f\ncaf\xc3\xa9 & #1\nR&D\nctl\x1fname\n"}}},
    {"names and paths never reach a shell; only a name with a '/' gets no link",
     on_a2({open_share("x|/tmp/payload.sh", "x1"), open_share("Q", "q|/tmp/payload.sh"), open_share(NEUTRALISED, "x2"),
            open_share("../../../../etc/evil", "x3"), open_share("Semi", "s;touch"), open_share("NL", "nl\nx")},
           [](Appliance &box) {
               box.write("/tmp/payload.sh", "#!/bin/sh\ntouch /pwned\n", 0755);
               box.mount_usb("USB1"), box.mount_usb("USB2;touch${IFS}pwned6");
               box.write("/etc/shared_name", "x;touch${IFS}/pwned5 = USB1\nevil2 = USB2;touch${IFS}pwned6\n");
           }),
     {{"/pwned", GONE}, {"/pwned5", GONE}, {"/pwned6", GONE}, {"/pwned7", GONE}, {"/pwned8", GONE}, {"/nl", GONE},
      {"/s", GONE}, {"/etc/evil", GONE}, {LINKS + "/", "NL Q Semi evil2 " + NEUTRALISED},
      {LINKS + "/Semi", "-> " + A2 + "/s;touch"}, {LINKS + "/evil2", "-> /mnt/USB/USB2;touch${IFS}pwned6"}}},
    {"a left-over /tmp/dav.conf is never placed",
     on_a2({PUBLIC}, [](Appliance &box) { box.write("/tmp/dav.conf", "ErrorLog \"|/bin/sh -c id\"\n"); }),
     {{CONF, PUBLIC_CONF}, {LINKS + "/", "Public"}, {"/tmp/dav.conf", "ErrorLog \"|/bin/sh -c id\"\n"}}},
    {"only marked, mounted USB volumes, named by the first line that holds the folder's name",
     usb("ten = USB10\none = USB1\nusbdisk3 = USB3\nusbdisk4 = USB4\n", [](Appliance &box) {
         box.mount_usb("USB3", false);
         box.write("/mnt/USB/USB4/.davconf", "ON"), box.write("/mnt/USB/plain", "");
     }),
     {{CONF, PUBLIC_CONF + section("ten", "On", OPEN)}, {NOTE, "Public\nten\n"}, {LINKS + "/ten", "-> /mnt/USB/USB1"}}},
    {"USB rules from the first named share; words after the folder", usb("usbdisk1 = USB1 and more\n", [](Appliance &box) {
         box.write("/mnt/USB/USB1/.smbm.xml", catalogue_xml({{"first", "/mnt/USB/USB1", "#alice#", "#bob#", "", "", "0"},
                                                              {"second", "/mnt/USB/USB1", "", "", "", "yes", "1"}}));
     }),
     {{CONF, PUBLIC_CONF + section("usbdisk1", "On", authenticated("alice bob ", "bob "))}}},
    {"USB rules unreadable; a last line without newline",
     usb("other = USB7\nlast = USB1", [](Appliance &box) { box.write("/mnt/USB/USB1/.smbm.xml", "no"); }),
     {{CONF, PUBLIC_CONF + section("last", "On", authenticated("", ""))}}},
    {"a USB name once, always on, a note line per volume", usb("same = USB1\nsame = USB2\n", [](Appliance &box) {
         box.mount_usb("USB2"), box.set_config(ENABLE, "0");
     }),
     {{CONF, HEADER + section("Public", "Off", OPEN) + section("same", "On", OPEN)}, {NOTE, "Public\nsame\nsame\n"},
      {LINKS + "/", "same"}},
     {"start"}, {"stop dav"}},
    {"the name of an entry share", usb("Public = USB1\n"),
     {{CONF, PUBLIC_CONF}, {NOTE, "Public\nPublic\n"}, {LINKS + "/Public", "-> " + A2 + "/Public"}}},
    {"no line names the folder", usb("other = USB7\n"), {{CONF, PUBLIC_CONF}, {NOTE, "Public\n\n"}}},
};

class ConfigurationAndSafety : public testing::TestWithParam<Row> {};
TEST_P(ConfigurationAndSafety, LeaveExactlyTheseFiles) { check(GetParam(), accounts); }
INSTANTIATE_TEST_SUITE_P(Rows, ConfigurationAndSafety, testing::ValuesIn(ROWS));

}  // namespace
