// Symbols the appliance's libraries loaded with the tool expect to find in
// the executable.
#include <cstdio>
#include <cstring>

extern "C" {

unsigned char bitmap[256];

char *itoa(int value) {
    static char text[32];
    memset(text, 0, sizeof text);
    snprintf(text, sizeof text, "%d", value);
    return text;
}
}
