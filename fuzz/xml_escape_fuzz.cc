// XML escaping: the result fits its width, holds no bare markup character,
// and argument decoding turns it back into the text. A refused text leaves
// the output untouched.
#include <algorithm>
#include <vector>

#include "cli/decode.h"
#include "fuzz_input.h"
#include "shares/xml_helpers.h"

static bool entities_only(const char *escaped) {
    for (const char *at = strchr(escaped, '&'); at != nullptr; at = strchr(at + 1, '&'))
        if (strncmp(at, "&amp;", 5) && strncmp(at, "&lt;", 4) && strncmp(at, "&gt;", 4) &&
            strncmp(at, "&quot;", 6))
            return false;
    return !strpbrk(escaped, "<>\"");
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    std::vector<char> out(XML_ESCAPE_WIDTH, 'x'), decoded(DECODE_WORK_WIDTH, '\0');
    int result = escape_xml_text(text.c_str(), out.data());
    if (text.size() > XML_ESCAPE_INPUT_MAX) FUZZ_CHECK(result == -1);
    if (text.size() * 6 < XML_ESCAPE_WIDTH) FUZZ_CHECK(result == 0);
    if (result != 0) {
        FUZZ_CHECK(result == -1 && std::count(out.begin(), out.end(), 'x') == XML_ESCAPE_WIDTH);
        return 0;
    }
    FUZZ_CHECK(memchr(out.data(), '\0', out.size()) && entities_only(out.data()));
    FUZZ_CHECK(decode_argument(out.data(), decoded.data()) == 0 && text == decoded.data());
    return 0;
}
