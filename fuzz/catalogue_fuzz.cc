// The catalogue reader on any text: 0 or -1, every text field terminated
// within its width, and only the last record may lack a name.
#include "fuzz_input.h"
#include "shares/share_catalogue.h"

static void check_width(const char *text, size_t width) { FUZZ_CHECK(strlen(text) < width); }

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    ShareRecord *head = new_share_record();
    int result = read_share_catalogue_text(head, reinterpret_cast<const char *>(data), size);
    FUZZ_CHECK(result == 0 || result == -1);
    for (const ShareRecord *record = head; record != nullptr; record = record->next) {
        check_width(record->hd_serial, 512), check_width(record->name, 1024);
        check_width(record->comment, 512), check_width(record->path, 4096);
        for (const char *flag : {record->browseable, record->public_, record->oplocks,
                                 record->map_archive})
            check_width(flag, 8);
        for (const char *list : {record->read_list, record->write_list, record->invalid_users})
            check_width(list, ACCESS_LIST_WIDTH);
        FUZZ_CHECK(record->name[0] != '\0' || record->next == nullptr);
    }
    free_share_catalogue(head);
    return 0;
}
