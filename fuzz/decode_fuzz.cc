// Argument decoding never grows a text, stays inside its work width, and
// leaves a text without '&' as it was.
#include <vector>

#include "cli/decode.h"
#include "fuzz_input.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    std::vector<char> out(DECODE_WORK_WIDTH, '\0'), argument(DECODE_WORK_WIDTH, '\0');
    FUZZ_CHECK(decode_special_char(text.c_str(), out.data()) == 0);
    int cut = decode_argument(text.c_str(), argument.data());
    FUZZ_CHECK(out == argument);
    size_t length = strnlen(out.data(), out.size());
    FUZZ_CHECK(length < out.size() && length <= text.size());
    FUZZ_CHECK(cut == 0 || (cut == -1 && length == out.size() - 1));
    if (text.size() < out.size()) FUZZ_CHECK(cut == 0);
    if (cut == 0 && text.find('&') == std::string::npos) FUZZ_CHECK(text == out.data());
    return 0;
}
