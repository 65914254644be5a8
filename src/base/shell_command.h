// Commands the tool hands to the system's shell. What the command itself
// answers is never examined: a failed command is as good as a skipped one.
#ifndef DAVSYNC_BASE_SHELL_COMMAND_H
#define DAVSYNC_BASE_SHELL_COMMAND_H

// 0 once the shell ran the line; -1 (errno) when no shell could be started.
int run_shell_command(const char *command_line);

#endif
