// Path lists, XML helpers, the catalogue reader and the share list readers,
// against real XML files in a private temporary folder.
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <gtest/gtest.h>
#include <libxml/parser.h>
#include <memory>
#include <string>
#include <tuple>
#include <vector>

#include "shares/dav_share_list.h"
#include "shares/path_list.h"
#include "shares/share_catalogue.h"
#include "shares/xml_helpers.h"

namespace {

struct TempDir {
    char name[16] = "/tmp/shXXXXXX";  // short enough to serve as a mount_dir
    const std::string dir = mkdtemp(name);
    ~TempDir() { std::system(("rm -rf '" + dir + "'").c_str()); }
    std::string write(const std::string &name, const std::string &content) const {
        std::system(("mkdir -p '" + dir + "/.system_data'").c_str());
        std::ofstream(dir + "/" + name) << content;
        return dir + "/" + name;
    }
};

// Reads a catalogue of the given <config> body; the records in list order.
struct Catalogue {
    int result = 0;
    std::shared_ptr<ShareRecord> head;
    std::vector<const ShareRecord *> records;
};

Catalogue read_catalogue(const std::string &xml) {
    TempDir temp;
    std::string path = temp.write("smb.xml", xml);
    Catalogue catalogue;
    catalogue.head.reset(new_share_record(), free_share_catalogue);
    catalogue.result = read_share_catalogue_file(catalogue.head.get(), path.c_str());
    for (ShareRecord *record = catalogue.head.get(); record != nullptr; record = record->next)
        catalogue.records.push_back(record);
    return catalogue;
}

using Entry = std::tuple<std::string, std::string, int, int>;  // name, path, RW, enable

std::vector<Entry> entries_of(const DavShareEntry *head) {
    std::vector<Entry> found;
    for (const DavShareEntry *e = head; e != nullptr; e = e->next)
        found.emplace_back(e->shared_name, e->path, e->RW, e->enable);
    return found;
}

std::string list_xml(const std::string &body) {
    return "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n" + body +
           "\t</WebDAV>\n</config>\n";
}

std::string item(const std::string &elements) { return "\t\t\t<item>" + elements + "</item>\n"; }

}  // namespace

TEST(PathList, AddsEachTextOnceComparingExactly) {
    PathNode *head = new_path_node();
    std::string longest(255, 'x'), overlong(256, 'x');
    struct { std::string text; int result; } steps[] = {
        {"/mnt/HD/HD_a2", 0}, {"/mnt/HD/HD_a2", -1}, {"/mnt/hd/hd_a2", 0}, {"", 0},
        {"", 0},              {longest, 0},          {longest, -1},        {overlong, -1}};
    for (const auto &step : steps)
        EXPECT_EQ(path_list_add(step.text.c_str(), head), step.result) << step.text.size();
    std::vector<std::string> texts;
    for (const PathNode *node = head->next; node != nullptr; node = node->next)
        texts.push_back(node->path);
    EXPECT_EQ(texts, (std::vector<std::string>{"/mnt/HD/HD_a2", "/mnt/hd/hd_a2", "", "", longest}));
    EXPECT_STREQ(head->path, "");
    free_path_list(head);
    EXPECT_EQ(path_list_add("x", nullptr), 0);
}

TEST(RecoverSpecialChar, ReplacesOnlyTheAmpersandEntityInOnePass) {
    struct { const char *text, *result; } cases[] = {  // result null: text unchanged
        {"&amp;amp;", "&amp;"}, {"&amp;&amp;", "&&"}, {"x&amp;", "x&"},
        {"&lt;&gt;&quot;&#38;&amp;", "&lt;&gt;&quot;&#38;&"}, {"&amp", nullptr}, {"", nullptr}};
    for (const auto &c : cases) {
        char text[64] = {};
        strcpy(text, c.text);
        char *result = recover_special_char(text);
        EXPECT_EQ(result, c.result ? text : nullptr) << c.text;
        EXPECT_STREQ(text, c.result ? c.result : c.text);
    }
}

