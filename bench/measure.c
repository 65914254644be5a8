// measure [--bare] ROOT PROGRAM [ARG...]
// Runs PROGRAM chrooted into ROOT, with the environment the tool gets (PATH
// alone) plus the usage library of usage.c preloaded, and prints one line:
//   <wall time in microseconds> <own CPU in microseconds> <peak RSS in KB> <children>
// The last three come from the usage library and are "-" when the program
// wrote none (a static program cannot load it). With --bare nothing is
// preloaded, so the wall time holds no cost of measuring. The wall time runs
// from before the fork to the end of the wait. Exits 1 when the program fails.
#define _GNU_SOURCE
#include <errno.h>
#include <stdio.h>
#include <string.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

static char PATH_VARIABLE[] = "PATH=/opt/bin:/usr/sbin:/usr/bin:/sbin:/bin";
static char PRELOAD_VARIABLE[] = "LD_PRELOAD=/opt/bench/usage.so";
static char USAGE_VARIABLE[] = "BENCH_USAGE_FILE=/opt/bench/usage.out";

static long long now_us(void) {
    struct timespec t;
    clock_gettime(CLOCK_MONOTONIC, &t);
    return t.tv_sec * 1000000LL + t.tv_nsec / 1000;
}

int main(int argc, char **argv) {
    int bare = argc > 1 && strcmp(argv[1], "--bare") == 0;
    argc -= bare;
    argv += bare;
    if (argc < 3) {
        fputs("usage: measure [--bare] ROOT PROGRAM [ARG...]\n", stderr);
        return 2;
    }
    const char *root = argv[1];
    char usage_path[4096];
    snprintf(usage_path, sizeof usage_path, "%s%s", root, strchr(USAGE_VARIABLE, '=') + 1);
    unlink(usage_path);

    char *environment[] = {PATH_VARIABLE, PRELOAD_VARIABLE, USAGE_VARIABLE, NULL};
    if (bare) environment[1] = NULL;
    long long started = now_us();
    pid_t pid = fork();
    if (pid == 0) {
        if (chroot(root) != 0 || chdir("/") != 0) {
            perror(root);
            _exit(127);
        }
        execve(argv[2], argv + 2, environment);
        perror(argv[2]);
        _exit(127);
    }
    int status = 0;
    if (pid < 0 || waitpid(pid, &status, 0) != pid) {
        perror("measure");
        return 1;
    }
    long long wall_us = now_us() - started;
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
        fprintf(stderr, "measure: %s ended with status %d\n", argv[2], status);
        return 1;
    }

    char usage[128] = "- - -";
    FILE *file = fopen(usage_path, "r");
    if (file != NULL) {
        if (fgets(usage, sizeof usage, file) != NULL) usage[strcspn(usage, "\n")] = '\0';
        fclose(file);
    }
    printf("%lld %s\n", wall_us, usage);
    return 0;
}
