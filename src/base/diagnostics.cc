#include "base/diagnostics.h"

#include <cstdarg>
#include <cstring>
#include <syslog.h>

#include "base/text_field.h"

int note_failure(RunFailure *failure, const char *what, const char *where, int error) {
    if (failure->happened) return -1;
    failure->happened = true;
    failure->error = error;
    copy_text(failure->what, what);
    copy_text(failure->where, where != nullptr ? where : "");
    return -1;
}

static void open_log() { openlog("davsync", LOG_PID | LOG_NDELAY, LOG_DAEMON); }

void log_failure(const char *command, const RunFailure *failure, const char *outcome) {
    open_log();
    const char *space = failure->where[0] != '\0' ? " " : "";
    if (failure->error != 0)
        syslog(LOG_ERR, "%s: %s%s%s: %s; %s", command, failure->what, space, failure->where,
               strerror(failure->error), outcome);
    else
        syslog(LOG_ERR, "%s: %s%s%s; %s", command, failure->what, space, failure->where, outcome);
    closelog();
}

void log_event(int priority, const char *format, ...) {
    open_log();
    va_list args;
    va_start(args, format);
    vsyslog(priority, format, args);
    va_end(args);
    closelog();
}
