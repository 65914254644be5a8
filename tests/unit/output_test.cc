// Shell escaping.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "output/shell_escape.h"

namespace {

std::string escaped(const std::string &text) {
    std::string out(2 * text.size() + 1, '\0');
    EXPECT_EQ(escape_for_shell(text.c_str(), &out[0], out.size()), 0);
    return out.c_str();
}

TEST(EscapeForShell, BackslashBeforeEachOfTheNineteenOnly) {
    const std::string specials = " #$%&'()+;<=>[]^`{}";
    ASSERT_EQ(specials.size(), 19u);
    std::string every_byte, expected;
    for (int byte = 1; byte < 256; ++byte) {
        char c = static_cast<char>(byte);
        every_byte += c;
        if (specials.find(c) != std::string::npos) expected += '\\';
        expected += c;
    }
    EXPECT_EQ(escaped(every_byte), expected);
}

TEST(EscapeForShell, AcceptsFiveHundredTwelveAndRefusesMore) {
    std::string expected;
    for (int i = 0; i < 512; ++i) expected += "\\ ";
    EXPECT_EQ(escaped(std::string(512, ' ')), expected);

    char out[2048];
    memset(out, 'z', sizeof out);
    testing::internal::CaptureStdout();
    EXPECT_EQ(escape_for_shell(std::string(513, 'a').c_str(), out, sizeof out), -1);
    EXPECT_EQ(testing::internal::GetCapturedStdout(),
              "Can't process string lenghth bigger than 512.\n");
    EXPECT_EQ(std::string(out, sizeof out), std::string(sizeof out, 'z'));
}

TEST(EscapeForShell, RefusesAResultThatDoesNotFitItsBuffer) {
    char out[4] = {'z', 'z', 'z', 'z'};
    EXPECT_EQ(escape_for_shell("a b", out, sizeof out), -1);
    EXPECT_EQ(std::string(out, sizeof out), "zzzz");
    EXPECT_EQ(escape_for_shell("a;", out, sizeof out), 0);
    EXPECT_STREQ(out, "a\\;");
}

}  // namespace
