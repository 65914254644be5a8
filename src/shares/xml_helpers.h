// Small XML helpers shared by the readers and writers of the XML files. The
// first three are also offered, under these C names, to the appliance's
// libraries loaded with the executable.
#ifndef DAVSYNC_SHARES_XML_HELPERS_H
#define DAVSYNC_SHARES_XML_HELPERS_H

#include <cstddef>
#include <libxml/tree.h>

extern "C" {
// First child of `parent` whose name equals `name` (any node kind), or null.
// With a buffer: clears its first `size` bytes and delivers the child's text
// content in it (cut to size-1 characters).
xmlNode *search_xml_children(xmlNode *parent, const xmlChar *name, char *buffer, int size);
// Replaces each "&amp;" by "&" in place, one pass, within a 4096-character
// work area (longer texts are cut there). Returns text, or null when it held
// no "&amp;" (text unchanged).
char *recover_special_char(char *text);
// xmlFreeDoc, xmlCleanupParser, xmlMemoryDump.
void free_xml_memory(xmlDoc *doc);
}

// search_xml_children without clearing the buffer: only the text and its
// terminator are written (an empty text when no child matches).
xmlNode *find_xml_child(xmlNode *parent, const xmlChar *name, char *buffer, size_t size);

inline const xmlChar *xml_name(const char *name) {
    return reinterpret_cast<const xmlChar *>(name);
}

constexpr int XML_ESCAPE_INPUT_MAX = 512;
constexpr int XML_ESCAPE_WIDTH = 1024;

// XML-escapes & < > " into `out` (XML_ESCAPE_WIDTH characters); the
// apostrophe stays. -1 when text is longer than 512 characters or the result
// would not fit; out is then unchanged.
int escape_xml_text(const char *text, char *out);

// Keeps libxml2 from printing parse errors: the tool prints nothing but its
// usage text, and a reader's result already tells a broken file.
void quiet_xml_errors();


#endif
