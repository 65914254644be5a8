// Expansion of access list texts into user names. Real groups are looked up
// in the appliance tests, whose root has its own group file.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "access/user_list.h"

namespace {

using Names = std::vector<std::string>;

// The names of an expanded list; fails unless it ends with one open slot and
// the caller's text is left as it was.
Names expand(const std::string &original) {
    std::string text = original;
    NameNode *head = nullptr;
    EXPECT_EQ(expand_user_list(text.c_str(), &head), 0);
    EXPECT_EQ(text, original);
    Names names;
    for (const NameNode *node = head; node != nullptr; node = node->next) {
        if (node->next == nullptr)
            EXPECT_STREQ(node->name, "") << "the list must end with the open slot";
        else
            names.push_back(node->name);
    }
    free_name_list(head);
    return names;
}

TEST(ExpandUserList, TokenRulesUserEntriesAndNameWidth) {
    const std::string fits(63, 'a'), too_long(64, 'b');
    struct { std::string text; Names names; } cases[] = {
        {"#alice#,#bob#", {"alice", "bob"}},
        {"alice,bob", {"alice", "bob"}},
        {"#alice##bob#", {"alice", "bob"}},
        {"#Mary Ann#,#BOB#", {"Mary Ann", "BOB"}},
        {"#nosuchuser#", {"nosuchuser"}},
        {"", {}},
        {",,##,#", {}},
        {"#@allaccount#,#@allaccount#", {"All Account", "All Account"}},
        {"#allaccount#", {"allaccount"}},
        {"#alice#,#@no-such-group-here#,#bob#", {"alice", "bob"}},
        {"#@#", {}},
        {"#" + fits + "#,#" + too_long + "#,#carol#,#@" + std::string(200, 'g') + "#", {fits, "carol"}},
    };
    for (const auto &c : cases) EXPECT_EQ(expand(c.text), c.names) << c.text;
}

TEST(ExpandUserList, OverlongTextStopsBeforeTheNameItWouldCut) {
    // "#x#" and then eight-character entries: the working copy ends four
    // characters into entry 1599.
    std::string text = "#x#";
    for (int i = 0; i < 1700; ++i) {
        char entry[16];
        snprintf(entry, sizeof entry, "#u%05d#", i);
        text += entry;
    }
    Names names = expand(text);
    ASSERT_EQ(names.size(), 1600u);
    EXPECT_EQ(names.front(), "x");
    EXPECT_EQ(names.back(), "u01598");
}

TEST(GetGroupMembers, UnknownGroupGivesOneEmptyNode) {
    NameNode *members = nullptr;
    ASSERT_EQ(get_group_members("no-such-group-here", &members), 0);
    ASSERT_NE(members, nullptr);
    EXPECT_STREQ(members->name, "");
    EXPECT_EQ(members->next, nullptr);
    free_name_list(members);
}

}  // namespace
