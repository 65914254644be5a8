#include "shares/share_catalogue.h"

#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <iterator>
#include <libxml/parser.h>
#include <cerrno>

#include "base/file_read.h"
#include "base/record_list.h"
#include "base/text_field.h"
#include "shares/xml_helpers.h"

namespace {

constexpr char SYSTEM_CATALOGUE[] = "/var/www/xml/smb.xml";

enum class FieldKind { number, text, recovered_text };

struct CatalogueField {
    const char *element;
    size_t offset;  // of the int, or of the text pointer
    size_t width;
    FieldKind kind;
};

#define NUMBER_FIELD(member) {#member, offsetof(ShareRecord, member), 0, FieldKind::number}
#define TEXT_FIELD(member, element, width, kind) \
    {element, offsetof(ShareRecord, member), width, FieldKind::kind}

// In record order; each item is read element by element from this table.
const CatalogueField catalogue_fields[] = {
    NUMBER_FIELD(volume_raid),
    TEXT_FIELD(hd_serial, "hd_serial", 512, text),
    TEXT_FIELD(name, "name", 1024, recovered_text),
    TEXT_FIELD(comment, "comment", 512, recovered_text),
    TEXT_FIELD(path, "path", 4096, recovered_text),
    TEXT_FIELD(browseable, "browseable", 8, text),
    TEXT_FIELD(public_, "public", 8, text),
    TEXT_FIELD(oplocks, "oplocks", 8, text),
    TEXT_FIELD(map_archive, "map_archive", 8, text),
    TEXT_FIELD(read_list, "read_list", ACCESS_LIST_WIDTH, text),
    TEXT_FIELD(write_list, "write_list", ACCESS_LIST_WIDTH, text),
    TEXT_FIELD(invalid_users, "invalid_users", ACCESS_LIST_WIDTH, text),
    NUMBER_FIELD(recycle_enable),
    NUMBER_FIELD(recycle_tree),
    NUMBER_FIELD(web_public),
};

#undef NUMBER_FIELD
#undef TEXT_FIELD

int &number_of(ShareRecord *record, const CatalogueField &field) {
    return *reinterpret_cast<int *>(reinterpret_cast<char *>(record) + field.offset);
}

const char *&text_of(ShareRecord *record, const CatalogueField &field) {
    return *reinterpret_cast<const char **>(reinterpret_cast<char *>(record) + field.offset);
}

// Texts may hold what users typed; they are cleared before the memory goes.
void free_texts(ShareRecord *record) {
    if (record->texts == nullptr) return;
    size_t used = 0;
    for (const CatalogueField &field : catalogue_fields)
        if (field.kind != FieldKind::number) used += strlen(text_of(record, field)) + 1;
    explicit_bzero(record->texts, used);
    free(record->texts);
    record->texts = nullptr;
}

// Every text field of `record` pointed at the texts packed in `block`, in
// table order (all empty when there is no block); numbers set to 0.
void adopt_texts(ShareRecord *record, char *block) {
    static const char no_text[] = "";
    free_texts(record);
    record->texts = block;
    for (const CatalogueField &field : catalogue_fields) {
        if (field.kind == FieldKind::number) {
            number_of(record, field) = 0;
        } else if (block == nullptr) {
            text_of(record, field) = no_text;
        } else {
            text_of(record, field) = block;
            block += strlen(block) + 1;
        }
    }
}

// The item's value of `field` in `scratch`, converted and cut to its width.
void read_value(xmlNode *item, const CatalogueField &field, char *scratch) {
    find_xml_child(item, xml_name(field.element), scratch, ACCESS_LIST_WIDTH);
    // Replaced before the cut, so a shortened value loses as little as possible.
    if (field.kind == FieldKind::recovered_text) recover_special_char(scratch);
    if (field.kind != FieldKind::number) copy_text_field(scratch, field.width, scratch);
}

// A growing block of texts, each with its terminator.
struct TextBlock {
    char *texts;
    size_t used;
    size_t capacity;
};

bool block_append(TextBlock *block, const char *text) {
    size_t length = strlen(text) + 1;
    if (block->used + length > block->capacity) {
        size_t capacity = 2 * (block->used + length);
        char *grown = static_cast<char *>(realloc(block->texts, capacity));
        if (grown == nullptr) return false;
        block->texts = grown;
        block->capacity = capacity;
    }
    memcpy(block->texts + block->used, text, length);
    block->used += length;
    return true;
}

// Reads one item into `record`, whose old values all go. -1 when memory
// runs out (the record is then empty).
int read_item(ShareRecord *record, xmlNode *item, char *scratch) {
    int numbers[std::size(catalogue_fields)] = {};
    TextBlock block = {};
    bool whole = true;
    for (size_t i = 0; i < std::size(catalogue_fields) && whole; ++i) {
        const CatalogueField &field = catalogue_fields[i];
        read_value(item, field, scratch);
        if (field.kind == FieldKind::number)
            numbers[i] = static_cast<int>(strtol(scratch, nullptr, 10));
        else
            whole = block_append(&block, scratch);
    }
    if (!whole) {
        free(block.texts);
        adopt_texts(record, nullptr);
        return -1;
    }
    adopt_texts(record, block.texts);
    for (size_t i = 0; i < std::size(catalogue_fields); ++i)
        if (catalogue_fields[i].kind == FieldKind::number)
            number_of(record, catalogue_fields[i]) = numbers[i];
    return 0;
}

// Items of the first <samba>: from its first <item> every following sibling
// counts as an item, whatever its kind.
int read_items(xmlDoc *doc, ShareRecord *head) {
    xmlNode *root = xmlDocGetRootElement(doc);
    if (root == nullptr) return -1;
    xmlNode *samba = find_xml_child(root, xml_name("samba"), nullptr, 0);
    if (samba == nullptr) return -1;
    xmlNode *item = find_xml_child(samba, xml_name("item"), nullptr, 0);
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
        if (read_item(current, item, scratch) != 0) {
            result = -1;
            break;
        }
    }
    free(scratch);
    return result;
}

}  // namespace

