#include "base/text_field.h"

#include <cstdarg>
#include <cstdio>
#include <cstring>

static bool is_utf8_continuation(char c) { return (static_cast<unsigned char>(c) & 0xC0) == 0x80; }

int copy_text_prefix(char *field, size_t width, const char *text, size_t count) {
    if (field == nullptr || width == 0) return -1;
    if (text == nullptr) text = "";
    size_t length = strnlen(text, count);
    int result = 0;
    if (length > width - 1) {
        length = width - 1;
        // text[length] is the first byte left out; never split a character there.
        while (length > 0 && is_utf8_continuation(text[length])) --length;
        result = -1;
    }
    memmove(field, text, length);
    field[length] = '\0';
    return result;
}

int copy_text_field(char *field, size_t width, const char *text) {
    return copy_text_prefix(field, width, text, width);
}

int format_text_field(char *field, size_t width, const char *format, ...) {
    if (field == nullptr || width == 0) return -1;
    va_list args;
    va_start(args, format);
    int needed = vsnprintf(field, width, format, args);
    va_end(args);
    return (needed < 0 || static_cast<size_t>(needed) >= width) ? -1 : 0;
}
