// The rules by which a share list's nodes become entries, fed one node at a
// time by whoever reads the text (libxml2's SAX parser, or the scanner of
// the tool's own layout), so that both read a list alike. Internal to
// share_list_reader; see share_list_reader.h for the rules themselves.
#ifndef DAVSYNC_SHARES_LIST_BUILDER_H
#define DAVSYNC_SHARES_LIST_BUILDER_H

#include <cstddef>

#include "shares/dav_share_entry.h"
#include "shares/share_list_reader.h"

// One more than a field, so that an overlong text shows as such.
constexpr size_t FIELD_TEXT_WIDTH = DAV_TEXT_WIDTH + 1;
constexpr size_t NUMBER_TEXT_WIDTH = 64;

enum ListField { NO_FIELD, SHARED_NAME, PATH, RW_FIELD, ENABLE, COUNT, ALLEN };

struct ListBuilder {
    const ListRequest *request;
    int depth;              // of the innermost open element; the root is 1
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
    ListField field;
    int field_depth;
    char text[FIELD_TEXT_WIDTH];
    size_t text_length;
    bool text_overflow;
    int count;
    int allen;
    bool allen_read;
};

// Starts on the list at `entry`, whose next must be null.
void list_builder_init(ListBuilder *builder, const ListRequest *request, DavShareEntry *entry);
void list_element_start(ListBuilder *builder, const char *name);
void list_element_end(ListBuilder *builder);
// Character data, in as many pieces as the reader gives it.
void list_text(ListBuilder *builder, const char *text, size_t length);
void list_cdata(ListBuilder *builder, const char *text, size_t length);
// A comment or a processing instruction.
void list_other_node(ListBuilder *builder);
// A document type declaration: never in a list this tool wrote.
void list_refuse(ListBuilder *builder);
// Refused, or out of memory: nothing more is wanted.
bool list_builder_stopped(const ListBuilder *builder);
// After the last node of a list read whole: the last entry of another path
// emptied (with only_path), and the allen value, if any, into *allen_out.
void list_builder_finish(ListBuilder *builder, int *allen_out);

#endif
