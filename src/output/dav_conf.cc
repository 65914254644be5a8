#include "output/dav_conf.h"

#include "output/conf_section.h"

bool entry_is_on(int webdav_enable, const DavShareEntry *entry) {
    return webdav_enable != 0 && entry->enable != 0;
}

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

static void write_entry(ConfBuild *build, int webdav_enable, const DavShareEntry *entry,
                        const ShareLookup *catalogue) {
    if (entry->path[0] == '\0' || !is_conf_safe_name(entry->shared_name)) return;
    if (publish_name(build, entry->shared_name) < 0) return;
    const ShareRecord *share = find_entry_share(catalogue, entry, true);
    if (share == nullptr) return;
    bool on = entry_is_on(webdav_enable, entry);
    if (write_share_section(build->conf.stream, &build->groups, entry->shared_name, on, share) != 0)
        build->failed = true;
    // The link points at the entry's own path, not the share's.
    if (on && request_link(&build->links, entry->shared_name, entry->path) != 0) build->failed = true;
}

void write_dav_conf(ConfBuild *build, int webdav_enable, const DavShareEntry *entries,
                    const ShareLookup *catalogue) {
    write_header(build->conf.stream);
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next)
        write_entry(build, webdav_enable, entry, catalogue);
}
