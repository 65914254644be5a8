// The command front end seen from outside, and the harness itself.
#include <csignal>
#include <filesystem>

#include "appliance/fixture.h"

using namespace fixture;

namespace {

const char USAGE[] =
    "Error usage.\nPlease give me :\n\t\"do    \" - add config from xml info.\n"
    "\t\"del   \" - delete setting by xml info.\n\t\"du    \" - delete user from xml info.\n"
    "\t\"get   \" - get share volume.\n\t\"merge \" - merge webdav setting from xml info.\n"
    "\t\"start \" - merge config and restart lighty.\n\t\"stop  \" - stop webdav function.\n"
    "\t\"p2pen \" - start p2p webdav share.\n\t\"amulen\" - start amule webdav share.\n"
    "\t\"chg\"    - change folder real link.\n";

struct Call { Words words; int status; bool usage; Words server_calls; };

const std::string x1023(1023, 'x'), x1024(1024, 'x'), x12797(12797, 'x'), x12798(12798, 'x');

// Word counts, prefixes, and the widths of decoded and "#user#" arguments.
const Call CALLS[] = {
    {{}, 255, true}, {{"frobnicate"}, 255, true}, {{"START"}, 255, true}, {{""}, 255, true},
    {{"get"}, 255, true}, {{"get", "a", "b"}, 255, true}, {{"du"}, 255, true}, {{"du", "a", "b"}, 255, true},
    {{"del"}, 255, true}, {{"deluser", "a", "b"}, 255, true}, {{"stop", "now"}, 255, true},
    {{"reset", "all"}, 255, true}, {{"do"}, 255, true}, {{"merge", "a", "b"}, 255, true},
    {{"p2pen", "x"}, 255, true}, {{"amulen", "x"}, 255, true}, {{"chg", "/a"}, 255, true},
    {{"chg", "/a", "/b", "/c"}, 255, true}, {{"chgx", "/a", "/b"}, 255, true},
    {{"get", x1024}, 255, true}, {{"del", x12798 + "xx"}, 255, true}, {{"du", x12798}, 255, true},
    {{"gu"}, 0, false}, {{"guest", "a", "b", "c"}, 0, false}, {{"reset"}, 0, false},
    {{"do", "/tmp/none.xml"}, 255, false}, {{"merge", "/tmp/none.xml"}, 255, false},
    {{"get", x1023}, 0, false}, {{"du", x12797}, 0, false, {"restart dav"}},
    {{"start", "x", "y"}, 0, false, {"restart dav"}}, {{"starter"}, 0, false, {"restart dav"}},
};

TEST(FrontEnd, WordsDecideWhatRuns) {
    Appliance box;
    realistic(box);
    for (const Call &call : CALLS) {
        SCOPED_TRACE(testing::PrintToString(call.words).substr(0, 60));
        box.remove("/var/log/apache_calls");
        RunResult run = box.run(call.words);
        EXPECT_EQ(run.status, call.status) << run.err;
        EXPECT_EQ(run.out + run.err, call.usage ? USAGE : "");
        EXPECT_EQ(box.apache_calls(), call.server_calls);
    }
}

// Also what later tests rely on: a full tmpfs, a planted FIFO, a run killed with its shells.
TEST(Harness, IsolatesEachRunAndLeavesNothingBehind) {
    std::string root;
    {
        Appliance box;
        root = box.host("");
        EXPECT_EQ(box.run({}, {{}, 0, "/usr/bin/env"}).out,
                  "PATH=/opt/bin:/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin\n");
        box.plant_fifo("/tmp/fifo");
        RunResult sh = box.run({"-c", "test -p /tmp/fifo && touch /usr/bin/x; yes | head -c 99999 > /tmp/x"},
                               {{{"/tmp", "16k"}}, 0, "/bin/sh"});
        EXPECT_NE(sh.err.find("Read-only file system"), std::string::npos) << sh.err;
        EXPECT_NE(sh.err.find("No space left on device"), std::string::npos) << sh.err;
        EXPECT_EQ(box.run({"-c", "sleep 9 & sleep 9"}, {{}, 300, "/bin/sh"}).status, 128 + SIGKILL);
    }
    EXPECT_FALSE(std::filesystem::exists(root));
}

}  // namespace
