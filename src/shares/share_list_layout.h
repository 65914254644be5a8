// The layout this tool writes its share lists in, byte for byte, and a
// scanner that recognises it. A list in exactly this layout (which every
// list this tool wrote is) is read without an XML parser, so that reading
// one share out of thousands costs little more than reading the file; any
// other text is left to libxml2.
#ifndef DAVSYNC_SHARES_SHARE_LIST_LAYOUT_H
#define DAVSYNC_SHARES_SHARE_LIST_LAYOUT_H

#include <cstddef>

constexpr char LAYOUT_OPEN[] = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n";
constexpr char LAYOUT_CLOSE[] = "\t</WebDAV>\n</config>\n";
// The lines of the count, the allen value and an item; each text stands
// between one of these and the next.
constexpr const char *LAYOUT_HEAD_PARTS[] = {"\t\t<count>", "</count>\n\t\t<allen>", "</allen>\n"};
constexpr const char *LAYOUT_ITEM_PARTS[] = {
    "\t\t\t<item>\n\t\t\t\t<shared_name>", "</shared_name>\n\t\t\t\t<path>", "</path>\n\t\t\t\t<RW>",
    "</RW>\n\t\t\t\t<enable>", "</enable>\n\t\t\t</item>\n"};

// A text as it stands in the file, entities not yet decoded.
struct LayoutText {
    const char *at;
    size_t length;
};

struct LayoutItem {
    LayoutText name, path, rw, enable;
};

struct LayoutScan {
    LayoutText count, allen;
    LayoutItem *items;
    size_t item_count;
};

// True when the text is exactly in the layout, its numbers written as %d
// writes them and its other texts valid UTF-8 character data escaped as the
// writer escapes it (no '<', '>', '"' or control byte but tab and newline
// left bare); `scan` then holds the texts (free_layout_scan releases them).
// False for any other text, and when memory runs out.
bool scan_list_layout(const char *text, size_t length, LayoutScan *scan);
void free_layout_scan(LayoutScan *scan);
// Decodes &amp; &lt; &gt; &quot; of a scanned text into `out`, at most
// width - 1 bytes and a NUL; returns the length written.
size_t decode_layout_text(const LayoutText &text, char *out, size_t width);

#endif
