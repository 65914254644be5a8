// What one regeneration run writes for the server, built whole first: the
// configuration text (in a new file beside its place), the note file text
// (in memory), the names already published and the links to make. Only a
// complete build is placed; a build that failed anywhere leaves the placed
// configuration, the note file and the link directory as they were.
#ifndef DAVSYNC_OUTPUT_CONF_BUILD_H
#define DAVSYNC_OUTPUT_CONF_BUILD_H

#include "access/user_list.h"
#include "base/name_index.h"
#include "base/safe_file.h"
#include "output/link_dir.h"
#include "shares/path_list.h"

struct ConfBuild {
    Replacement conf_file;
    FILE *conf;  // into conf_file
    char conf_buffer[1 << 16];  // fewer writes for a file of many megabytes
    MemoryFile note;
    bool note_wanted;     // false: the note file is removed when placed
    PathNode *published;  // shared names that have a section already
    PathNode *published_tail;
    NameIndex published_names;  // over the texts of `published`
    LinkRequest *links;
    GroupTable groups;
};

// 0, or -1 when memory runs out (the build is then freed).
[[nodiscard]] int conf_build_open(ConfBuild *build);
// Registers a shared name for a section: 0 when it was not published yet,
// -1 when it was (or does not fit a path list node, or memory runs out).
int publish_name(ConfBuild *build, const char *shared_name);
// Syncs the configuration, brings the link directory in line, writes or
// removes the note file, then renames the configuration into place. -1 when
// the build or the configuration's writing failed: nothing was changed then.
int conf_build_place(ConfBuild *build);
void conf_build_free(ConfBuild *build);

#endif
