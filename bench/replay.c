// replay FILE: runs every line of FILE through the shell, one system() call
// each, in order, as the tool runs its command lines. Exit statuses are not
// examined, as the tool does not examine them either.
#define _GNU_SOURCE
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

int main(int argc, char **argv) {
    if (argc != 2) {
        fputs("usage: replay FILE\n", stderr);
        return 2;
    }
    FILE *lines = fopen(argv[1], "r");
    if (lines == NULL) {
        perror(argv[1]);
        return 1;
    }
    char *line = NULL;
    size_t capacity = 0;
    ssize_t length;
    while ((length = getline(&line, &capacity, lines)) > 0) {
        if (line[length - 1] == '\n') line[length - 1] = '\0';
        if (line[0] != '\0') system(line);
    }
    free(line);
    fclose(lines);
    return 0;
}
