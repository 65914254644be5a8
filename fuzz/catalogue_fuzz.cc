// The catalogue reader on any file: 0 or -1, every text field terminated
// within its width, and only the last record may lack a name.
#include "fuzz_input.h"
#include "shares/share_catalogue.h"

template <size_t... N> static void check_fields(const char (&...fields)[N]) {
    (FUZZ_CHECK(strnlen(fields, N) < N), ...);
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string file = write_input("smb.xml", data, size);
    ShareRecord *head = new_share_record();
    int result = read_share_catalogue_file(head, file.c_str());
    FUZZ_CHECK(result == 0 || result == -1);
    for (const ShareRecord *record = head; record != nullptr; record = record->next) {
        check_fields(record->hd_serial, record->name, record->comment, record->path,
                     record->browseable, record->public_, record->oplocks, record->map_archive,
                     record->read_list, record->write_list, record->invalid_users);
        FUZZ_CHECK(record->name[0] != '\0' || record->next == nullptr);
    }
    free_share_catalogue(head);
    return 0;
}