TEST(EscapeXmlText, EscapesFourCharactersWithinItsLimits) {
    std::string quotes;
    for (int i = 0; i < 170; ++i) quotes += "&quot;";
    struct { std::string text; int result; std::string out; } cases[] = {  // -1: out kept
        {"a&amp;b<c>d\"e'f", 0, "a&amp;amp;b&lt;c&gt;d&quot;e'f"},
        {std::string(512, 'a'), 0, std::string(512, 'a')},
        {std::string(513, 'a'), -1, "kept"},
        {std::string(170, '"'), 0, quotes},
        {std::string(171, '"'), -1, "kept"},  // would need 1026 characters
    };
    for (const auto &c : cases) {
        char out[XML_ESCAPE_WIDTH] = "kept";
        EXPECT_EQ(escape_xml_text(c.text.c_str(), out), c.result) << c.text.size();
        EXPECT_EQ(std::string(out), c.out);
    }
}

// Names are compared whatever the node kind: text and comment nodes match too.
TEST(XmlHelpers, FindChildrenByNameAndDeliverTheirTextCut) {
    const char xml[] = "<r><a>one</a><!--note--><b>t<i>x</i>u</b><a>two</a></r>";
    xmlDoc *doc = xmlReadMemory(xml, sizeof xml - 1, nullptr, nullptr, XML_PARSE_NODICT);
    ASSERT_NE(doc, nullptr);
    xmlNode *root = xmlDocGetRootElement(doc);
    auto name = [](const char *text) { return reinterpret_cast<const xmlChar *>(text); };
    struct { xmlNode *parent; const char *name; int size; const char *text; } cases[] = {
        {root, "a", 16, "one"}, {root, "comment", 16, "note"}, {root, "b", 3, "tx"},
        {root, "zz", 16, nullptr}, {root->children, "text", 16, "one"}};  // null: none found
    for (const auto &c : cases) {
        char buffer[16];
        memset(buffer, '#', sizeof buffer);
        xmlNode *found = search_xml_children(c.parent, name(c.name), buffer, c.size);
        EXPECT_EQ(found != nullptr, c.text != nullptr) << c.name;
        std::string expected(c.text ? c.text : "");
        expected.resize(c.size, '\0');  // cleared up to size, nothing written past it
        expected.resize(sizeof buffer, '#');
        EXPECT_EQ(std::string(buffer, sizeof buffer), expected) << c.name;
    }
    EXPECT_EQ(search_xml_children(root, name("a"), nullptr, 0), root->children);

    xmlNode *b = root->children->next->next;
    char buffer[8] = "keep";
    EXPECT_EQ(copy_node_text_if_named(b, name("a"), buffer, sizeof buffer), nullptr);
    EXPECT_STREQ(buffer, "keep");
    EXPECT_EQ(copy_node_text_if_named(b, name("b"), buffer, 3), buffer);
    EXPECT_EQ(std::string(buffer, 4), std::string("tx\0p", 4));
    free_xml_memory(doc);
}

TEST(ShareCatalogue, FailuresLeaveTheHeadUnchanged) {
    struct { const char *xml; int result; } cases[] = {
        {"<config><other/></config>", -1},
        {"<config><samba><item><name>A</item></samba></config>", -1},
        {"<config><samba><name>A</name></samba></config>", 0}};
    for (const auto &c : cases) {
        Catalogue catalogue = read_catalogue(c.xml);
        EXPECT_EQ(catalogue.result, c.result) << c.xml;
        ASSERT_EQ(catalogue.records.size(), 1u);
        EXPECT_STREQ(catalogue.records[0]->name, "");
    }
    ShareRecord *head = new_share_record();
    EXPECT_EQ(read_share_catalogue_file(head, "/nonexistent/smb.xml"), -1);
    EXPECT_EQ(read_share_catalogue_file(nullptr, "/nonexistent/smb.xml"), -1);
    free_share_catalogue(head);
}

