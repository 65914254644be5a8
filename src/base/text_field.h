// Bounded text fields. Every fixed-width text field and buffer of the tool is
// filled through these helpers: they never write past the width (which counts
// the terminating NUL), always terminate, and zero-fill what is left.
// Each returns 0 when the whole text fit and -1 when it had to be cut.
#ifndef DAVSYNC_BASE_TEXT_FIELD_H
#define DAVSYNC_BASE_TEXT_FIELD_H

#include <cstddef>

int copy_text_field(char *field, size_t width, const char *text);
// Copies at most `count` characters of `text`.
int copy_text_prefix(char *field, size_t width, const char *text, size_t count);
// Appends `text` behind the text already in the field; on -1 the field is
// left exactly as it was (nothing partial is appended).
int append_text_field(char *field, size_t width, const char *text);
// For a field known to be zero-filled already: writes the text and its
// terminator only, so the untouched rest of a large field is never paged in.
int store_text_field(char *field, size_t width, const char *text);
int format_text_field(char *field, size_t width, const char *format, ...)
    __attribute__((format(printf, 3, 4)));

// Width taken from the array type, so a caller cannot pass a wrong one.
template <size_t N> int copy_text(char (&field)[N], const char *text) {
    return copy_text_field(field, N, text);
}
template <size_t N> int append_text(char (&field)[N], const char *text) {
    return append_text_field(field, N, text);
}

#endif
