#include "commands/del_user.h"

#include "cycle/regeneration.h"

// A deleted user's access follows from the catalogue read during the run, so
// the name itself is not needed.
static const CycleVariant DEL_USER_VARIANT = {
    /*lock_taken_first=*/false, /*wait_start_lock=*/false, /*clear_start_lock=*/false,
    /*read_enable_flag=*/true, RECONCILE_NAME_AND_PATH, ALLEN_ENABLE_FLAG,
    WRITE_FIXED_DIRECTORIES, /*prepare_link_dir=*/true, /*remove_links_after_conf=*/false,
};

int webdav_del_user(const char *user) {
    (void)user;
    CycleRun run;
    if (cycle_begin(&run, &DEL_USER_VARIANT, -1) < 0) return -1;
    return cycle_finish(&run);
}
