// The volume list reader on any lighty.xml in a scratch volume's hidden folder.
#include "base/text_field.h"
#include "entry_checks.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t *data, size_t size) {
    write_input(".system_data/lighty.xml", data, size);
    VolumeEntry volume = {};
    FUZZ_CHECK(copy_text(volume.mount_dir, scratch_folder()) == 0);
    DavShareEntry *head = new_dav_share_entry();
    int allen = 0;
    int result = read_volume_share_list(head, &volume, "lighty.xml", &allen);
    check_entries(result, head, volume.mount_dir);
    free_dav_share_list(head);
    return 0;
}
