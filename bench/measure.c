// measure [--bare] PROGRAM [ARG...]
// Runs inside a benchmark root (through appliance/root enter, whose cost is
// thus never timed): runs PROGRAM with the environment it was given (the
// tool's: PATH alone) plus the usage library of usage.c preloaded, and prints
// one line:
//   <wall time in microseconds> <own CPU in microseconds> <peak RSS in KB> <children>
// The last three come from the usage library and are "-" when the program
// wrote none (a static program cannot load it). With --bare nothing is
// preloaded, so the wall time holds no cost of measuring. The wall time runs
// from before the fork to the end of the wait. Exits 1 when the program fails.
#define _GNU_SOURCE
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/wait.h>
#include <time.h>
#include <unistd.h>

#define USAGE_FILE "/opt/bench/usage.out"

static long long now_us(void) {
    struct timespec t;
    clock_gettime(CLOCK_MONOTONIC, &t);
    return t.tv_sec * 1000000LL + t.tv_nsec / 1000;
}

int main(int argc, char **argv) {
    int bare = argc > 1 && strcmp(argv[1], "--bare") == 0;
    argc -= bare;
    argv += bare;
    if (argc < 2) {
        fputs("usage: measure [--bare] PROGRAM [ARG...]\n", stderr);
        return 2;
    }
    unlink(USAGE_FILE);
    if (!bare && (setenv("LD_PRELOAD", "/opt/bench/usage.so", 1) != 0 || setenv("BENCH_USAGE_FILE", USAGE_FILE, 1) != 0)) {
        perror("measure");
        return 1;
    }

    long long started = now_us();
    pid_t pid = fork();
    if (pid == 0) {
        execv(argv[1], argv + 1);
        perror(argv[1]);
        _exit(127);
    }
    int status = 0;
    if (pid < 0 || waitpid(pid, &status, 0) != pid) {
        perror("measure");
        return 1;
    }
    long long wall_us = now_us() - started;
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
        fprintf(stderr, "measure: %s ended with status %d\n", argv[1], status);
        return 1;
    }

    char usage[128] = "- - -";
    FILE *file = fopen(USAGE_FILE, "r");
    if (file != NULL) {
        if (fgets(usage, sizeof usage, file) != NULL) usage[strcspn(usage, "\n")] = '\0';
        fclose(file);
    }
    printf("%lld %s\n", wall_us, usage);
    return 0;
}
