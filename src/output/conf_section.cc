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

static NameNode *expand_field(GroupTable *groups, const char *list_text) {
    NameNode *names = nullptr;
    if (list_text[0] != '\0') expand_user_list_with(groups, list_text, &names);
    return names;
}

static void remove_invalid(NameNode *names, const NameIndex *invalid) {
    for (NameNode *node = names; node != nullptr; node = node->next)
        if (node->name[0] != '\0' && name_index_find(invalid, node->name) != nullptr)
            memset(node->name, 0, sizeof node->name);
}

static void index_names(NameIndex *index, NameNode *names) {
    for (NameNode *node = names; node != nullptr; node = node->next)
        if (node->name[0] != '\0') (void)name_index_add(index, node->name, node);
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

// Each name is followed by one space; names that no longer fit the line are
// left off, the line stops at the last one that does.
static void write_user_line(FILE *conf, const NameNode *first, const NameNode *second) {
    char line[LINE_BUFFER_WIDTH];
    size_t used = 0;
    append_user(line, &used, "\t\tRequire user");
    const NameNode *lists[] = {first, second};
    bool full = false;
    for (const NameNode *list : lists)
        for (const NameNode *node = list; node != nullptr && !full; node = node->next)
            full = node->name[0] != '\0' && !append_user(line, &used, node->name);
    line[used] = '\n';
    fwrite(line, 1, used + 1, conf);
}

static void write_authenticated_block(FILE *conf, GroupTable *groups, const ShareRecord *rules) {
    NameNode *invalid = expand_field(groups, rules->invalid_users);
    NameNode *readers = expand_field(groups, rules->read_list);
    NameNode *writers = expand_field(groups, rules->write_list);
    NameIndex invalid_names = {};
    index_names(&invalid_names, invalid);
    remove_invalid(readers, &invalid_names);
    remove_invalid(writers, &invalid_names);
    name_index_free(&invalid_names);

    fputs("\tAuthType Basic\n"
          "\tAuthName DAV-upload\n"
          "\tAuthUserFile \"/etc/passwd.webdav\"\n"
          "\n"
          "\t<Limit GET HEAD PROPFIND OPTIONS>\n",
          conf);
    write_user_line(conf, readers, writers);
    fputs("\t</Limit>\n"
          "\n"
          "\t<LimitExcept GET PROPFIND HEAD OPTIONS>\n",
          conf);
    write_user_line(conf, writers, nullptr);
    fputs("\t</LimitExcept>\n"
          "\n",
          conf);

    free_name_list(invalid);
    free_name_list(readers);
    free_name_list(writers);
}

void write_share_section(FILE *conf, GroupTable *groups, const char *shared_name, bool dav_on,
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
    if (rules == nullptr || is_open_share(rules))
        fputs("\tAuthType None\n", conf);
    else
        write_authenticated_block(conf, groups, rules);
    fputs("</Directory>\n"
          "\n",
          conf);
}
