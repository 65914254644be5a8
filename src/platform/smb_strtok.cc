#include "platform/smb_strtok.h"

#include <cstring>

char *smb_strtok(char *text, const char *delimiters) {
    static char *position = nullptr;
    if (text != nullptr) position = text;
    if (position == nullptr) return nullptr;
    position += strspn(position, delimiters);
    if (*position == '\0') {
        position = nullptr;
        return nullptr;
    }
    char *token = position;
    position += strcspn(position, delimiters);
    if (*position != '\0') *position++ = '\0';
    else position = nullptr;
    return token;
}
