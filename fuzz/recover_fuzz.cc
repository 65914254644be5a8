// "&amp;" recovery works in place: it reports exactly the texts that hold the
// entity, leaves the others untouched and never lengthens a text.
#include <vector>

#include "fuzz_input.h"
#include "shares/xml_helpers.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    std::vector<char> buffer(text.c_str(), text.c_str() + text.size() + 1);
    char *result = recover_special_char(buffer.data());
    bool has_entity = text.find("&amp;") != std::string::npos;
    FUZZ_CHECK(result == (has_entity ? buffer.data() : nullptr));
    size_t length = strnlen(buffer.data(), buffer.size());
    FUZZ_CHECK(length < buffer.size());
    if (!has_entity) FUZZ_CHECK(text == buffer.data());
    else if (text.size() < 4096) FUZZ_CHECK(length + 4 <= text.size());
    return 0;
}
