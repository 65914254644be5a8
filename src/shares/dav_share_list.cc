#include "shares/dav_share_list.h"

#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <libxml/parser.h>
#include <libxml/xmlreader.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/safe_file.h"
#include "base/record_list.h"
#include "base/text_field.h"
#include "platform/volume_lib.h"
#include "shares/xml_helpers.h"

namespace {

constexpr char VOLUME_LIST[] = "lighty.xml";
constexpr char ISO_LIST[] = "lighty_iso.xml";
// One more than a field, so that an overlong element text shows as such.
constexpr size_t ITEM_TEXT_WIDTH = DAV_TEXT_WIDTH + 1;
constexpr size_t NUMBER_TEXT_WIDTH = 64;

int to_int(const char *text) { return static_cast<int>(strtol(text, nullptr, 10)); }

// Reads one item's elements into `entry`; non-empty texts only, a later
// element of the same name wins. `prefix` goes in front of the path. An item
// with a text too long for its field is skipped whole: a cut path would name
// a parent folder.
void read_item(DavShareEntry *entry, xmlNode *item, const char *prefix) {
    DavShareEntry read = *entry;
    for (xmlNode *child = item->children; child != nullptr; child = child->next) {
        char text[ITEM_TEXT_WIDTH] = {};
        int fits = 0;
        if (copy_node_text_if_named(child, xml_name("shared_name"), text, sizeof text)) {
            if (text[0] != '\0') fits = copy_text(read.shared_name, text);
        } else if (copy_node_text_if_named(child, xml_name("path"), text, sizeof text)) {
            if (text[0] != '\0')
                fits = format_text_field(read.path, sizeof read.path, "%s%s", prefix, text);
        } else if (copy_node_text_if_named(child, xml_name("enable"), text, sizeof text)) {
            if (text[0] != '\0') read.enable = to_int(text);
        } else if (copy_node_text_if_named(child, xml_name("RW"), text, sizeof text)) {
            if (text[0] != '\0') read.RW = to_int(text);
        }
        if (fits != 0) return;
    }
    *entry = read;
}

// A list file is read by a streaming reader: only the child of the list
// element in hand is a tree in memory, however long the list. The file is
// still read to its end, and one that is not well-formed is refused whole.
struct ListReader {
    xmlTextReader *reader;
    int status;  // of the last move: 1 on a node, 0 at the end, -1 on an error
    int fd;
    bool at_nul;
};

// The list element is the root's first child, its children the items.
constexpr int ITEM_DEPTH = 2;

// A NUL byte ends the text, as it does for the tree parser: a file padded
// with NULs after its root element still reads.
int read_until_nul(void *context, char *buffer, int length) {
    ListReader *list = static_cast<ListReader *>(context);
    if (list->at_nul) return 0;
    ssize_t got;
    do {
        got = read(list->fd, buffer, static_cast<size_t>(length));
    } while (got < 0 && errno == EINTR);
    if (got <= 0) return static_cast<int>(got);
    const void *nul = memchr(buffer, '\0', static_cast<size_t>(got));
    if (nul == nullptr) return static_cast<int>(got);
    list->at_nul = true;
    return static_cast<int>(static_cast<const char *>(nul) - buffer);
}

int close_list_file(void *context) { return close(static_cast<ListReader *>(context)->fd); }

bool open_list_reader(ListReader *list, const char *path) {
    quiet_xml_errors();
    list->reader = nullptr;
    list->status = -1;
    list->at_nul = false;
    list->fd = open(path, O_RDONLY | O_CLOEXEC);
    if (list->fd < 0) return false;
    // The reader closes the file, also when it cannot be made. The text is
    // read as UTF-8 whatever its declaration says.
    list->reader = xmlReaderForIO(read_until_nul, close_list_file, list, path, "UTF-8",
                                  XML_PARSE_NODICT | XML_PARSE_NOBLANKS | XML_PARSE_IGNORE_ENC);
    if (list->reader != nullptr) list->status = 1;
    return list->reader != nullptr;
}

bool move_on(ListReader *list) {
    list->status = xmlTextReaderRead(list->reader);
    return list->status == 1;
}

// From an element's start to its first child; false when it has none, or
// the node in hand is no element.
bool enter(ListReader *list) {
    xmlTextReader *reader = list->reader;
    int depth = xmlTextReaderDepth(reader);
    if (xmlTextReaderNodeType(reader) != XML_READER_TYPE_ELEMENT ||
        xmlTextReaderIsEmptyElement(reader) == 1)
        return false;
    return move_on(list) && xmlTextReaderDepth(reader) > depth;
}

// To the first item; false for a file whose list has none.
bool enter_list(ListReader *list) {
    while (move_on(list) && xmlTextReaderNodeType(list->reader) != XML_READER_TYPE_ELEMENT) {
    }
    return list->status == 1 && enter(list) && enter(list);
}

// The item in hand as a whole tree; null once the list has ended.
xmlNode *item_in_hand(ListReader *list) {
    if (list->status != 1 || xmlTextReaderDepth(list->reader) != ITEM_DEPTH) return nullptr;
    return xmlTextReaderExpand(list->reader);
}

void next_item(ListReader *list) { list->status = xmlTextReaderNext(list->reader); }

// Reads the rest of the file and closes it; true when it was well-formed.
bool finish(ListReader *list) {
    while (list->status == 1) move_on(list);
    xmlFreeTextReader(list->reader);
    return list->status == 0;
}

bool is_kept_entry(const DavShareEntry *entry, const char *only_path) {
    return only_path == nullptr || strcmp(entry->path, only_path) == 0;
}

// Every item from the one in hand on is read; a new entry is started only
// once the current one has a shared_name. With `only_path`, an entry with
// another path is cleared and its record reused. -1 when memory runs out.
int read_items(ListReader *list, DavShareEntry *entry, const char *prefix,
               const char *only_path) {
    DavShareEntry *current = entry;
    for (xmlNode *node; (node = item_in_hand(list)) != nullptr; next_item(list)) {
        if (current->shared_name[0] != '\0') {
            if (!is_kept_entry(current, only_path)) {
                *current = DavShareEntry{};
            } else {
                DavShareEntry *added = new_dav_share_entry();
                if (added == nullptr) return -1;
                current->next = added;
                current = added;
            }
        }
        read_item(current, node, prefix);
    }
    if (!is_kept_entry(current, only_path)) *current = DavShareEntry{};
    return 0;
}

// A volume list: count, then allen, then the items.
int read_counted_items(ListReader *list, DavShareEntry *entry, const char *prefix,
                       const char *only_path, int *allen_out) {
    char text[NUMBER_TEXT_WIDTH] = {};
    if (!copy_node_text_if_named(item_in_hand(list), xml_name("count"), text, sizeof text))
        return -1;
    int count = to_int(text);
    next_item(list);
    xmlNode *allen_node = item_in_hand(list);
    if (allen_node == nullptr) {
        *allen_out = count;
    } else {
        if (!copy_node_text_if_named(allen_node, xml_name("allen"), text, sizeof text)) return -1;
        *allen_out = to_int(text);
        next_item(list);
    }
    // The count says only whether there are items, not how many.
    if (count == 0 || count == -1) return 0;
    return read_items(list, entry, prefix, only_path);
}

enum class ListRead { read, refused, not_well_formed };

// Reads the list file at `path` into `entry`, whose next is reset first; with
// `allen_out`, as a volume list. On anything but `read` the entry is as it was.
ListRead read_list_file(const char *path, DavShareEntry *entry, const char *prefix,
                        const char *only_path, int *allen_out) {
    entry->next = nullptr;
    ListReader list;
    if (!open_list_reader(&list, path)) return ListRead::not_well_formed;
    DavShareEntry read = *entry;
    int allen = allen_out != nullptr ? *allen_out : 0;
    int result = 0;
    if (enter_list(&list))
        result = allen_out != nullptr ? read_counted_items(&list, &read, prefix, only_path, &allen)
                                      : read_items(&list, &read, prefix, only_path);
    bool well_formed = finish(&list);
    if (!well_formed || result != 0) {
        free_dav_share_list(read.next);
        return well_formed ? ListRead::refused : ListRead::not_well_formed;
    }
    *entry = read;
    if (allen_out != nullptr) *allen_out = allen;
    return ListRead::read;
}

// One list of one volume; a list that exists but is not well-formed is
// added to `unreadable` (unless null). With `only_path`, only the entries
// with that path are kept.
int read_volume_list_only(DavShareEntry *entry, const VolumeEntry *volume, const char *list_name,
                          int *allen_out, PathNode *unreadable, const char *only_path) {
    if (entry == nullptr) return -1;
    entry->next = nullptr;
    if (volume == nullptr || list_name == nullptr || allen_out == nullptr) return -1;
    const char *prefix = strstr(list_name, "lighty_iso") != nullptr ? ISO_DIR : volume->mount_dir;
    char *location = getDataLocationByVolume(list_name, volume->mount_dir);
    if (location == nullptr || access(location, R_OK) != 0) {
        free(location);
        return -1;
    }
    ListRead read = read_list_file(location, entry, prefix, only_path, allen_out);
    if (read == ListRead::not_well_formed) path_list_add(location, unreadable);
    free(location);
    return read == ListRead::read ? 0 : -1;
}

void append_list(DavShareEntry *head, DavShareEntry *tail) {
    DavShareEntry *last = head;
    while (last->next != nullptr) last = last->next;
    last->next = tail;
}

// Entries a failed read linked behind `target` go before it is reused.
void drop_following(DavShareEntry *target) {
    free_dav_share_list(target->next);
    target->next = nullptr;
}

// A scanned volume table, or null when no data volume is mounted.
VolumeEntry *scan_volume_table() {
    VolumeEntry *volumes = new_volume_entry();
    if (volumes != nullptr && scan_data_volumes(volumes) != 0) {
        free_volume_list(volumes);
        return nullptr;
    }
    return volumes;
}

// Whether `entry` is written to the list of `directory`; if so its escaped
// name and its escaped path less the volume prefix. Texts that do not escape
// within the buffer are left out rather than written cut.
bool item_texts(const DavShareEntry *entry, const char *directory, size_t directory_length,
                char *name_out, char *path_out) {
    if (strncmp(entry->path, directory, directory_length) != 0) return false;
    struct stat status;
    if (stat(entry->path, &status) != 0) return false;
    char path[XML_ESCAPE_WIDTH];
    if (escape_xml_text(entry->shared_name, name_out) != 0) return false;
    if (escape_xml_text(entry->path, path) != 0) return false;
    size_t length = strlen(path);
    size_t dropped = length < VOLUME_PREFIX_LENGTH ? length : VOLUME_PREFIX_LENGTH;
    copy_text_field(path_out, XML_ESCAPE_WIDTH, path + dropped);
    return true;
}

// The items go to their own stream first: the count stands before them.
// -1 when memory ran out.
int write_list_body(FILE *file, const DavShareEntry *entries, const char *directory, int allen) {
    MemoryFile items;
    if (memory_file_open(&items) != 0) return -1;
    size_t directory_length = strlen(directory);
    char name[XML_ESCAPE_WIDTH];
    char path[XML_ESCAPE_WIDTH];
    int count = 0;
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next) {
        if (!item_texts(entry, directory, directory_length, name, path)) continue;
        ++count;
        fprintf(items.stream,
                "\t\t\t<item>\n\t\t\t\t<shared_name>%s</shared_name>\n\t\t\t\t<path>%s</path>\n"
                "\t\t\t\t<RW>%d</RW>\n\t\t\t\t<enable>%d</enable>\n\t\t\t</item>\n",
                name, path, entry->RW, entry->enable);
    }
    int result = memory_file_close(&items);
    fputs("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n", file);
    fprintf(file, "\t\t<count>%d</count>\n\t\t<allen>%d</allen>\n", count, allen);
    fwrite(items.text, 1, items.length, file);
    fputs("\t</WebDAV>\n</config>\n", file);
    memory_file_free(&items);
    return result;
}

