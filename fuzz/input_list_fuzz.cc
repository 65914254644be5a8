// The do/merge input file reader on any file.
#include "entry_checks.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string file = write_input("input.xml", data, size);
    DavShareEntry *head = new_dav_share_entry();
    check_entries(read_share_list_file(head, file.c_str()), head, "");
    free_dav_share_list(head);
    return 0;
}
