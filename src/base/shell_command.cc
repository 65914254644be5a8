#include "base/shell_command.h"

#include <cstdio>
#include <cstdlib>

int run_shell_command(const char *command_line) {
    // Anything still buffered would otherwise be written twice by the child.
    fflush(nullptr);
    return system(command_line) == -1 ? -1 : 0;
}