// An XML comment is a child named "comment" too, and comes first here.
TEST(ShareCatalogue, ReadsEveryFieldFromTheFirstOccurrence) {
    Catalogue catalogue = read_catalogue(
        "<config><samba><skipped><name>no</name></skipped><item>"
        "<volume_raid> 2</volume_raid><hd_serial>S&amp;amp;N</hd_serial>"
        "<name>A&amp;amp;B</name><name>second</name><!--c&amp;d--><comment>no</comment>"
        "<path>/mnt/HD/HD_a2/A&amp;B</path><browseable>yes</browseable>"
        "<public>no</public><oplocks>yes</oplocks><map_archive>no</map_archive>"
        "<read_list>#r#</read_list><write_list>#w&amp;amp;#</write_list>"
        "<invalid_users>@g</invalid_users><recycle_enable>  12abc</recycle_enable>"
        "<recycle_tree>none</recycle_tree><web_public>-1</web_public></item>"
        "</samba></config>");
    ASSERT_EQ(catalogue.result, 0);
    ASSERT_EQ(catalogue.records.size(), 1u);
    const ShareRecord &r = *catalogue.records[0];
    EXPECT_EQ((std::vector<std::string>{r.hd_serial, r.name, r.comment, r.path, r.browseable,
                                        r.public_, r.oplocks, r.map_archive, r.read_list,
                                        r.write_list, r.invalid_users}),
              (std::vector<std::string>{"S&amp;N", "A&B", "c&d", "/mnt/HD/HD_a2/A&B", "yes", "no",
                                        "yes", "no", "#r#", "#w&amp;#", "@g"}));
    EXPECT_EQ(std::make_tuple(r.volume_raid, r.recycle_enable, r.recycle_tree, r.web_public),
              std::make_tuple(2, 12, 0, -1));
}

TEST(ShareCatalogue, NamelessItemsAreOverwrittenByTheNext) {
    struct { const char *samba; std::vector<std::string> names; } cases[] = {
        {"<item><path>/a</path></item><item><name>B</name></item>", {"B"}},
        {"<item><name>A</name></item><item><name></name><path>/x</path></item>", {"A", ""}},
        {"<item><name>A</name></item><!-- c -->", {"A", ""}},
        {"<item><name>A</name></item><other><name>C</name></other>", {"A", "C"}},
        {"<item><name>A</name></item></samba><samba><item><name>B</name></item>", {"A"}},
    };
    for (const auto &c : cases) {
        Catalogue catalogue =
            read_catalogue(std::string("<config><samba>") + c.samba + "</samba></config>");
        EXPECT_EQ(catalogue.result, 0) << c.samba;
        std::vector<std::string> names;
        for (const ShareRecord *record : catalogue.records) names.push_back(record->name);
        EXPECT_EQ(names, c.names) << c.samba;
    }
    // The record is cleared before the next item; a last nameless one keeps its fields.
    Catalogue reused = read_catalogue(
        "<config><samba><item><path>/a</path><web_public>1</web_public></item>"
        "<item><name>B</name></item><item><path>/x</path></item></samba></config>");
    EXPECT_STREQ(reused.records[0]->path, "");
    EXPECT_EQ(reused.records[0]->web_public, 0);
    EXPECT_STREQ(reused.records[1]->path, "/x");
}

TEST(ShareCatalogue, OverlongValuesAreCutToTheirField) {
    std::string name(1500, 'n'), list(60000, 'u');
    Catalogue catalogue = read_catalogue(
        "<config><samba><item><name>" + name + "</name><public>yesyesyes</public>"
        "<read_list>" + list + "</read_list><path>&amp;amp;" + std::string(5000, 'p') +
        "</path></item></samba></config>");
    const ShareRecord &r = *catalogue.records[0];
    EXPECT_EQ(std::string(r.name), name.substr(0, 1023));
    EXPECT_STREQ(r.public_, "yesyesy");
    EXPECT_EQ(std::string(r.read_list), list.substr(0, ACCESS_LIST_WIDTH - 1));
    EXPECT_EQ(std::string(r.path), "&" + std::string(4094, 'p'));  // replaced, then cut
}

