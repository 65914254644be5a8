// Shell command lines built from share names and paths.
#ifndef DAVSYNC_OUTPUT_SHELL_ESCAPE_H
#define DAVSYNC_OUTPUT_SHELL_ESCAPE_H

constexpr int SHELL_ESCAPE_INPUT_MAX = 512;

// Puts a backslash before each of: space # $ % & ' ( ) + ; < = > [ ] ^ ` { }.
// `out` is zero-filled by the caller and holds at least twice the text and
// a terminator.
// A text over 512 characters prints the one message and gives -1.
int escape_for_shell(const char *text, char *out);
// True when an escaped text holds nothing the shell would still interpret:
// no " \ | * ? ! ~ and no byte 0x01..0x1F or 0x7F.
bool is_shell_safe_escaped(const char *escaped);
// True when every character is one the shell takes literally: letters,
// digits, bytes 0x80 and above, and / . _ - + , : @ %.
bool is_shell_literal(const char *text);

#endif
