#include <climits>
#include <cstring>
#include <gtest/gtest.h>
#include <string>
#include <vector>

#include "cli/decode.h"

extern "C" char *itoa(int value);

namespace {

// Exactly as wide as the work area and on the heap, so a write past it trips
// the address sanitizer.
std::string decode(const std::string &text) {
    std::vector<char> out(DECODE_WORK_WIDTH, '\0');
    EXPECT_EQ(decode_special_char(text.c_str(), out.data()), 0);
    return out.data();
}

}  // namespace

TEST(DecodeSpecialChar, DecodesTheFiveEntitiesInOnePass) {
    const struct {
        const char *in;
        const char *out;
    } cases[] = {
        {"", ""},
        {"a&amp;b", "a&b"},
        {"&lt;tag&gt;", "<tag>"},
        {"x&nbsp;y", "x y"},
        {"&quot;q&quot;", "\"q\""},
        {"&amp;lt;", "&lt;"},
        {"&amp;amp;", "&amp;"},
        {"&apos;&#38;&AMP;&Lt;", "&apos;&#38;&AMP;&Lt;"},
        {"&am", "&am"},
        {"end&", "end&"},
        {"&&amp;", "&&"},
        {"&g&gt;", "&g>"},
        {"/mnt/HD/HD_a2/A&amp;B", "/mnt/HD/HD_a2/A&B"},
    };
    for (const auto &c : cases) EXPECT_EQ(decode(c.in), c.out) << c.in;
}

TEST(DecodeSpecialChar, CutsAtTheWorkAreaAndSaysSo) {
    std::string fits(DECODE_WORK_WIDTH - 1, 'a');
    std::string longer = fits + "&amp;";
    EXPECT_EQ(decode(longer), fits);

    std::vector<char> out(DECODE_WORK_WIDTH, '\0');
    EXPECT_EQ(decode_argument(fits.c_str(), out.data()), 0);
    EXPECT_EQ(decode_argument(longer.c_str(), out.data()), -1);
    // Entities shrink the text, so a long raw argument may still fit whole.
    std::string shrinking;
    for (int i = 0; i < 300; ++i) shrinking += "&amp;";
    EXPECT_EQ(decode_argument(shrinking.c_str(), out.data()), 0);
}

TEST(Itoa, FormatsSignedDecimalIntoOneZeroFilledBuffer) {
    char *text = itoa(INT_MIN);
    EXPECT_STREQ(text, "-2147483648");
    EXPECT_EQ(itoa(7), text);
    EXPECT_EQ(std::string(text, 32), "7" + std::string(31, '\0'));
    EXPECT_STREQ(itoa(0), "0");
    EXPECT_STREQ(itoa(-42), "-42");
    EXPECT_STREQ(itoa(INT_MAX), "2147483647");
}