int read_share_catalogue_text(ShareRecord *head, const char *text, size_t length) {
    if (head == nullptr) return -1;
    quiet_xml_errors();
    // What follows a NUL byte is no text of the file.
    xmlDoc *doc = xmlReadMemory(text, static_cast<int>(strnlen(text, length)), nullptr, nullptr,
                                XML_PARSE_NOBLANKS | XML_PARSE_NODICT | XML_PARSE_NONET);
    if (doc == nullptr) return -1;
    int result = read_items(doc, head);
    free_xml_memory(doc);
    return result;
}

int read_share_catalogue(ShareRecord *head, RunFailure *failure) {
    FileBytes bytes = {};
    FileState state = read_whole_file(SYSTEM_CATALOGUE, &bytes, READ_PLAIN);
    if (state == FileState::failed) return note_failure(failure, "cannot read", SYSTEM_CATALOGUE, errno);
    if (state != FileState::read) return note_failure(failure, "there is no share catalogue", SYSTEM_CATALOGUE, 0);
    int result = read_share_catalogue_text(head, bytes.data, bytes.length);
    free_file_bytes(&bytes);
    if (result != 0) return note_failure(failure, "cannot use the share catalogue", SYSTEM_CATALOGUE, 0);
    return 0;
}


ShareRecord *new_share_record() {
    ShareRecord *record = new_zeroed_record<ShareRecord>();
    if (record != nullptr) adopt_texts(record, nullptr);
    return record;
}

void free_share_catalogue(ShareRecord *head) {
    while (head != nullptr) {
        ShareRecord *next = head->next;
        free_texts(head);
        explicit_bzero(head, sizeof *head);
        free(head);
        head = next;
    }
}
