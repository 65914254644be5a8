#include "cycle/start_stop.h"

#include "cycle/regeneration.h"

static const CycleVariant START_VARIANT = {
    /*lock_taken_first=*/false, /*wait_start_lock=*/true, /*clear_start_lock=*/true,
    /*read_enable_flag=*/true, RECONCILE_PATH, ALLEN_ONE, WRITE_FIXED_DIRECTORIES,
    /*prepare_link_dir=*/true, /*remove_links_after_conf=*/false,
};

// WebDAV off without touching its setting: everything rewritten as disabled,
// the links made meanwhile removed again, the server stopped.
static const CycleVariant STOP_VARIANT = {
    /*lock_taken_first=*/false, /*wait_start_lock=*/false, /*clear_start_lock=*/true,
    /*read_enable_flag=*/false, RECONCILE_NAME_AND_PATH, ALLEN_ZERO, WRITE_FIXED_DIRECTORIES,
    /*prepare_link_dir=*/true, /*remove_links_after_conf=*/true,
};

int webdav_start() {
    CycleRun run;
    if (cycle_begin(&run, &START_VARIANT, -1) < 0) return -1;
    return cycle_finish(&run);
}

int webdav_stop() {
    CycleRun run;
    if (cycle_begin(&run, &STOP_VARIANT, -1) < 0) return -1;
    return cycle_finish(&run);
}
