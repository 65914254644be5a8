#include "output/dav_conf.h"

#include <cstring>

#include "base/shell_command.h"
#include "base/text_field.h"
#include "output/conf_writer.h"
#include "output/shell_escape.h"

static const int ESCAPED_PATH_WIDTH = 1024;
static const int ESCAPED_NAME_WIDTH = 512;
static const int LINK_PATH_WIDTH = 512;

static void write_header(FILE *conf) {
    fputs("DavLockDB \"/usr/local/apache2_dav/var/DavLock\"\n"
          "BrowserMatch \"Microsoft Data Access Internet Publishing Provider\" "
          "redirect-carefully\n"
          "BrowserMatch \"MS FrontPage\" redirect-carefully\n"
          "BrowserMatch \"^WebDrive\" redirect-carefully\n"
          "BrowserMatch \"^WebDAVFS/1.[0123]\" redirect-carefully\n"
          "BrowserMatch \"^gnome-vfs/1.0\" redirect-carefully\n"
          "BrowserMatch \"^XML Spy\" redirect-carefully\n"
          "BrowserMatch \"^Dreamweaver-WebDAV-SCM1\" redirect-carefully\n"
          "\n",
          conf);
}

// Links of the previous run go; the directory is made when missing.
static void prepare_link_dir() {
    if (path_exists(DAV_LINK_DIR))
        run_shell_command("rm /usr/local/apache2_dav/webdav/* > /dev/null 2>&1");
    else
        run_shell_command("mkdir -p /usr/local/apache2_dav/webdav");
}

// The escaped texts still go to the shell: any character the escaping
// leaves live keeps the link from being made at all.
static void make_link(const DavShareEntry *entry) {
    if (!is_link_name(entry->shared_name)) return;
    char link_path[LINK_PATH_WIDTH];
    if (format_text_field(link_path, sizeof link_path, "%s/%s", DAV_LINK_DIR,
                          entry->shared_name) < 0)
        return;
    char escaped_path[ESCAPED_PATH_WIDTH] = {};
    char escaped_name[ESCAPED_NAME_WIDTH] = {};
    if (escape_for_shell(entry->path, escaped_path) < 0 ||
        escape_for_shell(entry->shared_name, escaped_name) < 0)
        return;
    if (!is_shell_safe_escaped(escaped_path) || !is_shell_safe_escaped(escaped_name)) return;
    if (path_exists(link_path)) return;
    char command[CONF_LINE_WIDTH];
    if (format_text_field(command, sizeof command, "ln -s %s /usr/local/apache2_dav/webdav/%s",
                          escaped_path, escaped_name) < 0)
        return;
    run_shell_command(command);
}

static void write_entry(FILE *conf, int webdav_enable, const DavShareEntry *entry,
                        PathNode *published, const ShareRecord *catalogue) {
    if (entry->path[0] == '\0' || !is_conf_safe_name(entry->shared_name)) return;
    // Registered even when no share matches, so USB volumes cannot take it.
    if (path_list_add(entry->shared_name, published) < 0) return;
    const ShareRecord *share = find_entry_share(entry, catalogue, true);
    if (share == nullptr) return;
    write_share_section(conf, entry->shared_name, webdav_enable != 0 && entry->enable != 0, share);
    if ((webdav_enable & entry->enable) != 0) make_link(entry);
}

int write_dav_conf(int webdav_enable, const DavShareEntry *entries, PathNode *published,
                   const ShareRecord *catalogue) {
    if (path_exists(DAV_CONF_FILE)) return -1;
    FILE *conf = open_locked(DAV_CONF_FILE, "a");
    if (conf == nullptr) return -1;
    write_header(conf);
    prepare_link_dir();
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next)
        write_entry(conf, webdav_enable, entry, published, catalogue);
    close_locked(conf);
    return 0;
}

