#include "cycle/start_stop.h"

#include "cycle/regeneration.h"

static int run_cycle(CycleCommand command) {
    CycleRun run;
    if (cycle_begin(&run, command) < 0) return -1;
    return cycle_finish(&run);
}

int webdav_start() { return run_cycle(CYCLE_START); }

int webdav_stop() { return run_cycle(CYCLE_STOP); }
