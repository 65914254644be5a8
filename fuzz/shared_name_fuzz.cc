// The shared-name lookup: the input's first line is the directory name, the
// rest the names file. The name found fits its field, is one word and stands
// at the start of a line that holds the directory name.
#include <algorithm>

#include "fuzz_input.h"
#include "shares/usb_volumes.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    size_t line_end = std::min(text.find('\n'), text.size());
    std::string dir_name = text.substr(0, line_end);
    std::string names = text.substr(std::min(line_end + 1, text.size()));
    char result[SHARED_NAME_WIDTH];
    shared_name_in(names.c_str(), dir_name.c_str(), result);
    FUZZ_CHECK(strnlen(result, sizeof result) < 256 && !strpbrk(result, " \n"));
    if (result[0] != '\0') FUZZ_CHECK(names.rfind(result, 0) == 0 || names.find("\n" + std::string(result)) != std::string::npos);
    return 0;
}
