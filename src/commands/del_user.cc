#include "commands/del_user.h"

#include "cycle/regeneration.h"

// A deleted user's access follows from the catalogue read during the run, so
// the name itself is not needed.
int webdav_del_user(const char *user) {
    (void)user;
    CycleRun run;
    if (cycle_begin(&run, CYCLE_DU) < 0) return -1;
    return cycle_finish(&run);
}
