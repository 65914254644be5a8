// Many processes take and release the node lock in a loop; inside the lock
// each claims an O_EXCL marker, which fails if anyone else is inside too.
// Prints the number of violations; exit 0 only with none and no lock file left.
#include <cerrno>
#include <cstdio>
#include <cstdlib>
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "cycle/run_locks.h"

static const char MARKER[] = "/tmp/lock_stress.inside";

static int contend(int rounds, unsigned seed) {
    int violations = 0;
    for (int round = 0; round < rounds; ++round) {
        int lock = lock_node_file();
        int marker = open(MARKER, O_WRONLY | O_CREAT | O_EXCL, 0600);
        if (marker == -1) {
            ++violations;
        } else {
            usleep(rand_r(&seed) % 200);
            close(marker);
            unlink(MARKER);
        }
        unlock_node_file(lock);
        if (rand_r(&seed) % 4 == 0) usleep(rand_r(&seed) % 100);
    }
    return violations;
}

int main(int argc, char **argv) {
    int processes = argc > 1 ? atoi(argv[1]) : 8;
    int rounds = argc > 2 ? atoi(argv[2]) : 200;
    for (int i = 0; i < processes; ++i) {
        pid_t pid = fork();
        if (pid == 0) _exit(contend(rounds, static_cast<unsigned>(i) * 7919u + 1u) > 0 ? 1 : 0);
    }
    int failed = 0;
    int status = 0;
    while (wait(&status) > 0)
        if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) ++failed;
    bool left = access("/tmp/corvane.node", F_OK) == 0;
    printf("processes with violations: %d, lock file left: %s\n", failed, left ? "yes" : "no");
    return failed == 0 && !left ? 0 : 1;
}
