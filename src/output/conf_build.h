// What one regeneration run builds for the server, whole and in memory before
// anything is written: the configuration text, the note file text, the names
// already published and the links to make. The cycle stages and places them.
#ifndef DAVSYNC_OUTPUT_CONF_BUILD_H
#define DAVSYNC_OUTPUT_CONF_BUILD_H

#include "access/user_list.h"
#include "base/name_index.h"
#include "base/memory_file.h"
#include "output/link_dir.h"

struct ConfBuild {
    MemoryFile conf;
    MemoryFile note;
    bool note_wanted;     // false: the note file is removed
    NameIndex published;  // shared names that have a section already (borrowed)
    LinkRequest *links;
    GroupTable groups;
    bool failed;          // memory ran out on the way
};

// 0, or -1 when memory runs out (the build is then freed).
[[nodiscard]] int conf_build_open(ConfBuild *build);
// Registers a shared name for a section, so that no name gets two: 0 when
// it was not published yet, -1 when it was (or memory ran out). The name is
// borrowed: it must stay as it is while the build lives.
int publish_name(ConfBuild *build, const char *shared_name);
// Ends the texts: 0 when everything came out whole, -1 when memory ran out.
[[nodiscard]] int conf_build_close(ConfBuild *build);
void conf_build_free(ConfBuild *build);

#endif
