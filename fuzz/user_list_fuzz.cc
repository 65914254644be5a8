// Access list expansion against the system's group database: the text is
// left as it was, every name fits its node, and the list ends in exactly one
// empty node, the open slot.
#include "access/user_list.h"
#include "fuzz_input.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    std::string before = text;
    NameNode *list = nullptr;
    FUZZ_CHECK(expand_user_list(text.c_str(), &list) == 0 && list != nullptr);
    FUZZ_CHECK(text == before);
    for (const NameNode *node = list; node != nullptr; node = node->next) {
        FUZZ_CHECK(strnlen(node->name, USER_NAME_WIDTH) < USER_NAME_WIDTH);
        FUZZ_CHECK((node->name[0] == '\0') == (node->next == nullptr));
    }
    free_name_list(list);
    return 0;
}
