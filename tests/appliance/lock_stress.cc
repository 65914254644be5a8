// Processes take and release the node lock in a loop; inside it each claims
// a marker with O_EXCL, which fails while another holder is inside too.
//   lock_stress PROCESSES ROUNDS: 0 only with no overlap and no lock file left.
#include <cstdlib>
#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

#include "cycle/run_locks.h"

int main(int argc, char **argv) {
    int processes = argc > 2 ? atoi(argv[1]) : 8, rounds = argc > 2 ? atoi(argv[2]) : 250, failed = 0, status = 0;
    for (unsigned seed = 1; seed <= unsigned(processes); ++seed) {
        if (fork() != 0) continue;
        for (int round = 0; round < rounds; ++round) {
            RunFailure failure = {};
            int lock = lock_node_file("stress", &failure);
            if (lock == -1) _exit(1);
            int marker = open("/tmp/lock_stress.inside", O_WRONLY | O_CREAT | O_EXCL, 0600);
            if (marker == -1) _exit(1);
            usleep(rand_r(&seed) % 200), close(marker), unlink("/tmp/lock_stress.inside");
            unlock_node_file(lock, "stress");
            if (rand_r(&seed) % 4 == 0) usleep(rand_r(&seed) % 100);
        }
        _exit(0);
    }
    while (wait(&status) > 0) failed += !WIFEXITED(status) || WEXITSTATUS(status) != 0;
    return failed == 0 && access("/tmp/corvane.node", F_OK) != 0 ? 0 : 1;
}
