// Only what the installed binary cannot show: nothing in the tool escapes
// for the shell any more or calls the exported itoa.
#include <gtest/gtest.h>

#include <string>

#include "output/shell_escape.h"

extern "C" char *itoa(int value);

TEST(EscapeForShell, TakesFiveHundredTwelveCharactersAndRefusesMore) {
    std::string out(2048, '\0');
    EXPECT_EQ(escape_for_shell(std::string(512, ';').c_str(), &out[0], 1025), 0);
    EXPECT_EQ(std::string(out.c_str()).size(), 1024u);
    EXPECT_EQ(escape_for_shell(std::string(512, ';').c_str(), &out[0], 1024), -1);
    testing::internal::CaptureStdout();
    EXPECT_EQ(escape_for_shell(std::string(513, 'a').c_str(), &out[0], out.size()), -1);
    EXPECT_EQ(testing::internal::GetCapturedStdout(), "Can't process string lenghth bigger than 512.\n");
}

TEST(Itoa, FormatsSignedDecimal) { EXPECT_STREQ(itoa(-2147483647 - 1), "-2147483648"); }
