#include "shares/share_list_reader.h"

#include <cstdlib>
#include <cstring>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>

#include "base/text_field.h"
#include "shares/share_list_layout.h"

namespace {

// Depths of the nodes that matter: the root is 1.
constexpr int LIST_DEPTH = 2, ITEM_DEPTH = 3, FIELD_DEPTH = 4;
// One more than a field, so that an overlong text shows as such.
constexpr size_t FIELD_TEXT_WIDTH = DAV_TEXT_WIDTH + 1;
constexpr size_t NUMBER_TEXT_WIDTH = 64;

enum Field { NO_FIELD, SHARED_NAME, PATH, RW_FIELD, ENABLE, COUNT, ALLEN };

struct ListParser {
    const ListRequest *request;
    xmlParserCtxt *context;
    int depth;              // of the innermost open element
    bool root_child_seen;   // the list element (or what stands in its place)
    bool in_list;           // within the list element
    int list_children;
    bool items_wanted;      // a volume list's count said there are items
    bool refused, out_of_memory;
    bool text_run_counts;   // non-blank text seen since the last node at list depth
    // The item being read, a copy of `current` until it ends whole.
    DavShareEntry *current;
    DavShareEntry item;
    bool in_item, item_spoilt;
    // The field or number element being read and its text.
    Field field;
    int field_depth;
    char text[FIELD_TEXT_WIDTH];
    size_t text_length;
    bool text_overflow;
    int count;
    int allen;
    bool allen_read;
};

int to_int(const char *text) { return static_cast<int>(strtol(text, nullptr, 10)); }

bool names(const xmlChar *name, const char *wanted) {
    return strcmp(reinterpret_cast<const char *>(name), wanted) == 0;
}

void stop(ListParser *parser) {
    if (parser->context != nullptr) xmlStopParser(parser->context);
}

void refuse(ListParser *parser) {
    parser->refused = true;
    stop(parser);
}

bool is_kept(const ListParser *parser, const DavShareEntry *entry) {
    const char *only = parser->request->only_path;
    return only == nullptr || strcmp(entry->path, only) == 0;
}

// A new entry is started only once the current one has a name; with
// only_path, one that is not kept is emptied and used again.
void begin_item(ListParser *parser) {
    DavShareEntry *current = parser->current;
    if (current->shared_name[0] != '\0') {
        if (!is_kept(parser, current)) {
            empty_entry(current);
        } else {
            DavShareEntry *added = new_dav_share_entry();
            if (added == nullptr) {
                parser->out_of_memory = true;
                stop(parser);
                return;
            }
            current->next = added;
            parser->current = added;
        }
    }
    parser->item = *parser->current;
    parser->in_item = true;
    parser->item_spoilt = false;
}

void end_item(ListParser *parser) {
    if (!parser->in_item) return;
    parser->in_item = false;
    if (parser->item_spoilt) return;
    DavShareEntry *next = parser->current->next;
    *parser->current = parser->item;
    parser->current->next = next;
}

void begin_text(ListParser *parser, Field field) {
    parser->field = field;
    parser->field_depth = parser->depth;
    parser->text_length = 0;
    parser->text_overflow = false;
    parser->text[0] = '\0';
}

// Applies the text of a field that ended to the item.
void end_field(ListParser *parser) {
    DavShareEntry *item = &parser->item;
    const char *text = parser->text;
    bool overlong = parser->text_overflow;
    if (text[0] == '\0') return;
    switch (parser->field) {
    case SHARED_NAME:
        if (overlong || copy_text(item->shared_name, text) != 0) parser->item_spoilt = true;
        break;
    case PATH: {
        size_t prefix = strlen(parser->request->prefix);
        if (overlong || prefix + parser->text_length >= sizeof item->path) {
            parser->item_spoilt = true;
            break;
        }
        memcpy(item->path, parser->request->prefix, prefix);
        memcpy(item->path + prefix, text, parser->text_length + 1);
        break;
    }
    case RW_FIELD: item->RW = to_int(text); break;
    case ENABLE: item->enable = to_int(text); break;
    default: break;
    }
}

void end_number(ListParser *parser) {
    int value = to_int(parser->text);
    if (parser->field == COUNT) {
        parser->count = value;
        // The count says only whether there are items, not how many.
        parser->items_wanted = value != 0 && value != -1;
    } else {
        parser->allen = value;
        parser->allen_read = true;
    }
}

// A node (of any kind) begins as a child of the list element.
void list_child(ListParser *parser, const xmlChar *element_name) {
    int position = ++parser->list_children;
    if (parser->request->kind == ListKind::volume_list && position <= 2) {
        const char *wanted = position == 1 ? "count" : "allen";
        if (element_name == nullptr || !names(element_name, wanted)) return refuse(parser);
        begin_text(parser, position == 1 ? COUNT : ALLEN);
        return;
    }
    if (parser->request->kind == ListKind::input_file || parser->items_wanted) begin_item(parser);
}

// Non-blank text directly in the list element is a child node of its own.
void settle_text_run(ListParser *parser) {
    if (!parser->text_run_counts) return;
    parser->text_run_counts = false;
    list_child(parser, nullptr);
    end_item(parser);
}

// Any node other than an element: a text run, a comment, a processing
// instruction, a CDATA section.
void other_node(ListParser *parser) {
    if (parser->depth == 1 && !parser->root_child_seen) {
        parser->root_child_seen = true;
        return refuse(parser);
    }
    if (parser->in_list && parser->depth == LIST_DEPTH) {
        list_child(parser, nullptr);
        end_item(parser);
    }
}

void on_start(void *context, const xmlChar *name, const xmlChar *, const xmlChar *, int,
              const xmlChar **, int, int, const xmlChar **) {
    ListParser *parser = static_cast<ListParser *>(context);
    settle_text_run(parser);
    int depth = ++parser->depth;
    if (parser->refused || parser->out_of_memory) return;
    if (depth == LIST_DEPTH && !parser->root_child_seen) {
        parser->root_child_seen = true;
        parser->in_list = true;
    } else if (parser->in_list && depth == ITEM_DEPTH) {
        list_child(parser, name);
    } else if (parser->in_item && depth == FIELD_DEPTH) {
        Field field = names(name, "shared_name") ? SHARED_NAME
                      : names(name, "path")      ? PATH
                      : names(name, "RW")        ? RW_FIELD
                      : names(name, "enable")    ? ENABLE
                                                 : NO_FIELD;
        if (field != NO_FIELD) begin_text(parser, field);
    }
}

void on_end(void *context, const xmlChar *, const xmlChar *, const xmlChar *) {
    ListParser *parser = static_cast<ListParser *>(context);
    settle_text_run(parser);
    int depth = parser->depth--;
    if (parser->field != NO_FIELD && depth == parser->field_depth) {
        if (parser->field == COUNT || parser->field == ALLEN) end_number(parser);
        else end_field(parser);
        parser->field = NO_FIELD;
    }
    if (parser->in_list && depth == ITEM_DEPTH) end_item(parser);
    if (parser->in_list && depth == LIST_DEPTH) parser->in_list = false;
}

bool is_blank(const xmlChar *text, int length) {
    for (int i = 0; i < length; ++i)
        if (text[i] != ' ' && text[i] != '\t' && text[i] != '\n' && text[i] != '\r') return false;
    return true;
}

void append_text(ListParser *parser, const xmlChar *text, int length) {
    size_t width = parser->field == COUNT || parser->field == ALLEN ? NUMBER_TEXT_WIDTH
                                                                      : FIELD_TEXT_WIDTH;
    size_t room = width - 1 - parser->text_length;
    size_t taken = static_cast<size_t>(length) < room ? static_cast<size_t>(length) : room;
    if (taken < static_cast<size_t>(length)) parser->text_overflow = true;
    memcpy(parser->text + parser->text_length, text, taken);
    parser->text_length += taken;
    parser->text[parser->text_length] = '\0';
}

void on_text(void *context, const xmlChar *text, int length) {
    ListParser *parser = static_cast<ListParser *>(context);
    if (parser->field != NO_FIELD) return append_text(parser, text, length);
    if (is_blank(text, length)) return;
    if (parser->depth == 1 && !parser->root_child_seen) return other_node(parser);
    if (parser->in_list && parser->depth == LIST_DEPTH) parser->text_run_counts = true;
}

void on_other(void *context) {
    ListParser *parser = static_cast<ListParser *>(context);
    settle_text_run(parser);
    if (!parser->refused && !parser->out_of_memory && parser->field == NO_FIELD)
        other_node(parser);
}

void on_comment(void *context, const xmlChar *) { on_other(context); }
void on_instruction(void *context, const xmlChar *, const xmlChar *) { on_other(context); }

void on_cdata(void *context, const xmlChar *text, int length) {
    ListParser *parser = static_cast<ListParser *>(context);
    if (parser->field != NO_FIELD) return append_text(parser, text, length);
    on_other(context);
}

// Our lists never carry one; entities of a document type would be text
// nobody wrote through this tool.
void on_document_type(void *context, const xmlChar *, const xmlChar *, const xmlChar *) {
    refuse(static_cast<ListParser *>(context));
}

void quietly(void *, xmlError *) {}

xmlSAXHandler list_handler() {
    xmlSAXHandler handler;
    memset(&handler, 0, sizeof handler);
    handler.initialized = XML_SAX2_MAGIC;
    handler.startElementNs = on_start;
    handler.endElementNs = on_end;
    handler.characters = on_text;
    handler.cdataBlock = on_cdata;
    handler.comment = on_comment;
    handler.processingInstruction = on_instruction;
    handler.internalSubset = on_document_type;
    handler.serror = quietly;
    return handler;
}

void start(ListParser *parser, const char *name) {
    on_start(parser, reinterpret_cast<const xmlChar *>(name), nullptr, nullptr, 0, nullptr, 0, 0, nullptr);
}

void end(ListParser *parser) { on_end(parser, nullptr, nullptr, nullptr); }

void element(ListParser *parser, const char *name, const LayoutText &text) {
    char decoded[FIELD_TEXT_WIDTH + 16];  // one more than a field shows an overlong text
    start(parser, name);
    size_t length = decode_layout_text(text, decoded, sizeof decoded);
    on_text(parser, reinterpret_cast<const xmlChar *>(decoded), static_cast<int>(length));
    end(parser);
}

// Whether a look-up for one path can pass the item over: a named item (it
// does not merge into the next one) with another path changes nothing but
// empty entries.
bool passes_over(const ListParser *parser, const LayoutItem &item) {
    const char *only = parser->request->only_path;
    if (only == nullptr || item.name.length == 0) return false;
    size_t prefix = strlen(parser->request->prefix);
    if (strncmp(only, parser->request->prefix, prefix) != 0) return true;
    char path[FIELD_TEXT_WIDTH + 16];
    size_t length = decode_layout_text(item.path, path, sizeof path);
    return length != strlen(only + prefix) || memcmp(path, only + prefix, length) != 0;
}

// The nodes of a list in the tool's own layout, as libxml2 would give them
// (the blank text between elements aside).
void replay_layout(ListParser *parser, const LayoutScan &scan) {
    start(parser, "config");
    start(parser, "WebDAV");
    element(parser, "count", scan.count);
    element(parser, "allen", scan.allen);
    for (size_t i = 0; i < scan.item_count && !parser->out_of_memory; ++i) {
        const LayoutItem &item = scan.items[i];
        if (passes_over(parser, item)) continue;
        start(parser, "item");
        element(parser, "shared_name", item.name);
        element(parser, "path", item.path);
        element(parser, "RW", item.rw);
        element(parser, "enable", item.enable);
        end(parser);
    }
    end(parser);
    end(parser);
}

// Whether libxml2 found the text well-formed; what it read is in `parser`.
bool parse_with_libxml2(ListParser *parser, const char *text, size_t length) {
    if (length == 0) return false;  // no document at all
    parser->context = xmlCreateMemoryParserCtxt(text, static_cast<int>(length));
    if (parser->context == nullptr) {
        parser->out_of_memory = true;
        return false;
    }
    *parser->context->sax = list_handler();
    parser->context->userData = parser;
    // As the appliance's other readers do: UTF-8, whatever the text declares.
    xmlCtxtUseOptions(parser->context, XML_PARSE_NONET | XML_PARSE_IGNORE_ENC | XML_PARSE_NODICT);
    parser->context->encoding = xmlStrdup(reinterpret_cast<const xmlChar *>("UTF-8"));
    xmlParseDocument(parser->context);
    bool well_formed = parser->context->wellFormed != 0;
    xmlFreeParserCtxt(parser->context);
    parser->context = nullptr;
    return well_formed;
}

}  // namespace

ListParse parse_share_list(const char *text, size_t length, const ListRequest &request,
                           DavShareEntry *entry, int *allen_out) {
    entry->next = nullptr;
    ListParser parser = {};
    parser.request = &request;
    parser.current = entry;
    DavShareEntry original = *entry;
    length = strnlen(text, length);
    LayoutScan scan;
    bool well_formed = true;
    if (scan_list_layout(text, length, &scan)) replay_layout(&parser, scan);
    else well_formed = parse_with_libxml2(&parser, text, length);
    free_layout_scan(&scan);

    ListParse result = parser.out_of_memory             ? ListParse::out_of_memory
                       : !well_formed || parser.refused ? ListParse::refused
                                                        : ListParse::read;
    if (result != ListParse::read) {
        free_dav_share_list(entry->next);
        *entry = original;
        entry->next = nullptr;
        return result;
    }
    if (!is_kept(&parser, parser.current)) empty_entry(parser.current);
    if (allen_out != nullptr && parser.list_children >= 1)
        *allen_out = parser.allen_read ? parser.allen : parser.count;
    return ListParse::read;
}
