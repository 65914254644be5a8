// The shared-name lookup: the input's first line is the directory name, the
// rest the names file. The name found fits its field and is one word.
#include <algorithm>
#include <vector>

#include "fuzz_input.h"
#include "output/usb_shares.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text(reinterpret_cast<const char *>(data), size);
    size_t line_end = std::min(text.find('\n'), text.size());
    std::string dir_name = text.substr(0, line_end).c_str();
    size_t rest = std::min(line_end + 1, size);
    std::string file = write_input("shared_name", data + rest, size - rest);
    std::vector<char> result(512, '\0');
    FUZZ_CHECK(lookup_shared_name_in(file.c_str(), dir_name.c_str(), result.data()) == 0);
    FUZZ_CHECK(strnlen(result.data(), result.size()) < 256 && !strchr(result.data(), ' '));
    return 0;
}
