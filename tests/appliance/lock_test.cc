// The node lock keeps runs apart although every release removes its file.
#include <gtest/gtest.h>

#include "harness/appliance.h"

TEST(NodeLock, ManyContendingProcessesAreNeverInsideTogether) {
    appliance::Appliance box;
    appliance::RunResult result = box.run_program(DAVSYNC_LOCK_STRESS, {"8", "250"});
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    EXPECT_EQ(result.out, "processes with violations: 0, lock file left: no\n");
    EXPECT_FALSE(box.exists("/tmp/corvane.node"));
}
