// The command front end: picks the command by its word (prefix rules, word
// counts), prepares its argument, calls it. Returns the exit status: 255 for
// a bad call, 0 once a command ran.
#ifndef DAVSYNC_CLI_DISPATCH_H
#define DAVSYNC_CLI_DISPATCH_H


int dispatch_command(int argc, char **argv);

#endif
