#include "cycle/start_stop.h"

#include "cycle/regeneration.h"

int webdav_start() {
    CycleRun run;
    if (cycle_begin(&run, start_variant(), -1) < 0) return -1;
    return cycle_finish(&run);
}

// WebDAV off without touching its setting: everything rewritten as disabled
// (so no link is made) and the server stopped.
int webdav_stop() {
    CycleVariant variant = start_variant();
    variant.wait_start_lock = false;
    variant.read_enable_flag = false;
    variant.rule = RECONCILE_NAME_AND_PATH;
    variant.allen = ALLEN_ZERO;
    CycleRun run;
    if (cycle_begin(&run, variant, -1) < 0) return -1;
    return cycle_finish(&run);
}