TEST(ShareListFile, ReadsItemsIntoEntriesWithFullPaths) {
    TempDir temp;
    std::string path = temp.write(
        "in.xml",
        list_xml("\t\t<count>0</count>\n\t\t<allen>0</allen>\n" +
                 item("<path>/mnt/HD/HD_a2/First</path><RW>1</RW><enable>1</enable>") +
                 item("<shared_name>Merged</shared_name><enable>0</enable>") +
                 item("<shared_name>Two</shared_name><path>/mnt/HD/HD_b2/x</path>"
                      "<path>/mnt/HD/HD_b2/y</path><path></path><RW> 7z</RW>") +
                 item("<shared_name>" + std::string(256, 'n') + "</shared_name>"
                      "<path>/mnt/HD/HD_a2/skipped</path>") +
                 item("<shared_name>A&amp;B \"q\" 'x'</shared_name>"
                      "<path>/mnt/HD/HD_a2/A&amp;B</path>")));
    DavShareEntry *head = new_dav_share_entry();
    head->next = new_dav_share_entry();  // a stale link is dropped, not followed
    DavShareEntry *stale = head->next;
    ASSERT_EQ(read_share_list_file(head, path.c_str()), 0);
    free(stale);
    EXPECT_EQ(entries_of(head),
              (std::vector<Entry>{{"Merged", "/mnt/HD/HD_a2/First", 1, 0},
                                  {"Two", "/mnt/HD/HD_b2/y", 7, 0},
                                  {"A&B \"q\" 'x'", "/mnt/HD/HD_a2/A&B", 0, 0}}));
    free_dav_share_list(head);
}

TEST(VolumeShareList, CountAndAllenDecideHowTheListIsRead) {
    TempDir temp;
    VolumeEntry volume = {};
    strcpy(volume.mount_dir, temp.dir.c_str());
    std::string items = item("<shared_name>A</shared_name><path>/A</path><RW>0</RW>") +
                        item("<shared_name>B</shared_name><path>/B</path>") +
                        item("<shared_name>C</shared_name><path>/</path><enable>1</enable>");
    const std::string dir = temp.dir;
    struct { std::string body; int result, allen; size_t entries; } cases[] = {
        {"<count>0</count><allen>1</allen>" + items, 0, 1, 1},
        {"<count>-1</count><allen>1</allen>" + items, 0, 1, 1},
        {"<count>1</count><allen>1</allen>" + items, 0, 1, 3},
        {"<count>-5</count><allen>0</allen>" + items, 0, 0, 3},
        {"<count>4</count>", 0, 4, 1},  // no allen: the count stands in
        {"<count>3</count>" + items, -1, 99, 1},
        {"<allen>1</allen><count>3</count>" + items, -1, 99, 1},
        {items, -1, 99, 1},
    };
    for (const auto &c : cases) {
        temp.write(".system_data/lighty.xml", list_xml(c.body));
        DavShareEntry *head = new_dav_share_entry();
        int allen = 99;
        EXPECT_EQ(read_volume_share_list(head, &volume, "lighty.xml", &allen), c.result) << c.body;
        EXPECT_EQ(allen, c.allen) << c.body;
        std::vector<Entry> read = entries_of(head);
        EXPECT_EQ(read.size(), c.entries) << c.body;
        if (c.entries == 3) {
            EXPECT_EQ(read, (std::vector<Entry>{{"A", dir + "/A", 0, 0}, {"B", dir + "/B", 0, 0},
                                                {"C", dir + "/", 0, 1}}));
        }
        free_dav_share_list(head);
    }
    temp.write(".system_data/lighty.xml", "<config><WebDAV/></config>");
    DavShareEntry *head = new_dav_share_entry();
    int allen = 99;
    EXPECT_EQ(read_volume_share_list(head, &volume, "lighty.xml", &allen), 0);
    EXPECT_EQ(allen, 99);
    free_dav_share_list(head);
}
