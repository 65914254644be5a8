#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <dirent.h>
#include <fstream>
#include <gtest/gtest.h>
#include <string>
#include <sys/prctl.h>
#include <sys/stat.h>
#include <unistd.h>
#include <vector>

#include "platform/apkg_lib.h"
#include "platform/config_db.h"
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

std::vector<std::string> names_in(const std::string &folder) {
    std::vector<std::string> names;
    DIR *dir = opendir(folder.c_str());
    if (dir == nullptr) return names;
    while (struct dirent *entry = readdir(dir))
        if (entry->d_name[0] != '.') names.push_back(entry->d_name);
    closedir(dir);
    return names;
}

// A fresh folder under /tmp, removed with everything in it at the end.
struct TempFolder {
    std::string path;
    TempFolder() {
        char name[] = "/tmp/platform_test.XXXXXX";
        path = mkdtemp(name) != nullptr ? name : "";
    }
    ~TempFolder() {
        if (!path.empty()) {
            EXPECT_EQ(system(("rm -rf " + path).c_str()), 0);
        }
    }
    std::string write(const std::string &name, const std::string &content) const {
        std::ofstream(path + "/" + name) << content;
        return path + "/" + name;
    }
};

template <typename T> T read_at(const void *base, size_t offset) {
    T value;
    memcpy(&value, static_cast<const char *>(base) + offset, sizeof value);
    return value;
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

    char text[] = "#ab#,c";
    EXPECT_EQ(smb_strtok(text, "#,"), text + 1);
    EXPECT_EQ(text[3], '\0');  // cut in place
    EXPECT_STREQ(smb_strtok(nullptr, ","), "c");
}

TEST(VolumeLibrary, StoresAtomicallyWhereItLocates) {
    TempFolder volume;
    ASSERT_FALSE(volume.path.empty());
    std::string source = volume.write("lighty.xml", "first");
    std::string hidden = volume.path + "/.system_data";

    mode_t old_mask = umask(077);
    int stored = saveDataToHiddenByVolume(source.c_str(), volume.path.c_str());
    umask(old_mask);
    ASSERT_EQ(stored, 0);
    char *location = getDataLocationByVolume("lighty.xml", volume.path.c_str());
    EXPECT_EQ(std::string(location), hidden + "/lighty.xml");
    EXPECT_EQ(slurp(location), "first");
    struct stat status;
    ASSERT_EQ(stat(hidden.c_str(), &status), 0);
    EXPECT_EQ(status.st_mode & 07777, 0755u);

    volume.write("lighty.xml", "second");
    EXPECT_EQ(saveDataToHiddenByVolume(source.c_str(), volume.path.c_str()), 0);
    EXPECT_EQ(slurp(location), "second");
    EXPECT_EQ(saveDataToHiddenByVolume((volume.path + "/missing").c_str(), volume.path.c_str()), -1);
    EXPECT_EQ(slurp(location), "second");
    EXPECT_EQ(names_in(hidden), std::vector<std::string>{"lighty.xml"});  // no temporary left
    free(location);
}

TEST(ConfigDatabase, FindsTheFirstElementAlongTheSlashPath) {
    TempFolder folder;
    std::string db = folder.write("config_db.xml",
        "<config><system_mgr><webdav><enable> 1</enable></webdav><webdav><enable>0</enable>"
        "</webdav><samba><ads_enable>a&amp;b&lt;</ads_enable></samba></system_mgr>"
        "<download_mgr><p2p><enable>1</enable><port>-17x</port><empty/></p2p></download_mgr></config>");
    std::string broken = folder.write("broken.xml", "<config><system_mgr>");
    const struct {
        std::string file;
        const char *path;
        int size;
        int result;
        const char *value;
    } cases[] = {
        {db, "/system_mgr/webdav/enable", 8, 0, " 1"},  // first match, untrimmed
        {db, "/system_mgr/samba/ads_enable", 8, 0, "a&b<"},
        {db, "/system_mgr/samba/ads_enable", 3, 0, "a&"},
        {db, "/download_mgr/p2p/empty", 8, 0, ""},
        {db, "/download_mgr/p2p/none", 8, -1, "kept"},
        {db, "/system_mgr/enable", 8, -1, "kept"},
        {broken, "/system_mgr", 8, -1, "kept"},
        {folder.path + "/missing.xml", "/system_mgr/webdav/enable", 8, -1, "kept"},
    };
    for (const auto &c : cases) {
        char buf[16] = "kept";
        EXPECT_EQ(xml_get_str_in(c.file.c_str(), c.path, c.size, buf), c.result) << c.path;
        EXPECT_STREQ(buf, c.value) << c.path;
    }
    EXPECT_EQ(xml_get_int_in(db.c_str(), "/download_mgr/p2p/enable"), 1);
    EXPECT_EQ(xml_get_int_in(db.c_str(), "/download_mgr/p2p/port"), -17);
    EXPECT_EQ(xml_get_int_in(db.c_str(), "/download_mgr/p2p/none"), -1);
}

TEST(PackageLibrary, FindsProcessesByCommandNameAndFreesItsList) {
    char own[32] = {};
    prctl(PR_GET_NAME, own);
    EXPECT_EQ(LIB_Check_ps(own), 1);
    EXPECT_EQ(LIB_Check_ps("no-such-process"), 0);
    EXPECT_EQ(APKG_COMMAND(1, 0), 0);
    ASSERT_EQ(APKG_ReadAllXml(), 0);
    ASSERT_NE(p_lib_list, nullptr);
    APKG_FreeAllXml();
    EXPECT_EQ(p_lib_list, nullptr);
}

TEST(PackageLibrary, BuildsTheListInItsByteLayout) {
    TempFolder folder;
    const std::string long_name(250, 'n'), long_path(1500, 'p');
    std::string list = folder.write("apkg.xml",
        "<config>\n <item><name>aMule</name><state>1</state><path>/mnt/HD/HD_a2/Nas_Prog/aMule</path></item>\n"
        " <other/><item><state>-3</state><name>" + long_name + "</name><path>" + long_path +
        "</path></item>\n</config>\n");
    ASSERT_EQ(apkg_read_list_file(list.c_str()), 0);
    char *first = read_at<char *>(p_lib_list, APKG_HEADER_FIRST);
    ASSERT_NE(first, nullptr);
    EXPECT_EQ(read_at<int32_t>(first, APKG_RECORD_STATE), 1);
    EXPECT_STREQ(first + APKG_RECORD_NAME, "aMule");
    EXPECT_STREQ(first + APKG_RECORD_PATH, "/mnt/HD/HD_a2/Nas_Prog/aMule");

    char *second = read_at<char *>(first, APKG_RECORD_NEXT);
    ASSERT_NE(second, nullptr);
    EXPECT_EQ(read_at<int32_t>(second, APKG_RECORD_STATE), -3);
    EXPECT_EQ(std::string(second + APKG_RECORD_NAME), long_name.substr(0, 203));
    EXPECT_EQ(std::string(second + APKG_RECORD_PATH), long_path.substr(0, 1427));
    EXPECT_EQ(read_at<char *>(second, APKG_RECORD_NEXT), nullptr);

    ASSERT_EQ(apkg_read_list_file((folder.path + "/missing.xml").c_str()), 0);
    EXPECT_EQ(read_at<char *>(p_lib_list, APKG_HEADER_FIRST), nullptr);
    APKG_FreeAllXml();
}
