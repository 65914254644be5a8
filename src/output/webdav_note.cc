#include "output/webdav_note.h"

#include "output/conf_writer.h"

int write_webdav_note(const DavShareEntry *entries) {
    FILE *note = open_locked(WEBDAV_NOTE_FILE, "w");
    if (note == nullptr) return -1;
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next)
        if (entry->path[0] != '\0') write_note_line(note, entry->shared_name);
    close_locked(note);
    return 0;
}
