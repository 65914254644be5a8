// What the tool tells: it prints nothing but its usage text, so every failure
// and every refusal is one line in the system log (syslog(3), facility
// LOG_DAEMON, identity "davsync"). A normal run logs nothing.
//
// A run keeps the first thing that stopped it in a RunFailure; its failure
// exit logs that one line, naming what, where, the system error and what was
// left undone. Refusals and repairs that let the run go on are logged at once
// with log_event.
#ifndef DAVSYNC_BASE_DIAGNOSTICS_H
#define DAVSYNC_BASE_DIAGNOSTICS_H

struct RunFailure {
    bool happened;
    int error;          // errno; 0 when the data itself is the reason
    char what[96];      // "cannot read", "no data volume is mounted", ...
    char where[4096];   // a path, or ""
};

// Keeps the first failure of the run; later ones add nothing (they follow
// from it or would be told by the next run). Always returns -1, so a reader
// can end with `return note_failure(...)`.
int note_failure(RunFailure *failure, const char *what, const char *where, int error);
// "COMMAND: WHAT WHERE: ERROR; OUTCOME", at priority LOG_ERR.
void log_failure(const char *command, const RunFailure *failure, const char *outcome);
// One line at the given priority (LOG_WARNING for a refusal, LOG_NOTICE for
// a repair), printf-style.
void log_event(int priority, const char *format, ...) __attribute__((format(printf, 2, 3)));

#endif
