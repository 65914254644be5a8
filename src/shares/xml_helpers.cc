#include "shares/xml_helpers.h"

#include <cstring>
#include <libxml/parser.h>
#include <libxml/xmlmemory.h>

#include "base/text_field.h"

namespace {

constexpr size_t RECOVER_WORK_WIDTH = 4096;
constexpr char AMP_ENTITY[] = "&amp;";
constexpr size_t AMP_ENTITY_LENGTH = sizeof AMP_ENTITY - 1;

// The node's whole text content into `buffer`, cut to fit.
void copy_node_content(xmlNode *node, char *buffer, size_t size) {
    xmlChar *content = xmlNodeGetContent(node);
    copy_text_field(buffer, size, reinterpret_cast<const char *>(content));
    xmlFree(content);
}

}  // namespace

xmlNode *find_xml_child(xmlNode *parent, const xmlChar *name, char *buffer, size_t size) {
    bool with_buffer = buffer != nullptr && size > 0;
    if (with_buffer) buffer[0] = '\0';
    if (parent == nullptr || name == nullptr) return nullptr;
    for (xmlNode *child = parent->children; child != nullptr; child = child->next) {
        // Comments and text nodes have names too, and take part on purpose.
        if (child->name == nullptr || xmlStrcmp(child->name, name) != 0) continue;
        if (with_buffer) copy_node_content(child, buffer, size);
        return child;
    }
    return nullptr;
}

extern "C" xmlNode *search_xml_children(xmlNode *parent, const xmlChar *name, char *buffer,
                                        int size) {
    if (buffer != nullptr && size > 0) memset(buffer, 0, static_cast<size_t>(size));
    return find_xml_child(parent, name, buffer, size > 0 ? static_cast<size_t>(size) : 0);
}

extern "C" char *recover_special_char(char *text) {
    if (text == nullptr || strstr(text, AMP_ENTITY) == nullptr) return nullptr;
    char work[RECOVER_WORK_WIDTH] = {};
    size_t used = 0;
    const char *rest = text;
    while (*rest != '\0' && used < sizeof work - 1) {
        // Each run ends with the '&' that starts the entity, so the entity's
        // first character is the replacement itself.
        const char *hit = strstr(rest, AMP_ENTITY);
        size_t run = hit != nullptr ? static_cast<size_t>(hit - rest) + 1 : strlen(rest);
        copy_text_prefix(work + used, sizeof work - used, rest, run);
        used = strlen(work);
        rest = hit != nullptr ? hit + AMP_ENTITY_LENGTH : rest + run;
    }
    // The result is never longer than the text, so it fits where the text was.
    copy_text_field(text, strlen(text) + 1, work);
    return text;
}

extern "C" void free_xml_memory(xmlDoc *doc) {
    xmlFreeDoc(doc);
    xmlCleanupParser();
    xmlMemoryDump();
}

static void ignore_xml_error(void *, const char *, ...) {}

void quiet_xml_errors() {
    xmlSetGenericErrorFunc(nullptr, ignore_xml_error);
    xmlSetStructuredErrorFunc(nullptr, nullptr);
}

int escape_xml_text(const char *text, char *out) {
    if (text == nullptr || out == nullptr) return -1;
    if (strnlen(text, XML_ESCAPE_INPUT_MAX + 1) > XML_ESCAPE_INPUT_MAX) return -1;
    char work[XML_ESCAPE_WIDTH];
    size_t used = 0;
    for (const char *at = text; *at != '\0'; ++at) {
        char single[2] = {*at, '\0'};
        const char *piece = *at == '&'   ? "&amp;"
                            : *at == '<' ? "&lt;"
                            : *at == '>' ? "&gt;"
                            : *at == '"' ? "&quot;"
                                         : single;
        size_t length = strlen(piece);
        if (used + length > sizeof work - 1) return -1;
        memcpy(work + used, piece, length);
        used += length;
    }
    work[used] = '\0';
    copy_text_field(out, XML_ESCAPE_WIDTH, work);
    return 0;
}