bool is_well_formed(const MemoryFile &text) {
    quiet_xml_errors();
    xmlDoc *doc = xmlReadMemory(text.text, static_cast<int>(text.length), nullptr, "UTF-8",
                                XML_PARSE_NODICT | XML_PARSE_NONET);
    if (doc == nullptr) return false;
    xmlFreeDoc(doc);
    return true;
}

// True for a list whose text came out whole and parses; the caller then
// frees `text`.
bool build_list(MemoryFile *text, const DavShareEntry *entries, const char *directory, int allen) {
    if (memory_file_open(text) != 0) return false;
    int body = write_list_body(text->stream, entries, directory, allen);
    if (memory_file_close(text) == 0 && body == 0 && is_well_formed(*text)) return true;
    memory_file_free(text);
    return false;
}

// A stored list the parser rejected when it was loaded is kept byte for
// byte: its entries were left out of this run, and writing would lose them.
bool is_kept(const char *list_name, const char *volume_dir, const PathNode *unreadable) {
    char *location = getDataLocationByVolume(list_name, volume_dir);
    if (location == nullptr) return true;
    bool kept = false;
    for (const PathNode *node = unreadable; node != nullptr && !kept; node = node->next)
        kept = node->path[0] != '\0' && strcmp(node->path, location) == 0;
    free(location);
    return kept;
}

