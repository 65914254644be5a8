#include <cstdlib>
#include <cstring>
#include <fstream>
#include <gtest/gtest.h>
#include <string>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include "platform/apkg_lib.h"
#include "platform/smb_strtok.h"
#include "platform/volume_lib.h"

namespace {

std::vector<std::string> tokens(std::string text, const char *delimiters) {
    std::vector<std::string> found;
    for (char *token = smb_strtok(&text[0], delimiters); token != nullptr;
         token = smb_strtok(nullptr, delimiters))
        found.push_back(token);
    return found;
}

std::string slurp(const std::string &path) {
    std::ifstream in(path);
    return std::string(std::istreambuf_iterator<char>(in), {});
}

}  // namespace

TEST(SmbStrtok, BehavesAsStrtok) {
    using V = std::vector<std::string>;
    EXPECT_EQ(tokens("#alice#,#bob#", "#,"), (V{"alice", "bob"}));
    EXPECT_EQ(tokens("alice,bob", "#,"), (V{"alice", "bob"}));
    EXPECT_EQ(tokens("##,,", "#,"), V{});
    EXPECT_EQ(tokens("", "#,"), V{});
    EXPECT_EQ(tokens("#a b#,#@staff#", "#,"), (V{"a b", "@staff"}));
    EXPECT_EQ(smb_strtok(nullptr, "#,"), nullptr);  // exhausted stays exhausted
}

TEST(VolumeLibrary, StoresAtomicallyWhereItLocates) {
    char folder[] = "/tmp/volume_lib_test.XXXXXX";
    ASSERT_NE(mkdtemp(folder), nullptr);
    std::string volume = folder;
    std::string source = volume + "/lighty.xml";
    std::ofstream(source) << "first";

    ASSERT_EQ(saveDataToHiddenByVolume(source.c_str(), volume.c_str()), 0);
    char *location = getDataLocationByVolume("lighty.xml", volume.c_str());
    EXPECT_EQ(std::string(location), volume + "/.system_data/lighty.xml");
    EXPECT_EQ(slurp(location), "first");
    struct stat status;
    ASSERT_EQ(stat((volume + "/.system_data").c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0755u);

    std::ofstream(source) << "second";
    EXPECT_EQ(saveDataToHiddenByVolume(source.c_str(), volume.c_str()), 0);
    EXPECT_EQ(slurp(location), "second");
    EXPECT_EQ(saveDataToHiddenByVolume((volume + "/missing").c_str(), volume.c_str()), -1);
    EXPECT_EQ(slurp(location), "second");
    free(location);
    EXPECT_EQ(system(("rm -rf " + volume).c_str()), 0);
}

TEST(PackageLibrary, FindsProcessesByCommandNameAndFreesItsList) {
    char own[32] = {};
    prctl(PR_GET_NAME, own);
    EXPECT_EQ(LIB_Check_ps(own), 1);
    EXPECT_EQ(LIB_Check_ps("no-such-process"), 0);
    EXPECT_EQ(APKG_COMMAND(1, 0), 0);
    // Without /etc/NAS_CFG/apkg.xml the list is a header with no first record.
    if (access("/etc/NAS_CFG/apkg.xml", F_OK) != 0) {
        ASSERT_EQ(APKG_ReadAllXml(), 0);
        ASSERT_NE(p_lib_list, nullptr);
        void *first = reinterpret_cast<void *>(1);
        memcpy(&first, static_cast<char *>(p_lib_list) + APKG_HEADER_FIRST, sizeof first);
        EXPECT_EQ(first, nullptr);
    }
    APKG_FreeAllXml();
    EXPECT_EQ(p_lib_list, nullptr);
}
