#include "cli/dispatch.h"

#include <cstring>
#include <unistd.h>

#include "base/appliance_paths.h"
#include "base/text_field.h"
#include "cli/decode.h"
#include "cli/usage.h"
#include "commands/chg.h"
#include "commands/del.h"
#include "commands/del_user.h"
#include "commands/do_merge.h"
#include "commands/download_share.h"
#include "commands/get.h"
#include "cycle/start_stop.h"

static const int BAD_CALL = 255;

static int bad_call() {
    print_usage();
    return BAD_CALL;
}

static bool begins_with(const char *word, const char *command) {
    return strncmp(word, command, strlen(command)) == 0;
}

// Zero-fills the area and decodes the argument into it; false when the
// decoded text would not fit whole.
static bool decode_into_area(const char *argument, char *area) {
    memset(area, 0, LINE_BUFFER_WIDTH);
    return strlen(argument) < LINE_BUFFER_WIDTH && decode_argument(argument, area) == 0;
}

// A volume directory gains its '/', a volume root stays, any other path
// loses one trailing '/'.
static void normalise_trailing_slash(char *path) {
    size_t length = strlen(path);
    if (length == VOLUME_PREFIX_LENGTH)
        append_volume_root_slash(path, LINE_BUFFER_WIDTH);
    else if (length != VOLUME_PREFIX_LENGTH + 1 && length > 0 && path[length - 1] == '/')
        path[length - 1] = '\0';
}

static int run_get(int words, char **argv) {
    char area[LINE_BUFFER_WIDTH];
    if (words != 2 || !decode_into_area(argv[2], area)) return bad_call();
    webdav_get(area);
    return 0;
}

static int run_del_user(int words, char **argv) {
    char area[LINE_BUFFER_WIDTH];
    if (words != 2 || format_text_field(area, sizeof area, "#%s#", argv[2]) != 0) return bad_call();
    webdav_del_user(area);
    return 0;
}

static int run_del(int words, char **argv) {
    char area[LINE_BUFFER_WIDTH];
    if (words != 2 || !decode_into_area(argv[2], area)) return bad_call();
    normalise_trailing_slash(area);
    webdav_del(area);
    return 0;
}

static int run_do_merge(int words, char **argv, int merge) {
    if (words != 2) return bad_call();
    if (access(argv[2], R_OK) != 0) return BAD_CALL;  // silently: the caller checks the file
    char area[LINE_BUFFER_WIDTH];
    if (!decode_into_area(argv[2], area)) return bad_call();
    webdav_do_merge(area, merge);
    return 0;
}

int dispatch_command(int argc, char **argv) {
    int words = argc - 1;
    if (words < 1) return bad_call();
    const char *word = argv[1];
    if (begins_with(word, "start")) {
        webdav_start();
        return 0;
    }
    if (begins_with(word, "gu")) return 0;
    if (begins_with(word, "get")) return run_get(words, argv);
    if (begins_with(word, "du")) return run_del_user(words, argv);
    if (begins_with(word, "del")) return run_del(words, argv);
    if (begins_with(word, "stop")) {
        if (words != 1) return bad_call();
        webdav_stop();
        return 0;
    }
    if (begins_with(word, "reset")) return words == 1 ? 0 : bad_call();
    if (begins_with(word, "do")) return run_do_merge(words, argv, 0);
    if (begins_with(word, "merge")) return run_do_merge(words, argv, 1);
    if (begins_with(word, "p2pen")) {
        if (words != 1) return bad_call();
        webdav_p2p_share();
        return 0;
    }
    if (begins_with(word, "amulen")) {
        if (words != 1) return bad_call();
        webdav_amule_share();
        return 0;
    }
    if (strcmp(word, "chg") == 0 && words == 3) {
        webdav_chg(argv[2], argv[3]);
        return 0;
    }
    return bad_call();
}