// The lists go to the volume library as files named like the stored ones;
// they are written in a folder only this run can write to. Writers hold the
// node lock, so a staging folder left in /tmp is a killed run's.
constexpr char STAGING_TEMPLATE[] = "/tmp/davsync.XXXXXX";

void remove_stale_staging() { remove_stale_temporaries("/tmp", "davsync."); }

struct ListStaging {
    char dir[32];
    char file[64];
};

bool stage_list(ListStaging *staging, const char *list_name, const MemoryFile &text) {
    copy_text(staging->dir, STAGING_TEMPLATE);
    staging->file[0] = '\0';
    if (mkdtemp(staging->dir) == nullptr) return false;
    if (format_text_field(staging->file, sizeof staging->file, "%s/%s", staging->dir,
                          list_name) == 0 &&
        replace_file(staging->file, text.text, text.length, 0644) == 0)
        return true;
    rmdir(staging->dir);
    return false;
}

void unstage_list(ListStaging *staging) {
    unlink(staging->file);
    rmdir(staging->dir);
}

void store_list(const char *list_name, const MemoryFile &text, const char *volume_dir,
                const PathNode *unreadable) {
    if (is_kept(list_name, volume_dir, unreadable)) return;
    ListStaging staging;
    if (!stage_list(&staging, list_name, text)) return;
    saveDataToHiddenByVolume(staging.file, volume_dir);
    unstage_list(&staging);
}

