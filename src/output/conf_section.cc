#include "output/conf_section.h"

#include <cstring>

#include "access/user_list.h"
#include "base/appliance_paths.h"
#include "base/text_field.h"
#include "output/link_dir.h"

bool is_conf_safe_name(const char *shared_name) {
    if (!is_link_name(shared_name)) return false;
    for (const char *c = shared_name; *c != '\0'; ++c) {
        unsigned char byte = static_cast<unsigned char>(*c);
        if (byte == '"' || byte == '\\' || byte < 0x20 || byte == 0x7F) return false;
    }
    return true;
}

// The tests read the raw list texts, not the expanded names.
static bool is_open_share(const ShareRecord *rules) {
    return strstr(rules->read_list, "allaccount") != nullptr ||
           strstr(rules->write_list, "allaccount") != nullptr ||
           strstr(rules->public_, "yes") != nullptr || rules->web_public == 1;
}

// Appends a name and its space at `used`; false, leaving the line as it
// was, when they do not fit.
static bool append_user(char (&line)[LINE_BUFFER_WIDTH], size_t *used, const char *name) {
    size_t length = strlen(name);
    if (*used + length + 1 > sizeof line - 1) return false;
    memcpy(line + *used, name, length);
    line[*used + length] = ' ';
    *used += length + 1;
    return true;
}

// Each name not refused (marked `refused`) is followed by one space; names
// that no longer fit the line are left off, the line stops at the last one
// that does.
static void write_user_line(FILE *conf, const GroupTable *groups, const NameArray *first,
                            const NameArray *second, unsigned refused) {
    char line[LINE_BUFFER_WIDTH];
    size_t used = 0;
    append_user(line, &used, "\t\tRequire user");
    const NameArray *lists[] = {first, second};
    bool full = false;
    for (const NameArray *list : lists)
        for (size_t i = 0; list != nullptr && i < list->count && !full; ++i)
            full = groups->marks[list->numbers[i]] != refused && !append_user(line, &used, list->names[i]);
    line[used] = '\n';
    fwrite(line, 1, used + 1, conf);
}

static int expand_field(GroupTable *groups, const char *list_text, NameArray *names) {
    if (list_text[0] != '\0') return expand_user_names(groups, list_text, names);
    *names = NameArray{};
    return 0;
}

// The readers and writers less the refused (invalid) users, whose numbers
// carry a mark of their own while the lines are written.
static int write_authenticated_block(FILE *conf, GroupTable *groups, const ShareRecord *rules) {
    NameArray invalid, readers, writers;
    int result = expand_field(groups, rules->read_list, &readers);
    result |= expand_field(groups, rules->write_list, &writers);
    result |= expand_field(groups, rules->invalid_users, &invalid);
    unsigned refused = new_name_mark(groups);
    for (size_t i = 0; i < invalid.count; ++i) groups->marks[invalid.numbers[i]] = refused;

    fputs("\tAuthType Basic\n"
          "\tAuthName DAV-upload\n"
          "\tAuthUserFile \"/etc/passwd.webdav\"\n"
          "\n"
          "\t<Limit GET HEAD PROPFIND OPTIONS>\n",
          conf);
    write_user_line(conf, groups, &readers, &writers, refused);
    fputs("\t</Limit>\n"
          "\n"
          "\t<LimitExcept GET PROPFIND HEAD OPTIONS>\n",
          conf);
    write_user_line(conf, groups, &writers, nullptr, refused);
    fputs("\t</LimitExcept>\n"
          "\n",
          conf);

    free_name_array(&invalid);
    free_name_array(&readers);
    free_name_array(&writers);
    return result == 0 ? 0 : -1;
}

int write_share_section(FILE *conf, GroupTable *groups, const char *shared_name, bool dav_on,
                        const ShareRecord *rules) {
    char line[LINE_BUFFER_WIDTH];
    format_text_field(line, sizeof line, "Alias \"/%s\" \"%s/%s\"\n", shared_name, LINK_DIR,
                      shared_name);
    fputs(line, conf);
    format_text_field(line, sizeof line, "<Directory \"%s/%s\">\n", LINK_DIR, shared_name);
    fputs(line, conf);
    fputs(dav_on ? "\tDav On\n" : "\tDav Off\n", conf);
    fputs("\tOptions FollowSymLinks\n"
          "\tAllowOverride None\n"
          "\tOrder Allow,Deny\n"
          "\tAllow from all\n",
          conf);
    int result = 0;
    if (rules == nullptr || is_open_share(rules))
        fputs("\tAuthType None\n", conf);
    else
        result = write_authenticated_block(conf, groups, rules);
    fputs("</Directory>\n"
          "\n",
          conf);
    return result;
}
