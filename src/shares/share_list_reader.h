// Reading a share list's text: the volume lists ("lighty.xml" and the iso
// list) and the do/merge input file have the same elements:
//   <root><list><count/><allen/><item><shared_name/><path/><RW/><enable/></item>...
// The list element is the root's first child, and every child of it after
// count and allen is an item (in an input file every child is). Item fields
// are read by name, non-empty texts only, a later one winning; an item with a
// text too long for its field is skipped whole (a cut path would name a
// parent folder). A new entry is started only once the current one has a
// shared name.
//
// The text is read as UTF-8 whatever it declares, up to its first NUL byte:
// in the tool's own layout by its scanner (share_list_layout.h), any other
// text by libxml2's SAX interface. Both feed the same rules (list_builder.h);
// no tree is built, however long the list.
#ifndef DAVSYNC_SHARES_SHARE_LIST_READER_H
#define DAVSYNC_SHARES_SHARE_LIST_READER_H

#include <cstddef>

#include "shares/dav_share_entry.h"

enum class ListKind {
    volume_list,  // count and allen come first; item paths are relative
    input_file,   // every child is an item; paths are full
};

enum class ListParse {
    read,
    // Not well-formed, a document type declaration, a first child of the root
    // that is no element, or (volume list) a first child of the list that is
    // no <count> or a second that is no <allen>: nothing of it is used.
    refused,
    out_of_memory,
};

struct ListRequest {
    ListKind kind;
    const char *prefix;     // put before every item path ("" for none)
    const char *only_path;  // keep only entries with exactly this path (null: all)
};

// Reads the list text into the list at `entry` (its next is reset first):
// `entry` takes the first item, the rest are appended. On anything but read,
// `entry` is as it was and nothing is appended. `allen_out` (volume lists)
// gets the allen value, or the count when there is no allen element; it is
// left alone when the list element has no children.
ListParse parse_share_list(const char *text, size_t length, const ListRequest &request,
                           DavShareEntry *entry, int *allen_out);

#endif