// The iso list is kept on every volume.
void store_iso_list(const MemoryFile &text, const PathNode *unreadable) {
    VolumeEntry *volumes = scan_volume_table();
    for (VolumeEntry *volume = volumes; volume != nullptr; volume = volume->next)
        if (volume->mount_dir[0] != '\0') store_list(ISO_LIST, text, volume->mount_dir, unreadable);
    free_volume_list(volumes);
}

}  // namespace

DavShareEntry *new_dav_share_entry() { return new_zeroed_record<DavShareEntry>(); }

void free_dav_share_list(DavShareEntry *head) { free_record_list(head); }

int read_volume_share_list(DavShareEntry *entry, const VolumeEntry *volume,
                           const char *list_name, int *allen_out) {
    return read_volume_share_list_noting(entry, volume, list_name, allen_out, nullptr);
}

int read_volume_share_list_noting(DavShareEntry *entry, const VolumeEntry *volume,
                                  const char *list_name, int *allen_out, PathNode *unreadable) {
    return read_volume_list_only(entry, volume, list_name, allen_out, unreadable, nullptr);
}

namespace {

// Whether a list can hold an entry whose path is `only_path` (every list can
// when that is null): a volume's paths all begin with its directory.
bool may_hold(const char *directory, const char *only_path) {
    return only_path == nullptr || strncmp(only_path, directory, strlen(directory)) == 0;
}

int load_lists(DavShareEntry *head, int *allen_out, PathNode *unreadable, const char *only_path) {
    VolumeEntry *volumes = scan_volume_table();
    if (volumes == nullptr) return -1;

    int allen = 0;
    DavShareEntry *target = head;
    for (const VolumeEntry *volume = volumes; volume != nullptr; volume = volume->next) {
        if (volume->mount_dir[0] == '\0' || !may_hold(volume->mount_dir, only_path)) continue;
        if (target == nullptr) target = new_dav_share_entry();
        int read =
            read_volume_list_only(target, volume, VOLUME_LIST, &allen, unreadable, only_path);
        *allen_out = allen;
        if (read == 0) {
            if (target != head) append_list(head, target);
            target = nullptr;
        } else if (target != nullptr) {
            drop_following(target);
        }
    }
    if (target != head) free_dav_share_list(target);

    // Only the first readable iso list counts; the head never takes from it.
    // Copies that do not parse are kept only when none could be read: else
    // their entries are all in the list read.
    target = nullptr;
    PathNode *unreadable_iso = new_path_node();
    bool iso_read = !may_hold(ISO_DIR, only_path);
    for (const VolumeEntry *volume = volumes; volume != nullptr && !iso_read; volume = volume->next) {
        if (volume->mount_dir[0] == '\0') continue;
        if (target == nullptr) target = new_dav_share_entry();
        iso_read = read_volume_list_only(target, volume, ISO_LIST, allen_out, unreadable_iso,
                                         only_path) == 0;
        if (iso_read) {
            append_list(head, target);
            target = nullptr;
        } else if (target != nullptr) {
            drop_following(target);
        }
    }
    for (const PathNode *node = unreadable_iso; node != nullptr && !iso_read; node = node->next)
        if (node->path[0] != '\0') path_list_add(node->path, unreadable);
    free_path_list(unreadable_iso);
    free_dav_share_list(target);
    free_volume_list(volumes);
    return 0;
}

}  // namespace

