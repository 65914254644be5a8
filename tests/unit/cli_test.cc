#include <climits>
#include <cstring>
#include <gtest/gtest.h>
#include <string>

#include "cli/decode.h"

extern "C" char *itoa(int value);

namespace {

std::string decode(const std::string &text) {
    char out[DECODE_WORK_WIDTH + 8];
    memset(out, 0, sizeof out);
    EXPECT_EQ(decode_special_char(text.c_str(), out), 0);
    return out;
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

    char out[DECODE_WORK_WIDTH + 8] = {};
    EXPECT_EQ(decode_argument(fits.c_str(), out), 0);
    memset(out, 0, sizeof out);
    EXPECT_EQ(decode_argument(longer.c_str(), out), -1);
    EXPECT_EQ(out[DECODE_WORK_WIDTH - 1], '\0');
    // Entities shrink the text, so a long raw argument may still fit whole.
    std::string shrinking;
    for (int i = 0; i < 300; ++i) shrinking += "&amp;";
    EXPECT_EQ(decode_argument(shrinking.c_str(), out), 0);
}

TEST(Itoa, FormatsSignedDecimal) {
    EXPECT_STREQ(itoa(0), "0");
    EXPECT_STREQ(itoa(-42), "-42");
    EXPECT_STREQ(itoa(INT_MAX), "2147483647");
    EXPECT_STREQ(itoa(INT_MIN), "-2147483648");
}
