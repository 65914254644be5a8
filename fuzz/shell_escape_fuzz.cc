// Shell escaping: an escaped text reads back as the text, and whatever the
// two shell tests pass holds no character the shell would still interpret.
#include <vector>

#include "fuzz_input.h"
#include "output/shell_escape.h"

static void check_nothing_live(const char *text) {
    for (const char *c = text; *c != '\0'; ++c) {
        if (*c == '\\') {
            ++c;  // the shell takes the next character as it is, but for a newline
            FUZZ_CHECK(*c != '\0' && *c != '\n');
        } else {
            unsigned char byte = static_cast<unsigned char>(*c);
            FUZZ_CHECK(byte >= 0x20 && byte != 0x7F && !strchr(" \"#$&'()*;<>?[]^`{|}~!", byte));
        }
    }
}

// Drops the backslash before each character the escaping marks.
static std::string unescaped(const char *escaped) {
    std::string text;
    for (const char *c = escaped; *c != '\0'; text += *c++)
        if (*c == '\\' && c[1] != '\0' && strchr(" #$%&'()+;<=>[]^`{}", c[1])) ++c;
    return text;
}

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    std::vector<char> out(2 * SHELL_ESCAPE_INPUT_MAX + 1, '\0');
    int result = escape_for_shell(text.c_str(), out.data());
    FUZZ_CHECK(result == (text.size() > SHELL_ESCAPE_INPUT_MAX ? -1 : 0) && out.back() == '\0');
    FUZZ_CHECK(result == 0 ? unescaped(out.data()) == text : out[0] == '\0');
    for (const char *candidate : {text.c_str(), static_cast<const char *>(out.data())})
        if (is_shell_safe_escaped(candidate)) check_nothing_live(candidate);
    if (is_shell_literal(text.c_str())) check_nothing_live(text.c_str());
    return 0;
}
