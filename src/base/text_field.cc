#include "base/text_field.h"

#include <cstdarg>
#include <cstdio>
#include <cstring>

// Writes at most `count` characters of text and a terminator; the length
// written, with *cut set when the text had to be shortened.
static size_t write_terminated(char *field, size_t width, const char *text, size_t count, int *cut) {
    if (text == nullptr) text = "";
    size_t length = strnlen(text, count);
    *cut = 0;
    if (length > width - 1) {
        length = width - 1;
        *cut = -1;
    }
    memmove(field, text, length);
    field[length] = '\0';
    return length;
}

int copy_text_prefix(char *field, size_t width, const char *text, size_t count) {
    if (field == nullptr || width == 0) return -1;
    int cut;
    size_t length = write_terminated(field, width, text, count, &cut);
    memset(field + length, 0, width - length);
    return cut;
}

int store_text_field(char *field, size_t width, const char *text) {
    if (field == nullptr || width == 0) return -1;
    int cut;
    write_terminated(field, width, text, width, &cut);
    return cut;
}

int copy_text_field(char *field, size_t width, const char *text) {
    return copy_text_prefix(field, width, text, width);
}

int append_text_field(char *field, size_t width, const char *text) {
    if (field == nullptr || width == 0) return -1;
    size_t used = strnlen(field, width - 1);
    size_t length = strlen(text);
    if (length > width - 1 - used) return -1;
    memcpy(field + used, text, length);
    memset(field + used + length, 0, width - used - length);
    return 0;
}

int format_text_field(char *field, size_t width, const char *format, ...) {
    if (field == nullptr || width == 0) return -1;
    memset(field, 0, width);
    va_list args;
    va_start(args, format);
    int needed = vsnprintf(field, width, format, args);
    va_end(args);
    return (needed < 0 || static_cast<size_t>(needed) >= width) ? -1 : 0;
}
