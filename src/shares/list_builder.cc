#include "shares/list_builder.h"

#include <cstdlib>
#include <cstring>

#include "base/text_field.h"

namespace {

// Depths of the nodes that matter: the root is 1.
constexpr int LIST_DEPTH = 2, ITEM_DEPTH = 3, FIELD_DEPTH = 4;

int to_int(const char *text) { return static_cast<int>(strtol(text, nullptr, 10)); }

bool names(const char *name, const char *wanted) { return strcmp(name, wanted) == 0; }

void refuse(ListBuilder *builder) { builder->refused = true; }

bool is_kept(const ListBuilder *builder, const DavShareEntry *entry) {
    const char *only = builder->request->only_path;
    return only == nullptr || strcmp(entry->path, only) == 0;
}

// A new entry is started only once the current one has a name; with
// only_path, one that is not kept is emptied and used again.
void begin_item(ListBuilder *builder) {
    DavShareEntry *current = builder->current;
    if (current->shared_name[0] != '\0') {
        if (!is_kept(builder, current)) {
            empty_entry(current);
        } else {
            DavShareEntry *added = new_dav_share_entry();
            if (added == nullptr) {
                builder->out_of_memory = true;
                return;
            }
            current->next = added;
            builder->current = added;
        }
    }
    builder->item = *builder->current;
    builder->in_item = true;
    builder->item_spoilt = false;
}

void end_item(ListBuilder *builder) {
    if (!builder->in_item) return;
    builder->in_item = false;
    if (builder->item_spoilt) return;
    DavShareEntry *next = builder->current->next;
    *builder->current = builder->item;
    builder->current->next = next;
}

void begin_text(ListBuilder *builder, ListField field) {
    builder->field = field;
    builder->field_depth = builder->depth;
    builder->text_length = 0;
    builder->text_overflow = false;
    builder->text[0] = '\0';
}

// Applies the text of a field that ended to the item.
void end_field(ListBuilder *builder) {
    DavShareEntry *item = &builder->item;
    const char *text = builder->text;
    bool overlong = builder->text_overflow;
    if (text[0] == '\0') return;
    switch (builder->field) {
    case SHARED_NAME:
        if (overlong || copy_text(item->shared_name, text) != 0) builder->item_spoilt = true;
        break;
    case PATH: {
        size_t prefix = strlen(builder->request->prefix);
        if (overlong || prefix + builder->text_length >= sizeof item->path) {
            builder->item_spoilt = true;
            break;
        }
        memcpy(item->path, builder->request->prefix, prefix);
        memcpy(item->path + prefix, text, builder->text_length + 1);
        break;
    }
    case RW_FIELD: item->RW = to_int(text); break;
    case ENABLE: item->enable = to_int(text); break;
    default: break;
    }
}

void end_number(ListBuilder *builder) {
    int value = to_int(builder->text);
    if (builder->field == COUNT) {
        builder->count = value;
        // The count says only whether there are items, not how many.
        builder->items_wanted = value != 0 && value != -1;
    } else {
        builder->allen = value;
        builder->allen_read = true;
    }
}

// A node (of any kind) begins as a child of the list element.
void list_child(ListBuilder *builder, const char *element_name) {
    int position = ++builder->list_children;
    if (builder->request->kind == ListKind::volume_list && position <= 2) {
        const char *wanted = position == 1 ? "count" : "allen";
        if (element_name == nullptr || !names(element_name, wanted)) return refuse(builder);
        begin_text(builder, position == 1 ? COUNT : ALLEN);
        return;
    }
    if (builder->request->kind == ListKind::input_file || builder->items_wanted) begin_item(builder);
}

// Non-blank text directly in the list element is a child node of its own.
void settle_text_run(ListBuilder *builder) {
    if (!builder->text_run_counts) return;
    builder->text_run_counts = false;
    list_child(builder, nullptr);
    end_item(builder);
}

// Any node other than an element: a text run, a comment, a processing
// instruction, a CDATA section.
void other_node(ListBuilder *builder) {
    if (builder->depth == 1 && !builder->root_child_seen) {
        builder->root_child_seen = true;
        return refuse(builder);
    }
    if (builder->in_list && builder->depth == LIST_DEPTH) {
        list_child(builder, nullptr);
        end_item(builder);
    }
}

bool is_blank(const char *text, size_t length) {
    for (size_t i = 0; i < length; ++i)
        if (text[i] != ' ' && text[i] != '\t' && text[i] != '\n' && text[i] != '\r') return false;
    return true;
}

void append_text(ListBuilder *builder, const char *text, size_t length) {
    size_t width = builder->field == COUNT || builder->field == ALLEN ? NUMBER_TEXT_WIDTH
                                                                      : FIELD_TEXT_WIDTH;
    size_t room = width - 1 - builder->text_length;
    size_t taken = length < room ? length : room;
    if (taken < length) builder->text_overflow = true;
    memcpy(builder->text + builder->text_length, text, taken);
    builder->text_length += taken;
    builder->text[builder->text_length] = '\0';
}

}  // namespace

void list_builder_init(ListBuilder *builder, const ListRequest *request, DavShareEntry *entry) {
    *builder = ListBuilder{};
    builder->request = request;
    builder->current = entry;
}

bool list_builder_stopped(const ListBuilder *builder) { return builder->refused || builder->out_of_memory; }

void list_element_start(ListBuilder *builder, const char *name) {
    settle_text_run(builder);
    int depth = ++builder->depth;
    if (list_builder_stopped(builder)) return;
    if (depth == LIST_DEPTH && !builder->root_child_seen) {
        builder->root_child_seen = true;
        builder->in_list = true;
    } else if (builder->in_list && depth == ITEM_DEPTH) {
        list_child(builder, name);
    } else if (builder->in_item && depth == FIELD_DEPTH) {
        ListField field = names(name, "shared_name") ? SHARED_NAME
                          : names(name, "path")      ? PATH
                          : names(name, "RW")        ? RW_FIELD
                          : names(name, "enable")    ? ENABLE
                                                     : NO_FIELD;
        if (field != NO_FIELD) begin_text(builder, field);
    }
}

void list_element_end(ListBuilder *builder) {
    settle_text_run(builder);
    int depth = builder->depth--;
    if (builder->field != NO_FIELD && depth == builder->field_depth) {
        if (builder->field == COUNT || builder->field == ALLEN) end_number(builder);
        else end_field(builder);
        builder->field = NO_FIELD;
    }
    if (builder->in_list && depth == ITEM_DEPTH) end_item(builder);
    if (builder->in_list && depth == LIST_DEPTH) builder->in_list = false;
}

void list_text(ListBuilder *builder, const char *text, size_t length) {
    if (builder->field != NO_FIELD) return append_text(builder, text, length);
    if (is_blank(text, length)) return;
    if (builder->depth == 1 && !builder->root_child_seen) return other_node(builder);
    if (builder->in_list && builder->depth == LIST_DEPTH) builder->text_run_counts = true;
}

void list_other_node(ListBuilder *builder) {
    settle_text_run(builder);
    if (!list_builder_stopped(builder) && builder->field == NO_FIELD) other_node(builder);
}

void list_cdata(ListBuilder *builder, const char *text, size_t length) {
    if (builder->field != NO_FIELD) return append_text(builder, text, length);
    list_other_node(builder);
}

void list_refuse(ListBuilder *builder) { refuse(builder); }

void list_builder_finish(ListBuilder *builder, int *allen_out) {
    if (!is_kept(builder, builder->current)) empty_entry(builder->current);
    if (allen_out != nullptr && builder->list_children >= 1)
        *allen_out = builder->allen_read ? builder->allen : builder->count;
}
