// Shell escaping and the two tests that decide whether a command line built
// from share data may run at all.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "output/shell_escape.h"

namespace {

const std::string SPECIALS = " #$%&'()+;<=>[]^`{}";

std::string escaped(const std::string &text) {
    std::string out(2 * text.size() + 1, '\0');
    EXPECT_EQ(escape_for_shell(text.c_str(), &out[0]), 0);
    return out.c_str();
}

TEST(EscapeForShell, BackslashBeforeEachOfTheNineteen) {
    ASSERT_EQ(SPECIALS.size(), 19u);
    for (char c : SPECIALS) {
        SCOPED_TRACE(std::string(1, c));
        EXPECT_EQ(escaped(std::string("a") + c + "b"), std::string("a\\") + c + "b");
    }
    EXPECT_EQ(escaped("My Share (2)"), "My\\ Share\\ \\(2\\)");
}

TEST(EscapeForShell, EveryOtherByteIsCopiedUnchanged) {
    std::string others;
    for (int byte = 1; byte < 256; ++byte)
        if (SPECIALS.find(static_cast<char>(byte)) == std::string::npos)
            others += static_cast<char>(byte);
    EXPECT_EQ(escaped(others), others);
}

TEST(EscapeForShell, AcceptsFiveHundredTwelveAndRefusesMore) {
    std::string longest(512, ' ');
    std::string expected;
    for (int i = 0; i < 512; ++i) expected += "\\ ";
    EXPECT_EQ(escaped(longest), expected);

    char out[2048];
    memset(out, 'z', sizeof out);
    testing::internal::CaptureStdout();
    EXPECT_EQ(escape_for_shell(std::string(513, 'a').c_str(), out), -1);
    EXPECT_EQ(testing::internal::GetCapturedStdout(),
              "Can't process string lenghth bigger than 512.\n");
    EXPECT_EQ(std::string(out, sizeof out), std::string(sizeof out, 'z'));
}

TEST(IsShellSafeEscaped, AcceptsWhatEscapingNeutralised) {
    for (const char *text : {"/mnt/HD/HD_a2/My Share", "a;b&c$(d)`e`", "caf\xc3\xa9 #1 {x}",
                             "x,y:z@w.-_/", ""}) {
        SCOPED_TRACE(text);
        EXPECT_TRUE(is_shell_safe_escaped(escaped(text).c_str()));
    }
}

TEST(IsShellSafeEscaped, RefusesWhatTheShellStillInterprets) {
    for (const char *text : {"x\"y", "x\\;touch /pwned", "x|touch /pwned", "a*", "a?", "!a",
                             "~root", "a\nb", "a\tb", "a\x01", "a\x1f", "a\x7f"}) {
        SCOPED_TRACE(text);
        EXPECT_FALSE(is_shell_safe_escaped(escaped(text).c_str()));
    }
    // Texts that never went through the escaping.
    for (const char *raw : {"a;b", "a b", "a\\", "a\\b"})
        EXPECT_FALSE(is_shell_safe_escaped(raw)) << raw;
}

TEST(IsShellLiteral, OnlyCharactersTheShellTakesAsThemselves) {
    for (const char *text : {"/mnt/USB/USB1", "usb_disk-1.a+b,c:d@e%f", "Fotos\xc3\xa4", ""})
        EXPECT_TRUE(is_shell_literal(text)) << text;
    for (const char *text : {"a b", "a;b", "a|b", "a&b", "$x", "`x`", "a'b", "a\"b", "a\\b",
                             "a*", "a?", "a!", "~a", "a#b", "a=b", "(a)", "{a}", "[a]", "a<b",
                             "a>b", "a^b", "a\nb", "a\x7f"})
        EXPECT_FALSE(is_shell_literal(text)) << text;
}

}  // namespace
