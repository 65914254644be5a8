// Commands the tool hands to the system's shell. Their exit status is never
// examined: a failed command is as good as a skipped one.
#ifndef DAVSYNC_BASE_SHELL_COMMAND_H
#define DAVSYNC_BASE_SHELL_COMMAND_H

void run_shell_command(const char *command_line);

#endif
