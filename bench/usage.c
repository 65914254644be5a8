// Preloaded into a measured program (LD_PRELOAD) and nowhere else. When the
// program exits it writes one line to the file named by BENCH_USAGE_FILE:
//   <own CPU in microseconds> <peak resident memory in KB> <children started>
// Own CPU is getrusage(RUSAGE_SELF) user + system time, so the children's
// time is never in it. Children are counted by wrapping the calls that start
// them. Both variables are taken out of the environment at load time, so the
// program and its children see the environment they would have seen anyway.
#define _GNU_SOURCE
#include <dlfcn.h>
#include <fcntl.h>
#include <spawn.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>
#include <sys/resource.h>
#include <sys/types.h>
#include <unistd.h>

static char usage_file[4096];
static pid_t measured_pid;
static unsigned long children;

// The real calls, looked up once so that counting adds nothing per child.
static __typeof__(&system) real_system;
static __typeof__(&fork) real_fork;
static __typeof__(&posix_spawn) real_posix_spawn;
static __typeof__(&posix_spawnp) real_posix_spawnp;
static __typeof__(&popen) real_popen;

__attribute__((constructor)) static void usage_begin(void) {
    real_system = (__typeof__(real_system))dlsym(RTLD_NEXT, "system");
    real_fork = (__typeof__(real_fork))dlsym(RTLD_NEXT, "fork");
    real_posix_spawn = (__typeof__(real_posix_spawn))dlsym(RTLD_NEXT, "posix_spawn");
    real_posix_spawnp = (__typeof__(real_posix_spawnp))dlsym(RTLD_NEXT, "posix_spawnp");
    real_popen = (__typeof__(real_popen))dlsym(RTLD_NEXT, "popen");
    const char *file = getenv("BENCH_USAGE_FILE");
    if (file != NULL && strlen(file) < sizeof usage_file) strcpy(usage_file, file);
    measured_pid = getpid();
    unsetenv("BENCH_USAGE_FILE");
    unsetenv("LD_PRELOAD");
}

// A forked child that returns from main runs this too; only the measured
// process may write.
__attribute__((destructor)) static void usage_end(void) {
    if (usage_file[0] == '\0' || getpid() != measured_pid) return;
    struct rusage self;
    if (getrusage(RUSAGE_SELF, &self) != 0) return;
    long long cpu_us = (self.ru_utime.tv_sec + self.ru_stime.tv_sec) * 1000000LL +
                       self.ru_utime.tv_usec + self.ru_stime.tv_usec;
    char line[128];
    int length = snprintf(line, sizeof line, "%lld %ld %lu\n", cpu_us, self.ru_maxrss, children);
    int fd = open(usage_file, O_WRONLY | O_CREAT | O_TRUNC | O_NOFOLLOW | O_CLOEXEC, 0644);
    if (fd < 0) return;
    if (write(fd, line, (size_t)length) != length) {}
    close(fd);
}

int system(const char *command) {
    ++children;
    return real_system(command);
}

pid_t fork(void) {
    pid_t pid = real_fork();
    if (pid > 0) ++children;
    return pid;
}

// A wrapper cannot return into a vfork child's borrowed stack, so the
// copy-on-write fork stands in for it; only the timing can differ.
pid_t vfork(void) { return fork(); }

int posix_spawn(pid_t *pid, const char *path, const posix_spawn_file_actions_t *actions,
                const posix_spawnattr_t *attributes, char *const argv[], char *const envp[]) {
    int result = real_posix_spawn(pid, path, actions, attributes, argv, envp);
    if (result == 0) ++children;
    return result;
}

int posix_spawnp(pid_t *pid, const char *file, const posix_spawn_file_actions_t *actions,
                 const posix_spawnattr_t *attributes, char *const argv[], char *const envp[]) {
    int result = real_posix_spawnp(pid, file, actions, attributes, argv, envp);
    if (result == 0) ++children;
    return result;
}

FILE *popen(const char *command, const char *mode) {
    FILE *stream = real_popen(command, mode);
    if (stream != NULL) ++children;
    return stream;
}
