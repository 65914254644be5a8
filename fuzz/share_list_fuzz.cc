// The share list reader on any text, as a volume list (first byte even) or
// as a do/merge input file (odd): every text field terminated within its
// width, every path read starting with the prefix, and a refused text
// leaving the head entry as it was. A text in the tool's own layout reads
// the same with a newline after it, which only libxml2 reads.
#include "fuzz_input.h"
#include "shares/share_list_layout.h"
#include "shares/share_list_reader.h"

static std::string entries_of(const char *text, size_t length, const ListRequest &request) {
    DavShareEntry *head = new_dav_share_entry();
    int allen = 0;
    std::string seen = std::to_string(static_cast<int>(parse_share_list(text, length, request, head, &allen)));
    for (const DavShareEntry *entry = head; entry != nullptr; entry = entry->next)
        seen += "|" + std::string(entry->shared_name) + "|" + entry->path + "|" + std::to_string(entry->RW) + "|" +
                std::to_string(entry->enable);
    free_dav_share_list(head);
    return seen + "|" + std::to_string(allen);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    if (size == 0) return 0;
    bool volume_list = data[0] % 2 == 0;
    const char *prefix = volume_list ? "/mnt/HD/HD_a2" : "";
    std::string text(reinterpret_cast<const char *>(data + 1), size - 1);
    DavShareEntry *head = new_dav_share_entry();
    head->RW = 42;
    int allen = -7;
    ListRequest request = {volume_list ? ListKind::volume_list : ListKind::input_file, prefix, nullptr};
    ListParse result = parse_share_list(text.data(), text.size(), request, head, volume_list ? &allen : nullptr);
    if (result != ListParse::read) FUZZ_CHECK(head->next == nullptr && head->RW == 42 && allen == -7);
    for (const DavShareEntry *entry = head; entry != nullptr; entry = entry->next) {
        FUZZ_CHECK(strnlen(entry->shared_name, DAV_TEXT_WIDTH) < DAV_TEXT_WIDTH);
        FUZZ_CHECK(strnlen(entry->path, DAV_TEXT_WIDTH) < DAV_TEXT_WIDTH);
        FUZZ_CHECK(entry->path[0] == '\0' || strncmp(entry->path, prefix, strlen(prefix)) == 0);
    }
    free_dav_share_list(head);
    LayoutScan scan;
    if (scan_list_layout(text.data(), strnlen(text.data(), text.size()), &scan)) {
        std::string plain = text.substr(0, strnlen(text.data(), text.size()));
        FUZZ_CHECK(entries_of(plain.data(), plain.size(), request) == entries_of((plain + "\n").data(), plain.size() + 1, request));
    }
    free_layout_scan(&scan);
    return 0;
}
