// Only what the installed binary cannot show: nothing in the tool escapes
// for the shell any more or calls the exported itoa, and the tool ignores
// what the volume library answers.
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>

#include "output/shell_escape.h"
#include "platform/volume_lib.h"

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

TEST(VolumeLibrary, SaysWhetherTheCopyWasStored) {
    char volume[] = "/tmp/volume_lib_test.XXXXXX";
    ASSERT_NE(mkdtemp(volume), nullptr);
    std::ofstream(std::string(volume) + "/lighty.xml") << "list";
    EXPECT_EQ(saveDataToHiddenByVolume((std::string(volume) + "/lighty.xml").c_str(), volume), 0);
    EXPECT_EQ(saveDataToHiddenByVolume((std::string(volume) + "/missing.xml").c_str(), volume), -1);
    std::filesystem::remove_all(volume);
}
