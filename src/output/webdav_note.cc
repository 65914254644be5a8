#include "output/webdav_note.h"

void write_webdav_note(ConfBuild *build, const DavShareEntry *entries) {
    build->note_wanted = true;
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next)
        if (entry->path[0] != '\0') write_note_line(build->note.stream, entry->shared_name);
}

void write_note_line(FILE *note, const char *shared_name) {
    fputs(shared_name, note);
    fputc('\n', note);
}
