// The download settings scan: a volume index from 0 up to what a 7-bit
// letter allows, and only one that the text names after "/mnt/HD/HD_".
#include "commands/download_share.h"
#include "fuzz_input.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    std::string text = input_text(data, size);
    int index = p2p_save_volume_in_text(text.c_str());
    FUZZ_CHECK(index >= -1 && index <= 0x7F - 'a');
    if (index >= 0)
        FUZZ_CHECK(text.find("/mnt/HD/HD_" + std::string(1, static_cast<char>('a' + index))) != std::string::npos);
    return 0;
}