int load_dav_share_lists(DavShareEntry *head, int *allen_out) {
    return load_lists(head, allen_out, nullptr, nullptr);
}

int load_dav_share_lists_noting(DavShareEntry *head, int *allen_out, PathNode *unreadable) {
    return load_lists(head, allen_out, unreadable, nullptr);
}

int load_dav_share_lists_for(DavShareEntry *head, int *allen_out, const char *path) {
    return load_lists(head, allen_out, nullptr, path);
}

int read_share_list_file(DavShareEntry *head, const char *file_path) {
    if (head == nullptr) return -1;
    head->next = nullptr;
    if (file_path == nullptr || access(file_path, R_OK) != 0) return -1;
    return read_list_file(file_path, head, "", nullptr, nullptr) == ListRead::read ? 0 : -1;
}

void write_dav_share_lists(const DavShareEntry *entries, const PathNode *directories, int allen,
                           const PathNode *unreadable) {
    remove_stale_staging();
    for (const PathNode *node = directories; node != nullptr; node = node->next) {
        const char *directory = node->path;
        if (directory[0] == '\0') continue;
        MemoryFile text;
        if (!build_list(&text, entries, directory, allen)) continue;
        if (strncmp(directory, ISO_DIR, VOLUME_PREFIX_LENGTH) == 0)
            store_iso_list(text, unreadable);
        else if (access(directory, F_OK) == 0)
            store_list(VOLUME_LIST, text, directory, unreadable);
        memory_file_free(&text);
    }
}

void write_volume_share_lists(const DavShareEntry *entries, int allen,
                              const PathNode *unreadable) {
    remove_stale_staging();
    VolumeEntry *volumes = scan_volume_table();
    for (const VolumeEntry *volume = volumes; volume != nullptr; volume = volume->next) {
        if (volume->mount_dir[0] == '\0') continue;
        MemoryFile text;
        if (!build_list(&text, entries, volume->mount_dir, allen)) continue;
        store_list(VOLUME_LIST, text, volume->mount_dir, unreadable);
        memory_file_free(&text);
    }
    free_volume_list(volumes);
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
