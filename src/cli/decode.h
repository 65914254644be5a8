// Argument text decoding: &amp; &gt; &lt; &nbsp; &quot; become & > < space ",
// in one pass; anything else passes through unchanged.
#ifndef DAVSYNC_CLI_DECODE_H
#define DAVSYNC_CLI_DECODE_H

constexpr int DECODE_WORK_WIDTH = 1024;

// Writes the decoded text into `out` without a terminator (the caller
// zero-fills it; it must hold DECODE_WORK_WIDTH characters). The result is
// cut at 1,023 characters. Always 0.
int decode_special_char(const char *text, char *out);
// The same, but -1 when the decoded text would have been cut (out then holds
// the cut text).
int decode_argument(const char *text, char *out);

#endif
