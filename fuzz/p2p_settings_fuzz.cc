// The download settings scan: a volume index from 0 up to what a 7-bit
// letter allows, and only one that the file names after "/mnt/HD/HD_".
#include "commands/download_share.h"
#include "fuzz_input.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string file = write_input("p2psettings.xml", data, size);
    int index = read_p2p_save_volume_in(file.c_str());
    FUZZ_CHECK(index >= -1 && index <= 0x7F - 'a');
    if (index >= 0) {
        std::string mark = "/mnt/HD/HD_" + std::string(1, static_cast<char>('a' + index));
        FUZZ_CHECK(std::string(reinterpret_cast<const char *>(data), size).find(mark) !=
                   std::string::npos);
    }
    return 0;
}
