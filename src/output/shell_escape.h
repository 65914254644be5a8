// Backslash escaping for a shell command line: the one coding a text needs
// before it may stand in a command that the shell reads.
#ifndef DAVSYNC_OUTPUT_SHELL_ESCAPE_H
#define DAVSYNC_OUTPUT_SHELL_ESCAPE_H

#include <cstddef>

constexpr size_t SHELL_ESCAPE_INPUT_MAX = 512;

// Puts a backslash before each of: space # $ % & ' ( ) + ; < = > [ ] ^ ` { }
// and copies every other byte. The result goes into `out`, `width` bytes
// with its terminator. A text over 512 characters prints the one message
// and gives -1; a result that does not fit gives -1. `out` is unchanged on -1.
int escape_for_shell(const char *text, char *out, size_t width);

#endif
