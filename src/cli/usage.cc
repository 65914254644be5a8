#include "cli/usage.h"

#include <cstdio>

static const char USAGE_TEXT[] =
    "Error usage.\n"
    "Please give me :\n"
    "\t\"do    \" - add config from xml info.\n"
    "\t\"del   \" - delete setting by xml info.\n"
    "\t\"du    \" - delete user from xml info.\n"
    "\t\"get   \" - get share volume.\n"
    "\t\"merge \" - merge webdav setting from xml info.\n"
    "\t\"start \" - merge config and restart lighty.\n"
    "\t\"stop  \" - stop webdav function.\n"
    "\t\"p2pen \" - start p2p webdav share.\n"
    "\t\"amulen\" - start amule webdav share.\n"
    "\t\"chg\"    - change folder real link.\n";

void print_usage() {
    fputs(USAGE_TEXT, stdout);
    fflush(stdout);
}
