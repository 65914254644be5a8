// Bounded text fields. Every fixed-width text field and buffer of the tool is
// filled through these helpers: they never write past the width (which counts
// the terminating NUL) and always terminate. A text that must be cut is cut
// at a UTF-8 character boundary, so a cut name is still valid text.
// Each returns 0 when the whole text fit and -1 when it did not.
#ifndef DAVSYNC_BASE_TEXT_FIELD_H
#define DAVSYNC_BASE_TEXT_FIELD_H

#include <cstddef>

int copy_text_field(char *field, size_t width, const char *text);
// Copies at most `count` characters of `text`.
int copy_text_prefix(char *field, size_t width, const char *text, size_t count);
// printf into the field; on -1 the field holds nothing usable.
int format_text_field(char *field, size_t width, const char *format, ...)
    __attribute__((format(printf, 3, 4)));

// Width taken from the array type, so a caller cannot pass a wrong one.
template <size_t N> int copy_text(char (&field)[N], const char *text) {
    return copy_text_field(field, N, text);
}

#endif
