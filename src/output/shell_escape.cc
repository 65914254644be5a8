#include "output/shell_escape.h"

#include <cstdio>
#include <cstring>

#include "base/text_field.h"

static const char SHELL_SPECIALS[] = " #$%&'()+;<=>[]^`{}";

static bool needs_backslash(char c) {
    return c != '\0' && strchr(SHELL_SPECIALS, c) != nullptr;
}

int escape_for_shell(const char *text, char *out, size_t width) {
    if (strnlen(text, SHELL_ESCAPE_INPUT_MAX + 1) > SHELL_ESCAPE_INPUT_MAX) {
        printf("Can't process string lenghth bigger than 512.\n");
        return -1;
    }
    char work[2 * SHELL_ESCAPE_INPUT_MAX + 1];
    size_t used = 0;
    for (const char *c = text; *c != '\0'; ++c) {
        if (needs_backslash(*c)) work[used++] = '\\';
        work[used++] = *c;
    }
    work[used] = '\0';
    if (used >= width) return -1;
    return copy_text_field(out, width, work);
}
