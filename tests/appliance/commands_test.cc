// do, merge, del, du and chg through the installed binary.
#include <algorithm>

#include "appliance/fixture.h"

using namespace fixture;

namespace {

// The lists as the realistic appliance has them: not rewritten.
const Files UNTOUCHED = {{list_of(A2), share_list_xml(7, A2_ITEMS)}, {list_of(B2), share_list_xml(7, B2_ITEMS)},
                         {list_of(D2), share_list_xml(7, D2_ITEMS)}, {list_of(A2, ISO), share_list_xml(7, ISO_ITEMS)}};
Files untouched_but(const Files &changed) {
    Files files = changed;
    for (const auto &list : UNTOUCHED)
        if (std::none_of(changed.begin(), changed.end(), [&](const auto &file) { return file.first == list.first; }))
            files.push_back(list);
    return files;
}

const Words DO = {"do", "/tmp/input.xml"};
const auto WHOLE_VOLUME = with({{"Whole", A2 + "/", "", "", "", "yes"}}, {}, [](Appliance &box) {
    box.write_list(A2, {{"Public", "/Public"}, {"Music", "/Music", 0, 1}, {"Whole", "/"}}, 7);
});

const Row ROWS[] = {
    {"do inserts in front of its volume, marks USB folders, rewrites only what it touched",
     with({open_share(B2 + "/New1"), open_share(B2 + "/New2")},
          {{"Photos", A2 + "/Photos", 0, 1}, {"ignored", "/mnt/USB/USB2", 1, 0}, {"New1", B2 + "/New1"}, {"New2", B2 + "/New2"},
           {"Nowhere", A2 + "/Nowhere"}},
          [](Appliance &box) { box.make_dir("/mnt/USB/USB2"); }),
     untouched_but({{list_of(A2), share_list_xml(1, {{"Photos", "/Photos", 0, 1}, {"Public", "/Public"}, {"Music", "/Music", 0, 1}})},
                    {list_of(B2), share_list_xml(1, {{"New2", "/New2"}, {"New1", "/New1"}, {"Backup", "/Backup", 1, 0}})},
                    {"/mnt/USB/USB2/.davconf", "ON"}, {"/mnt/USB/USB2/.system_data", GONE},
                    {NOTE, "Photos\nPublic\nMusic\nNew2\nNew1\nBackup\nDocs\nDisc\nusbdisk1\n"},
                    {LINKS + "/Photos", "-> " + A2 + "/Photos"}, {"/tmp/corvane.node", GONE}}),
     DO},
    {"merge keeps RW", with({}, {{"Music", A2 + "/Music", 1, 0}}),
     untouched_but({{list_of(A2), share_list_xml(1, {{"Public", "/Public"}, {"Music", "/Music", 0, 0}})}}),
     {"merge", "/tmp/input.xml"}},
    {"do a volume root with WebDAV off",
     with({{"Volume", A2 + "/", "", "", "", "yes"}}, {{"Volume", A2}}, [](Appliance &box) { box.set_config(ENABLE, "0"); }),
     {{list_of(A2), share_list_xml(0, {{"Volume", "/"}, {"Public", "/Public"}, {"Music", "/Music", 0, 1}})}}, DO,
     {"stop dav"}},
    {"do with a broken input file", [](Appliance &box) { box.write("/tmp/input.xml", "<config><WebDAV><item>"); },
     untouched_but({{CONF, GONE}, {"/tmp/corvane.node", GONE}}), DO, {}, 0,
     {"do: the input is no share list: /tmp/input.xml; nothing was changed"}},
    {"del with a trailing slash", WHOLE_VOLUME,
     untouched_but({{list_of(A2), share_list_xml(1, {{"Public", "/Public"}, {"Whole", "/"}})}}), {"del", A2 + "/Music/"}},
    {"del of a volume root", WHOLE_VOLUME,
     {{list_of(A2), share_list_xml(1, {{"Public", "/Public"}, {"Music", "/Music", 0, 1}})}}, {"del", A2}},
    {"del of an unknown path", nullptr, untouched_but({{CONF, GONE}}), {"del", A2 + "/Pub"}, {}, 0,
     {"del: no share is published at /mnt/HD/HD_a2/Pub; nothing was changed"}},
    {"del of the only entry empties the list",
     [](Appliance &box) {
         box.write("/etc/mtab", "/dev/sda4 " + A2 + " ext4 rw 0 0\n");
         box.remove(list_of(A2, ISO));
         box.write_list(A2, {{"Public", "/Public"}}, 7);
         box.set_config(ENABLE, "0");
     },
     {{list_of(A2), share_list_xml(0, {})}}, {"del", A2 + "/Public"}, {"stop dav"}},
    {"del of a USB folder removes its marker only", [](Appliance &box) { box.plant_link("/mnt/USB/USB1", LINKS + "/usbdisk1"); },
     untouched_but({{"/mnt/USB/USB1/.davconf", GONE}, {NOTE, "Public\nMusic\nBackup\nDocs\nDisc\n"},
                    {LINKS + "/usbdisk1", GONE}}),
     {"del", "/mnt/USB/USB1/"}},
    {"du realigns every list with the catalogue",
     [](Appliance &box) {
         std::vector<Share> shares = realistic_shares();
         shares[0].name = "Shared";
         box.set_catalogue(shares), box.set_config(ENABLE, "0");
     },
     {{list_of(A2), share_list_xml(0, {{"Music", "/Music", 0, 1}})}, {list_of(B2), share_list_xml(0, B2_ITEMS)},
      {list_of(D2), share_list_xml(0, D2_ITEMS)}, {list_of(B2, ISO), share_list_xml(0, ISO_ITEMS)}},
     {"du", "alice"}, {"stop dav"}},
    {"chg moves what lies below the old folder, not its siblings",
     with({open_share(A2 + "/Songs"), open_share(A2 + "/Musix")}, {}, [](Appliance &box) {
         box.make_dir(A2 + "/Musical");
         box.write_list(A2, {{"Public", "/Public"}, {"Music", "/Music", 0, 1}, {"Musical", "/Musical", 1, 0},
                             {"Musix", "/Musix"}}, 7);
     }),
     {{list_of(A2), share_list_xml(1, {{"Public", "/Public"}, {"Songs", "/Songs", 0, 1}, {"Songs", "/Songs", 1, 0},
                                       {"Musix", "/Musix"}})},
      {list_of(D2), share_list_xml(1, D2_ITEMS)}},
     {"chg", A2 + "/Music", A2 + "/Songs"}},
    {"chg re-points the link of a name with a dot; stale dot names go",
     with({{".pub", A2 + "/Music", "", "", "", "yes"}, {".pub", A2 + "/Songs", "", "", "", "yes"}}, {}, [](Appliance &box) {
         box.write_list(A2, {{".pub", "/Music"}}, 7);
         box.plant_link(A2 + "/Music", LINKS + "/.pub"), box.plant_link("/etc", LINKS + "/.old");
     }),
     {{LINKS + "/.pub", "-> " + A2 + "/Songs"}, {LINKS + "/.old", GONE}}, {"chg", A2 + "/Music", A2 + "/Songs"}},
    {"chg of a folder that is gone moves nothing",
     with({open_share(A2 + "/Songs")}, {}, [](Appliance &box) { box.remove(A2 + "/Public"); }),
     {{list_of(A2), share_list_xml(1, {{"Music", "/Music", 0, 1}})}}, {"chg", A2 + "/Public", A2 + "/Songs"}},
};

class EditingCommands : public testing::TestWithParam<Row> {};
TEST_P(EditingCommands, LeaveExactlyTheseFiles) { check(GetParam(), realistic); }
INSTANTIATE_TEST_SUITE_P(Rows, EditingCommands, testing::ValuesIn(ROWS));

}  // namespace
