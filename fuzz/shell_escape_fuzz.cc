// Shell escaping: an escaped text reads back as the text, a refused one
// leaves the buffer as it was, and nothing is written past the buffer.
#include <vector>

#include "fuzz_input.h"
#include "output/shell_escape.h"

// Drops the backslash before each character the escaping marks.
static std::string unescaped(const char *escaped) {
    std::string text;
    for (const char *c = escaped; *c != '\0'; text += *c++)
        if (*c == '\\' && c[1] != '\0' && strchr(" #$%&'()+;<=>[]^`{}", c[1])) ++c;
    return text;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    // The width comes from the input too, so results that just fit and just
    // do not both occur; ASan guards the end of the buffer.
    size_t width = 1 + (size > 0 ? data[size - 1] : 0) * 4;
    std::vector<char> out(width, 'z');
    int result = escape_for_shell(text.c_str(), out.data(), width);
    if (text.size() > SHELL_ESCAPE_INPUT_MAX) FUZZ_CHECK(result == -1);
    if (result == 0) FUZZ_CHECK(unescaped(out.data()) == text);
    else FUZZ_CHECK(std::string(out.begin(), out.end()) == std::string(width, 'z'));
    return 0;
}
