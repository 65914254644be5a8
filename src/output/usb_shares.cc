#include "output/usb_shares.h"

#include "output/conf_section.h"
#include "output/webdav_note.h"

static void append_volume(ConfBuild *build, const UsbVolume *volume) {
    const char *name = volume->shared_name;
    // A volume whose name was not found ("") would alias the server's root.
    if (!is_conf_safe_name(name)) return;
    if (publish_name(build, name) < 0) return;
    if (write_share_section(build->conf.stream, &build->groups, name, true, volume->rules) != 0)
        build->failed = true;
    if (request_link(&build->links, name, volume->path) != 0) build->failed = true;
}

void append_usb_shares(ConfBuild *build, const UsbScan *scan) {
    if (!scan->scanned) return;
    for (const UsbVolume *volume = scan->volumes; volume != nullptr; volume = volume->next)
        append_volume(build, volume);
    // Every marked volume is noted, also one whose name had a section already.
    build->note_wanted = true;
    for (const UsbVolume *volume = scan->volumes; volume != nullptr; volume = volume->next)
        write_note_line(build->note.stream, volume->shared_name);
}
