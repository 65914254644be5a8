#include "output/dav_conf.h"

#include "output/conf_section.h"

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
    // Registered even when no share matches, so USB volumes cannot take it.
    if (publish_name(build, entry->shared_name) < 0) return;
    const ShareRecord *share = find_entry_share(catalogue, entry, true);
    if (share == nullptr) return;
    write_share_section(build->conf, &build->groups, entry->shared_name,
                        webdav_enable != 0 && entry->enable != 0, share);
    // The link points at the entry's own path, not the share's.
    if ((webdav_enable & entry->enable) != 0)
        request_link(&build->links, entry->shared_name, entry->path);
}

void write_dav_conf(ConfBuild *build, int webdav_enable, const DavShareEntry *entries,
                    const ShareLookup *catalogue) {
    write_header(build->conf);
    for (const DavShareEntry *entry = entries; entry != nullptr; entry = entry->next)
        write_entry(build, webdav_enable, entry, catalogue);
}
