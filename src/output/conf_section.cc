#include "output/conf_section.h"

#include <cstring>

#include "access/user_list.h"
#include "base/appliance_paths.h"
#include "base/text_field.h"

static const int USER_PIECE_WIDTH = 128;

bool is_conf_safe_name(const char *shared_name) {
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

static NameNode *expand_field(const char *list_text) {
    NameNode *names = nullptr;
    if (list_text[0] != '\0') expand_user_list(list_text, &names);
    return names;
}

static void remove_invalid(NameNode *names, const NameNode *invalid) {
    for (NameNode *node = names; node != nullptr; node = node->next)
        if (node->name[0] != '\0' && name_list_holds(invalid, node->name))
            memset(node->name, 0, sizeof node->name);
}

// Each name is followed by one space; names that no longer fit are left
// off, the line stops at the last one that does.
static void write_user_line(FILE *conf, const NameNode *first, const NameNode *second) {
    char line[LINE_BUFFER_WIDTH];
    copy_text(line, "\t\tRequire user ");
    const NameNode *lists[] = {first, second};
    bool full = false;
    for (const NameNode *list : lists) {
        for (const NameNode *node = list; node != nullptr && !full; node = node->next) {
            if (node->name[0] == '\0') continue;
            char piece[USER_PIECE_WIDTH];
            format_text_field(piece, sizeof piece, "%s ", node->name);
            full = append_text(line, piece) < 0;
        }
    }
    fputs(line, conf);
    fputs("\n", conf);
}

static void write_authenticated_block(FILE *conf, const ShareRecord *rules) {
    NameNode *invalid = expand_field(rules->invalid_users);
    NameNode *readers = expand_field(rules->read_list);
    NameNode *writers = expand_field(rules->write_list);
    remove_invalid(readers, invalid);
    remove_invalid(writers, invalid);

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

void write_share_section(FILE *conf, const char *shared_name, bool dav_on,
                         const ShareRecord *rules) {
    char line[LINE_BUFFER_WIDTH];
    format_text_field(line, sizeof line, "Alias \"/%s\" \"/usr/local/apache2_dav/webdav/%s\"\n",
                      shared_name, shared_name);
    fputs(line, conf);
    format_text_field(line, sizeof line, "<Directory \"/usr/local/apache2_dav/webdav/%s\">\n",
                      shared_name);
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
        write_authenticated_block(conf, rules);
    fputs("</Directory>\n"
          "\n",
          conf);
}
