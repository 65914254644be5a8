// What one regeneration run writes for the server, built whole in memory
// first: the configuration text, the note file text, the names already
// published and the links to make. Only a complete build is placed; a build
// that failed anywhere leaves the placed configuration, the note file and
// the link directory as they were.
#ifndef DAVSYNC_OUTPUT_CONF_BUILD_H
#define DAVSYNC_OUTPUT_CONF_BUILD_H

#include "base/safe_file.h"
#include "output/link_dir.h"
#include "shares/path_list.h"

struct ConfBuild {
    MemoryFile conf;
    MemoryFile note;
    bool note_wanted;     // false: the note file is removed when placed
    PathNode *published;  // shared names that have a section already
    LinkRequest *links;
};

// 0, or -1 when memory runs out (the build is then freed).
[[nodiscard]] int conf_build_open(ConfBuild *build);
// Writes the configuration beside its place, brings the link directory in
// line, writes or removes the note file, then renames the configuration
// into place. -1 when the build or the configuration's writing failed:
// nothing was changed then.
int conf_build_place(ConfBuild *build);
void conf_build_free(ConfBuild *build);

#endif
