#include "shares/share_list_layout.h"

#include <cstdlib>
#include <cstring>

namespace {

struct Entity {
    const char *text;
    char character;
};
const Entity ENTITIES[] = {{"&amp;", '&'}, {"&lt;", '<'}, {"&gt;", '>'}, {"&quot;", '"'}};

// Takes `literal` at *at; false when the text does not go on with it.
bool take(const char **at, const char *end, const char *literal) {
    size_t length = strlen(literal);
    if (static_cast<size_t>(end - *at) < length || memcmp(*at, literal, length) != 0) return false;
    *at += length;
    return true;
}

// The length of one well-formed UTF-8 character that XML allows, or 0.
size_t character_length(const unsigned char *at, const unsigned char *end) {
    unsigned char lead = at[0];
    if (lead < 0x80) return lead >= 0x20 || lead == '\t' || lead == '\n' ? 1 : 0;
    size_t length = lead >= 0xC2 && lead <= 0xDF ? 2 : lead >= 0xE0 && lead <= 0xEF ? 3 : lead >= 0xF0 && lead <= 0xF4 ? 4 : 0;
    if (length == 0 || static_cast<size_t>(end - at) < length) return 0;
    for (size_t i = 1; i < length; ++i)
        if ((at[i] & 0xC0) != 0x80) return 0;
    unsigned long code = lead & (0xFF >> (length + 1));
    for (size_t i = 1; i < length; ++i) code = (code << 6) | (at[i] & 0x3F);
    static const unsigned long SMALLEST[] = {0, 0, 0x80, 0x800, 0x10000};
    bool allowed = code >= SMALLEST[length] && code <= 0x10FFFF && !(code >= 0xD800 && code <= 0xDFFF) &&
                   code != 0xFFFE && code != 0xFFFF;
    return allowed ? length : 0;
}

// Printable ASCII that stands for itself in a text the writer escaped.
bool is_plain(unsigned char byte) {
    return byte >= 0x20 && byte < 0x80 && byte != '<' && byte != '&' && byte != '>' && byte != '"';
}

// A text up to the next '<', as the writer escapes it.
bool take_text(const char **at, const char *end, LayoutText *text) {
    text->at = *at;
    const char *cursor = *at;
    while (cursor < end && *cursor != '<') {
        if (is_plain(static_cast<unsigned char>(*cursor))) {
            ++cursor;
            continue;
        }
        if (*cursor == '&') {
            bool known = false;
            for (const Entity &entity : ENTITIES) known = known || take(&cursor, end, entity.text);
            if (!known) return false;
            continue;
        }
        if (*cursor == '>' || *cursor == '"') return false;
        size_t length = character_length(reinterpret_cast<const unsigned char *>(cursor),
                                         reinterpret_cast<const unsigned char *>(end));
        if (length == 0) return false;
        cursor += length;
    }
    text->length = static_cast<size_t>(cursor - *at);
    *at = cursor;
    return true;
}

// A number as "%d" writes it.
bool take_number(const char **at, const char *end, LayoutText *text) {
    text->at = *at;
    const char *cursor = *at;
    if (cursor < end && *cursor == '-') ++cursor;
    const char *digits = cursor;
    while (cursor < end && *cursor >= '0' && *cursor <= '9') ++cursor;
    size_t count = static_cast<size_t>(cursor - digits);
    if (count == 0 || count > 10 || (count > 1 && *digits == '0')) return false;
    text->length = static_cast<size_t>(cursor - *at);
    *at = cursor;
    return true;
}

bool take_item(const char **at, const char *end, LayoutItem *item) {
    const char *const *parts = LAYOUT_ITEM_PARTS;
    return take(at, end, parts[0]) && take_text(at, end, &item->name) && take(at, end, parts[1]) &&
           take_text(at, end, &item->path) && take(at, end, parts[2]) && take_number(at, end, &item->rw) &&
           take(at, end, parts[3]) && take_number(at, end, &item->enable) && take(at, end, parts[4]);
}

}  // namespace

bool scan_list_layout(const char *text, size_t length, LayoutScan *scan) {
    *scan = LayoutScan{};
    const char *at = text;
    const char *end = text + length;
    const char *const *head = LAYOUT_HEAD_PARTS;
    if (!take(&at, end, LAYOUT_OPEN) || !take(&at, end, head[0]) || !take_number(&at, end, &scan->count) ||
        !take(&at, end, head[1]) || !take_number(&at, end, &scan->allen) || !take(&at, end, head[2]))
        return false;
    size_t capacity = 0;
    const char *item_open = LAYOUT_ITEM_PARTS[0];
    while (static_cast<size_t>(end - at) >= strlen(item_open) && memcmp(at, item_open, strlen(item_open)) == 0) {
        if (scan->item_count == capacity) {
            capacity = capacity == 0 ? 64 : 2 * capacity;
            LayoutItem *grown = static_cast<LayoutItem *>(realloc(scan->items, capacity * sizeof *grown));
            if (grown == nullptr) break;
            scan->items = grown;
        }
        if (!take_item(&at, end, &scan->items[scan->item_count])) break;
        ++scan->item_count;
    }
    if (take(&at, end, LAYOUT_CLOSE) && at == end) return true;
    free_layout_scan(scan);
    return false;
}

void free_layout_scan(LayoutScan *scan) {
    free(scan->items);
    *scan = LayoutScan{};
}

size_t decode_layout_text(const LayoutText &text, char *out, size_t width) {
    size_t used = 0;
    for (const char *at = text.at, *end = text.at + text.length; at < end && used + 1 < width;) {
        char decoded = *at;
        size_t consumed = 1;
        if (*at == '&')
            for (const Entity &entity : ENTITIES)
                if (strncmp(at, entity.text, strlen(entity.text)) == 0) {
                    decoded = entity.character;
                    consumed = strlen(entity.text);
                    break;
                }
        out[used++] = decoded;
        at += consumed;
    }
    out[used] = '\0';
    return used;
}
