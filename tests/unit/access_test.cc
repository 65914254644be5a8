// Expansion of access list texts into user names. Real groups are looked up
// in the appliance tests, whose root has its own group file.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "access/user_list.h"

namespace {

// The names of an expanded list; fails unless it ends with one open slot.
std::vector<std::string> expand(const char *text) {
    NameNode *head = nullptr;
    EXPECT_EQ(expand_user_list(text, &head), 0);
    std::vector<std::string> names;
    for (const NameNode *node = head; node != nullptr; node = node->next) {
        if (node->next == nullptr)
            EXPECT_STREQ(node->name, "") << "the list must end with the open slot";
        else
            names.push_back(node->name);
    }
    free_name_list(head);
    return names;
}

using Names = std::vector<std::string>;

TEST(ExpandUserList, TokenRulesAndUserEntries) {
    struct Case {
        const char *text;
        Names names;
    } cases[] = {
        {"#alice#,#bob#", {"alice", "bob"}},
        {"alice,bob", {"alice", "bob"}},
        {"#alice##bob#", {"alice", "bob"}},
        {"#alice#,#alice#", {"alice", "alice"}},
        {"#Mary Ann#,#BOB#", {"Mary Ann", "BOB"}},
        {"#nosuchuser#", {"nosuchuser"}},
        {"", {}},
        {",,##,#", {}},
        {"#@allaccount#", {"All Account"}},
        {"#@allaccount#,#@allaccount#", {"All Account", "All Account"}},
        {"#allaccount#", {"allaccount"}},
        {"#alice#,#@no-such-group-here#,#bob#", {"alice", "bob"}},
        {"#@#", {}},
    };
    for (const Case &c : cases) {
        SCOPED_TRACE(c.text);
        EXPECT_EQ(expand(c.text), c.names);
    }
}

TEST(ExpandUserList, NamesTooLongForANodeAreLeftOut) {
    std::string fits(63, 'a');
    std::string too_long(64, 'b');
    std::string text = "#" + fits + "#,#" + too_long + "#,#carol#,#@" + std::string(200, 'g') + "#";
    EXPECT_EQ(expand(text.c_str()), (Names{fits, "carol"}));
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
    Names names = expand(text.c_str());
    ASSERT_EQ(names.size(), 1600u);
    EXPECT_EQ(names.front(), "x");
    EXPECT_EQ(names.back(), "u01598");
}

TEST(ExpandUserList, LeavesTheCallersTextAsItWas) {
    const std::string original = "#alice#,#@allaccount#,bob";
    std::vector<char> text(original.begin(), original.end());
    text.push_back('\0');
    expand(text.data());
    EXPECT_EQ(std::string(text.data()), original);
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
