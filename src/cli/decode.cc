#include "cli/decode.h"

#include <cstring>

struct Entity {
    const char *text;
    char character;
};

static const Entity ENTITIES[] = {
    {"&amp;", '&'}, {"&gt;", '>'}, {"&lt;", '<'}, {"&nbsp;", ' '}, {"&quot;", '"'},
};

int decode_argument(const char *text, char *out) {
    char work[DECODE_WORK_WIDTH] = {};
    size_t length = 0;
    const char *at = text;
    while (*at != '\0' && length < DECODE_WORK_WIDTH - 1) {
        char decoded = *at;
        size_t consumed = 1;
        if (*at == '&') {
            for (const Entity &entity : ENTITIES) {
                size_t entity_length = strlen(entity.text);
                if (strncmp(at, entity.text, entity_length) == 0) {
                    decoded = entity.character;
                    consumed = entity_length;
                    break;
                }
            }
        }
        work[length++] = decoded;
        at += consumed;
    }
    memcpy(out, work, length);
    return *at == '\0' ? 0 : -1;
}

int decode_special_char(const char *text, char *out) {
    decode_argument(text, out);
    return 0;
}
