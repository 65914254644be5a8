#include "shares/share_catalogue.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <libxml/parser.h>
#include <unistd.h>

#include "base/record_list.h"
#include "base/text_field.h"
#include "shares/xml_helpers.h"

namespace {

constexpr char SYSTEM_CATALOGUE[] = "/var/www/xml/smb.xml";
constexpr size_t CATALOGUE_PATH_WIDTH = 4096;

enum class FieldKind { number, text, recovered_text };

struct CatalogueField {
    const char *element;
    size_t offset;
    size_t width;
    FieldKind kind;
};

#define CATALOGUE_FIELD(member, element, kind) \
    { element, offsetof(ShareRecord, member), sizeof(ShareRecord::member), FieldKind::kind }

// In record order; each item is read element by element from this table.
const CatalogueField catalogue_fields[] = {
    CATALOGUE_FIELD(volume_raid, "volume_raid", number),
    CATALOGUE_FIELD(hd_serial, "hd_serial", text),
    CATALOGUE_FIELD(name, "name", recovered_text),
    CATALOGUE_FIELD(comment, "comment", recovered_text),
    CATALOGUE_FIELD(path, "path", recovered_text),
    CATALOGUE_FIELD(browseable, "browseable", text),
    CATALOGUE_FIELD(public_, "public", text),
    CATALOGUE_FIELD(oplocks, "oplocks", text),
    CATALOGUE_FIELD(map_archive, "map_archive", text),
    CATALOGUE_FIELD(read_list, "read_list", text),
    CATALOGUE_FIELD(write_list, "write_list", text),
    CATALOGUE_FIELD(invalid_users, "invalid_users", text),
    CATALOGUE_FIELD(recycle_enable, "recycle_enable", number),
    CATALOGUE_FIELD(recycle_tree, "recycle_tree", number),
    CATALOGUE_FIELD(web_public, "web_public", number),
};

#undef CATALOGUE_FIELD

const xmlChar *xml_name(const char *name) { return reinterpret_cast<const xmlChar *>(name); }

void store_field(ShareRecord *record, const CatalogueField &field, char *scratch) {
    char *target = reinterpret_cast<char *>(record) + field.offset;
    if (field.kind == FieldKind::number) {
        int value = static_cast<int>(strtol(scratch, nullptr, 10));
        memcpy(target, &value, sizeof value);
        return;
    }
    // Replaced before the cut, so a shortened value loses as little as possible.
    if (field.kind == FieldKind::recovered_text) recover_special_char(scratch);
    copy_text_field(target, field.width, scratch);
}

// Records are large and mostly empty: only the bytes that hold a value are
// ever written, so clearing them clears the whole record without paging in
// the rest. Keeps next.
void clear_record_values(ShareRecord *record) {
    for (const CatalogueField &field : catalogue_fields) {
        char *target = reinterpret_cast<char *>(record) + field.offset;
        size_t used = field.kind == FieldKind::number ? field.width
                                                      : strnlen(target, field.width);
        explicit_bzero(target, used);
    }
}

void read_item(ShareRecord *record, xmlNode *item, char *scratch) {
    clear_record_values(record);
    for (const CatalogueField &field : catalogue_fields) {
        search_xml_children(item, xml_name(field.element), scratch, ACCESS_LIST_WIDTH);
        store_field(record, field, scratch);
    }
}

// Items of the first <samba>: from its first <item> every following sibling
// counts as an item, whatever its kind.
int read_items(xmlDoc *doc, ShareRecord *head) {
    xmlNode *root = xmlDocGetRootElement(doc);
    if (root == nullptr) return -1;
    xmlNode *samba = search_xml_children(root, xml_name("samba"), nullptr, 0);
    if (samba == nullptr) return -1;
    xmlNode *item = search_xml_children(samba, xml_name("item"), nullptr, 0);
    if (item == nullptr) return 0;

    char *scratch = static_cast<char *>(malloc(ACCESS_LIST_WIDTH));
    if (scratch == nullptr) return -1;
    int result = 0;
    ShareRecord *current = head;
    for (; item != nullptr; item = item->next) {
        // A nameless record is reused by the next item.
        if (current->name[0] != '\0') {
            ShareRecord *added = new_share_record();
            if (added == nullptr) {
                result = -1;
                break;
            }
            current->next = added;
            current = added;
        }
        read_item(current, item, scratch);
    }
    free(scratch);
    return result;
}

int read_catalogue(ShareRecord *head, const char *file_path) {
    if (head == nullptr || file_path == nullptr) return -1;
    if (strnlen(file_path, CATALOGUE_PATH_WIDTH) >= CATALOGUE_PATH_WIDTH) return -1;
    if (access(file_path, F_OK) != 0) return -1;
    quiet_xml_errors();
    xmlDoc *doc = xmlReadFile(file_path, nullptr, XML_PARSE_NOBLANKS | XML_PARSE_NODICT);
    if (doc == nullptr) return -1;
    int result = read_items(doc, head);
    free_xml_memory(doc);
    return result;
}

}  // namespace

ShareRecord *new_share_record() { return new_zeroed_record<ShareRecord>(); }

int read_share_catalogue(ShareRecord *head) { return read_catalogue(head, SYSTEM_CATALOGUE); }

int read_share_catalogue_file(ShareRecord *head, const char *file_path) {
    return read_catalogue(head, file_path);
}

void free_share_catalogue(ShareRecord *head) {
    while (head != nullptr) {
        ShareRecord *next = head->next;
        clear_record_values(head);
        head->next = nullptr;
        free(head);
        head = next;
    }
}
