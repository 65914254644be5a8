#include "output/shell_escape.h"

#include <cstdio>
#include <cstring>

#include "base/text_field.h"

static const char SHELL_SPECIALS[] = " #$%&'()+;<=>[]^`{}";

static bool needs_backslash(char c) {
    return c != '\0' && strchr(SHELL_SPECIALS, c) != nullptr;
}

static bool is_control(unsigned char c) { return c < 0x20 || c == 0x7F; }

int escape_for_shell(const char *text, char *out) {
    size_t length = strlen(text);
    if (length > static_cast<size_t>(SHELL_ESCAPE_INPUT_MAX)) {
        printf("Can't process string lenghth bigger than 512.\n");
        return -1;
    }
    char work[2 * SHELL_ESCAPE_INPUT_MAX + 1] = {};
    for (const char *c = text; *c != '\0'; ++c) {
        char piece[3] = {};
        if (needs_backslash(*c)) {
            piece[0] = '\\';
            piece[1] = *c;
        } else {
            piece[0] = *c;
        }
        append_text(work, piece);
    }
    copy_text_field(out, strlen(work) + 1, work);
    return 0;
}

bool is_shell_safe_escaped(const char *escaped) {
    for (const char *c = escaped; *c != '\0'; ++c) {
        if (*c == '\\') {
            if (!needs_backslash(c[1])) return false;
            ++c;
            continue;
        }
        if (needs_backslash(*c) || strchr("\"|*?!~", *c) != nullptr) return false;
        if (is_control(static_cast<unsigned char>(*c))) return false;
    }
    return true;
}

static bool is_ascii_alnum(unsigned char c) {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9');
}

bool is_shell_literal(const char *text) {
    for (const char *c = text; *c != '\0'; ++c) {
        unsigned char byte = static_cast<unsigned char>(*c);
        if (byte >= 0x80 || is_ascii_alnum(byte)) continue;
        if (strchr("/._-+,:@%", *c) == nullptr) return false;
    }
    return true;
}
