// The command front end seen from outside: which calls are refused with the
// usage text, which run, which do nothing. Also checks the harness itself.
#include <gtest/gtest.h>

#include <string>
#include <sys/stat.h>
#include <vector>

#include "harness/appliance.h"

namespace {

using Words = std::vector<std::string>;

const char USAGE[] =
    "Error usage.\n"
    "Please give me :\n"
    "\t\"do    \" - add config from xml info.\n"
    "\t\"del   \" - delete setting by xml info.\n"
    "\t\"du    \" - delete user from xml info.\n"
    "\t\"get   \" - get share volume.\n"
    "\t\"merge \" - merge webdav setting from xml info.\n"
    "\t\"start \" - merge config and restart lighty.\n"
    "\t\"stop  \" - stop webdav function.\n"
    "\t\"p2pen \" - start p2p webdav share.\n"
    "\t\"amulen\" - start amule webdav share.\n"
    "\t\"chg\"    - change folder real link.\n";

std::string describe(const Words &words) {
    std::string text = "davsync";
    for (const std::string &word : words) text += " [" + word.substr(0, 40) + "]";
    return text;
}

class FrontEnd : public ::testing::Test {
protected:
    appliance::Appliance box;

    // One volume with one published share, so a command that runs is seen
    // by its server call.
    void SetUp() override {
        box.mount("/mnt/HD/HD_a2");
        box.make_dir("/mnt/HD/HD_a2/Public");
        box.set_catalogue({{"Public", "/mnt/HD/HD_a2/Public", "", "", "", "yes", ""}});
        box.write_share_list("/mnt/HD/HD_a2", {{"Public", "/Public", 1, 1}});
    }

    // Nothing ran: no server call, nothing left in /tmp, no configuration.
    void expect_untouched(const Words &words) {
        EXPECT_TRUE(box.apache_calls().empty()) << describe(words);
        EXPECT_TRUE(box.list_dir("/tmp").empty()) << describe(words);
        EXPECT_TRUE(box.list_dir("/usr/local/apache2_dav/conf/extra").empty()) << describe(words);
    }
};

TEST_F(FrontEnd, BadCallsPrintTheUsageAndExit255) {
    const std::string too_long(12800, 'a');
    const Words calls[] = {
        {},
        {"frobnicate"},
        {"START"},
        {""},
        {"get"}, {"get", "a", "b"},
        {"du"}, {"du", "a", "b"},
        {"del"}, {"deluser", "a", "b"},
        {"stop", "now"},
        {"reset", "all"},
        {"do"}, {"do", "a", "b"},
        {"merge"}, {"merge", "a", "b"},
        {"p2pen", "x"},
        {"amulen", "x"},
        {"chg"}, {"chg", "/a"}, {"chg", "/a", "/b", "/c"}, {"chgx", "/a", "/b"},
        {"get", too_long}, {"del", too_long}, {"du", too_long},
    };
    for (const Words &words : calls) {
        appliance::RunResult result = box.run(words);
        EXPECT_EQ(result.status, 255) << describe(words) << "\n" << result.err;
        EXPECT_EQ(result.out, USAGE) << describe(words);
        expect_untouched(words);
    }
}

// gu and reset alone do nothing; any word beginning with "start" runs start
// and the rest is ignored; do and merge of an unreadable file exit silently.
TEST_F(FrontEnd, CallsThatPrintNothing) {
    struct { Words words; int status; Words calls; } cases[] = {
        {{"gu"}, 0, {}}, {{"guest"}, 0, {}}, {{"gu", "a", "b", "c"}, 0, {}}, {{"reset"}, 0, {}},
        {{"do", "/tmp/no_such_list.xml"}, 255, {}}, {{"merge", "/tmp/no_such_list.xml"}, 255, {}},
        {{"start", "x", "y"}, 0, {"restart dav"}}, {{"starter"}, 0, {"restart dav"}},  // last: they write
    };
    for (const auto &c : cases) {
        box.remove("/var/log/apache_calls");
        appliance::RunResult result = box.run(c.words);
        EXPECT_EQ(result.status, c.status) << describe(c.words) << "\n" << result.err;
        EXPECT_EQ(result.out + result.err, "") << describe(c.words);
        if (c.calls.empty()) expect_untouched(c.words);
        else EXPECT_EQ(box.apache_calls(), c.calls) << describe(c.words);
    }
}

// The harness: a program sees PATH alone, and the root disappears with the
// Appliance while the host's /usr/local stays as it was.
TEST(Harness, RunsInsideTheRootAndCleansUp) {
    std::string root;
    {
        appliance::Appliance box;
        root = box.root();
        appliance::RunResult env = box.run_program("/usr/bin/env", {});
        EXPECT_EQ(env.out,
                  "PATH=/opt/recorder:/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin\n");

        appliance::RunResult write =
            box.run_program("/bin/sh", {"-c", "mkdir -p /usr/local/harness_probe && apache restart dav"});
        EXPECT_EQ(write.status, 0) << write.err;
        EXPECT_TRUE(box.exists("/usr/local/harness_probe"));
        EXPECT_EQ(box.apache_calls(), Words{"restart dav"});
        EXPECT_NE(box.run_program("/bin/sh", {"-c", "touch /usr/bin/harness_probe"}).status, 0);
    }
    struct stat st;
    EXPECT_NE(lstat(root.c_str(), &st), 0) << root << " left behind";
    EXPECT_NE(lstat("/usr/local/harness_probe", &st), 0);
    EXPECT_NE(lstat("/usr/bin/harness_probe", &st), 0);
}

}  // namespace
