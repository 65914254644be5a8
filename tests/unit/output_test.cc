// Shell escaping and the two tests that decide whether a command line built
// from share data may run at all.
#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "output/shell_escape.h"

namespace {

std::string escaped(const std::string &text) {
    std::string out(2 * text.size() + 1, '\0');
    EXPECT_EQ(escape_for_shell(text.c_str(), &out[0]), 0);
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
    EXPECT_EQ(escape_for_shell(std::string(513, 'a').c_str(), out), -1);
    EXPECT_EQ(testing::internal::GetCapturedStdout(),
              "Can't process string lenghth bigger than 512.\n");
    EXPECT_EQ(std::string(out, sizeof out), std::string(sizeof out, 'z'));
}

TEST(IsShellSafeEscaped, AcceptsOnlyWhatEscapingNeutralised) {
    for (const char *text : {"/mnt/HD/HD_a2/My Share", "a;b&c$(d)`e`", "caf\xc3\xa9 #1 {x}",
                             "x,y:z@w.-_/", ""})
        EXPECT_TRUE(is_shell_safe_escaped(escaped(text).c_str())) << text;
    for (const char *text : {"x\"y", "x\\;touch /pwned", "x|touch /pwned", "a*", "a?", "!a",
                             "~root", "a\nb", "a\tb", "a\x01", "a\x1f", "a\x7f"})
        EXPECT_FALSE(is_shell_safe_escaped(escaped(text).c_str())) << text;
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
