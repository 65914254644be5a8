#include "base/appliance_paths.h"

#include <cstring>

#include "base/text_field.h"

static const char USB_PREFIX[] = "/mnt/USB/";
static const size_t USB_PREFIX_LENGTH = sizeof USB_PREFIX - 1;

int usb_marker_path(const char *folder, char *marker, size_t width) {
    size_t length = strlen(folder);
    while (length > 1 && folder[length - 1] == '/') --length;
    return format_text_field(marker, width, "%.*s/%s", static_cast<int>(length), folder, USB_MARKER);
}

bool is_iso_path(const char *path) { return strncmp(path, ISO_DIR, VOLUME_PREFIX_LENGTH) == 0; }

bool is_usb_path(const char *path) { return strncmp(path, USB_PREFIX, USB_PREFIX_LENGTH) == 0; }

const char *usb_folder_name(const char *usb_path) { return usb_path + USB_PREFIX_LENGTH; }

void append_volume_root_slash(char *path, size_t width) {
    size_t length = strnlen(path, width);
    if (length == VOLUME_PREFIX_LENGTH && length + 1 < width) {
        path[length] = '/';
        path[length + 1] = '\0';
    }
}

// What follows the volume folder `path` starts with, or null.
static const char *after_volume_folder(const char *path) {
    if (strncmp(path, "/mnt/HD/HD_", 11) == 0 && path[11] >= 'a' && path[11] <= 'z' &&
        path[12] == '2')
        return path + 13;
    if (is_iso_path(path)) return path + VOLUME_PREFIX_LENGTH;
    if (is_usb_path(path)) {
        const char *name = usb_folder_name(path);
        size_t name_length = strcspn(name, "/");
        return name_length == 0 ? nullptr : name + name_length;
    }
    return nullptr;
}

static bool has_dot_component(const char *path) {
    for (const char *at = path; *at != '\0'; at += strcspn(at, "/")) {
        if (*at == '/') ++at;
        size_t length = strcspn(at, "/");
        if ((length == 1 && at[0] == '.') || (length == 2 && at[0] == '.' && at[1] == '.'))
            return true;
    }
    return false;
}

bool is_shareable_path(const char *path) {
    const char *rest = after_volume_folder(path);
    return rest != nullptr && (*rest == '\0' || *rest == '/') && !has_dot_component(path);
}
