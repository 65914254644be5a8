#include "platform/config_db.h"

#include <cstdlib>
#include <cstring>
#include <libxml/parser.h>
#include <libxml/tree.h>

static const char CONFIG_FILE[] = "/etc/NAS_CFG/config_db.xml";

static xmlNode *first_child_element(xmlNode *parent, const char *name, size_t length) {
    for (xmlNode *child = parent->children; child != nullptr; child = child->next) {
        if (child->type != XML_ELEMENT_NODE) continue;
        const char *child_name = reinterpret_cast<const char *>(child->name);
        if (strlen(child_name) == length && strncmp(child_name, name, length) == 0) return child;
    }
    return nullptr;
}

// The value's text, newly allocated with xmlMalloc, or null when missing.
static xmlChar *lookup_value(const char *file, const char *slash_path) {
    xmlDoc *doc = xmlReadFile(file, nullptr, XML_PARSE_NONET | XML_PARSE_NOWARNING | XML_PARSE_NOERROR);
    if (doc == nullptr) return nullptr;
    xmlNode *node = xmlDocGetRootElement(doc);
    const char *step = slash_path;
    while (node != nullptr && *step != '\0') {
        while (*step == '/') ++step;
        size_t length = strcspn(step, "/");
        if (length == 0) break;
        node = first_child_element(node, step, length);
        step += length;
    }
    xmlChar *value = node != nullptr ? xmlNodeGetContent(node) : nullptr;
    xmlFreeDoc(doc);
    return value;
}

int xml_get_str_in(const char *file, const char *path, int size, char *buf) {
    if (path == nullptr || buf == nullptr || size <= 0) return -1;
    xmlChar *value = lookup_value(file, path);
    if (value == nullptr) return -1;
    size_t length = strnlen(reinterpret_cast<const char *>(value), static_cast<size_t>(size) - 1);
    memcpy(buf, value, length);
    buf[length] = '\0';
    xmlFree(value);
    return 0;
}

int xml_get_int_in(const char *file, const char *path) {
    if (path == nullptr) return -1;
    xmlChar *value = lookup_value(file, path);
    if (value == nullptr) return -1;
    int result = static_cast<int>(strtol(reinterpret_cast<const char *>(value), nullptr, 10));
    xmlFree(value);
    return result;
}

int xml_get_str(const char *path, int size, char *buf) {
    return xml_get_str_in(CONFIG_FILE, path, size, buf);
}

int xml_get_int(const char *path) { return xml_get_int_in(CONFIG_FILE, path); }
