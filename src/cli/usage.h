#ifndef DAVSYNC_CLI_USAGE_H
#define DAVSYNC_CLI_USAGE_H

// The usage text, on standard output.
void print_usage();

#endif
