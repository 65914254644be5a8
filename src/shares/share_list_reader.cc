#include "shares/share_list_reader.h"

#include <cstring>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>

#include "shares/list_builder.h"
#include "shares/share_list_layout.h"

namespace {

// What libxml2's callbacks are handed.
struct SaxReading {
    ListBuilder builder;
    xmlParserCtxt *context;
};

ListBuilder *builder_of(void *context) { return &static_cast<SaxReading *>(context)->builder; }

void stop_if_done(void *context) {
    SaxReading *reading = static_cast<SaxReading *>(context);
    if (list_builder_stopped(&reading->builder)) xmlStopParser(reading->context);
}

const char *text_of(const xmlChar *text) { return reinterpret_cast<const char *>(text); }

void on_start(void *context, const xmlChar *name, const xmlChar *, const xmlChar *, int, const xmlChar **, int,
              int, const xmlChar **) {
    list_element_start(builder_of(context), text_of(name));
    stop_if_done(context);
}

void on_end(void *context, const xmlChar *, const xmlChar *, const xmlChar *) {
    list_element_end(builder_of(context));
    stop_if_done(context);
}

void on_text(void *context, const xmlChar *text, int length) {
    list_text(builder_of(context), text_of(text), static_cast<size_t>(length));
    stop_if_done(context);
}

void on_cdata(void *context, const xmlChar *text, int length) {
    list_cdata(builder_of(context), text_of(text), static_cast<size_t>(length));
    stop_if_done(context);
}

void on_comment(void *context, const xmlChar *) {
    list_other_node(builder_of(context));
    stop_if_done(context);
}

void on_instruction(void *context, const xmlChar *, const xmlChar *) { on_comment(context, nullptr); }

// Our lists never carry one; entities of a document type would be text
// nobody wrote through this tool.
void on_document_type(void *context, const xmlChar *, const xmlChar *, const xmlChar *) {
    list_refuse(builder_of(context));
    stop_if_done(context);
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

void element(ListBuilder *builder, const char *name, const LayoutText &text) {
    char decoded[FIELD_TEXT_WIDTH + 16];  // one more than a field shows an overlong text
    list_element_start(builder, name);
    list_text(builder, decoded, decode_layout_text(text, decoded, sizeof decoded));
    list_element_end(builder);
}

// Whether a look-up for one path can pass the item over: a named item (it
// does not merge into the next one) with another path changes nothing but
// empty entries.
bool passes_over(const ListRequest &request, const LayoutItem &item) {
    const char *only = request.only_path;
    if (only == nullptr || item.name.length == 0) return false;
    size_t prefix = strlen(request.prefix);
    if (strncmp(only, request.prefix, prefix) != 0) return true;
    char path[FIELD_TEXT_WIDTH + 16];
    size_t length = decode_layout_text(item.path, path, sizeof path);
    return length != strlen(only + prefix) || memcmp(path, only + prefix, length) != 0;
}

// The nodes of a list in the tool's own layout, as libxml2 would give them
// (the blank text between elements aside).
void replay_layout(ListBuilder *builder, const LayoutScan &scan) {
    list_element_start(builder, "config");
    list_element_start(builder, "WebDAV");
    element(builder, "count", scan.count);
    element(builder, "allen", scan.allen);
    for (size_t i = 0; i < scan.item_count && !list_builder_stopped(builder); ++i) {
        const LayoutItem &item = scan.items[i];
        if (passes_over(*builder->request, item)) continue;
        list_element_start(builder, "item");
        element(builder, "shared_name", item.name);
        element(builder, "path", item.path);
        element(builder, "RW", item.rw);
        element(builder, "enable", item.enable);
        list_element_end(builder);
    }
    list_element_end(builder);
    list_element_end(builder);
}

// Whether libxml2 found the text well-formed; what it read is in `reading`.
bool parse_with_libxml2(SaxReading *reading, const char *text, size_t length) {
    if (length == 0) return false;  // no document at all
    reading->context = xmlCreateMemoryParserCtxt(text, static_cast<int>(length));
    if (reading->context == nullptr) {
        reading->builder.out_of_memory = true;
        return false;
    }
    *reading->context->sax = list_handler();
    reading->context->userData = reading;
    // As the appliance's other readers do: UTF-8, whatever the text declares.
    xmlCtxtUseOptions(reading->context, XML_PARSE_NONET | XML_PARSE_IGNORE_ENC | XML_PARSE_NODICT);
    reading->context->encoding = xmlStrdup(reinterpret_cast<const xmlChar *>("UTF-8"));
    xmlParseDocument(reading->context);
    bool well_formed = reading->context->wellFormed != 0;
    xmlFreeParserCtxt(reading->context);
    reading->context = nullptr;
    return well_formed;
}

}  // namespace

ListParse parse_share_list(const char *text, size_t length, const ListRequest &request,
                           DavShareEntry *entry, int *allen_out) {
    entry->next = nullptr;
    DavShareEntry original = *entry;
    SaxReading reading = {};
    list_builder_init(&reading.builder, &request, entry);
    length = strnlen(text, length);
    LayoutScan scan;
    bool well_formed = true;
    if (scan_list_layout(text, length, &scan)) replay_layout(&reading.builder, scan);
    else well_formed = parse_with_libxml2(&reading, text, length);
    free_layout_scan(&scan);

    ListParse result = reading.builder.out_of_memory             ? ListParse::out_of_memory
                       : !well_formed || reading.builder.refused ? ListParse::refused
                                                                 : ListParse::read;
    if (result != ListParse::read) {
        free_dav_share_list(entry->next);
        *entry = original;
        entry->next = nullptr;
        return result;
    }
    list_builder_finish(&reading.builder, allen_out);
    return ListParse::read;
}
