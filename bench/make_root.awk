# Writes the data of a benchmark appliance root: awk -v root=DIR -v shares=N
#   400 users, 25 groups of 80 members (each user in 5 groups);
#   shares 1..N+1 on three volumes in turn, each reading to 10 users and 3
#   groups and writing to 4 users and 1 group; every tenth name has spaces;
#   the volumes' WebDAV lists publish shares 1..N, enabled; share N+1 is in
#   the catalogue only, and new_share.xml offers it to "do";
#   get.path names share N for "get";
#   start.lines, do.lines and stop.lines hold the command lines those
#   commands run through the shell for this root, in order.
# Prints the share folders, one a line, for the caller to create.

function user(k) { return sprintf("user%03d", k % USERS + 1) }
function group(k) { return sprintf("team%02d", k % GROUPS + 1) }
function share_name(i) { return i % 10 == 0 ? sprintf("Team Share %04d", i) : sprintf("share%04d", i) }
function volume(i) { return (i - 1) % 3 + 1 }
function volume_dir(v) { return "/mnt/HD/HD_" substr("abc", v, 1) "2" }
function share_path(i) { return volume_dir(volume(i)) "/" share_name(i) }

function read_list(i,    k, text) {
    for (k = 0; k < 10; k++) text = text "#" user(i * 7 + k * 37) "#,"
    return text "#@" group(i) "#,#@" group(i + 8) "#,#@" group(i + 16) "#"
}

function write_list(i,    k, text) {
    for (k = 0; k < 4; k++) text = text "#" user(i * 11 + k * 53 + 5) "#,"
    return text "#@" group(i + 4) "#"
}

# Backslash before each character the tool escapes for the shell.
function shell_escaped(text) {
    gsub(/[] #$%&'()+;<=>[^`{}]/, "\\\\&", text)
    return text
}

function list_head(file, count) {
    printf "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config>\n\t<WebDAV>\n" > file
    printf "\t\t<count>%d</count>\n\t\t<allen>1</allen>\n", count > file
}

function list_item(file, name, path) {
    printf "\t\t\t<item>\n\t\t\t\t<shared_name>%s</shared_name>\n\t\t\t\t<path>%s</path>\n", name, path > file
    printf "\t\t\t\t<RW>1</RW>\n\t\t\t\t<enable>1</enable>\n\t\t\t</item>\n" > file
}

function list_tail(file) {
    printf "\t</WebDAV>\n</config>\n" > file
    close(file)
}

function link_line(file, i) {
    print "ln -s " shell_escaped(share_path(i)) " /usr/local/apache2_dav/webdav/" shell_escaped(share_name(i)) > file
}

# The links in entry-list order: volume by volume, each list in file order;
# `inserted` (0 for none) comes first in its volume, where "do" puts it.
function link_lines(file, inserted,    v, i) {
    for (v = 1; v <= 3; v++) {
        if (inserted && volume(inserted) == v) link_line(file, inserted)
        for (i = v; i <= shares; i += 3) link_line(file, i)
    }
}

BEGIN {
    USERS = 400
    GROUPS = 25
    GROUP_SIZE = 80
    REMOVE_LINKS = "rm /usr/local/apache2_dav/webdav/* > /dev/null 2>&1"
    PLACE_CONF = "mv /tmp/dav.conf /usr/local/apache2_dav/conf/extra/httpd-dav.conf"

    passwd = root "/etc/passwd"
    print "root:x:0:0:root:/root:/bin/sh" > passwd
    for (u = 0; u < USERS; u++) printf "%s:x:%d:%d::/home/%s:/bin/sh\n", user(u), 1001 + u, 1001 + u, user(u) > passwd
    close(passwd)

    groups = root "/etc/group"
    print "root:x:0:" > groups
    for (g = 0; g < GROUPS; g++) {
        members = ""
        for (k = 0; k < GROUP_SIZE; k++) members = members (k ? "," : "") user(g * 16 + k)
        printf "%s:x:%d:%s\n", group(g), 2001 + g, members > groups
    }
    close(groups)

    catalogue = root "/var/www/xml/smb.xml"
    printf "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<config><samba>" > catalogue
    for (i = 1; i <= shares + 1; i++) {
        printf "<item><name>%s</name><path>%s</path><read_list>%s</read_list><write_list>%s</write_list></item>", share_name(i), share_path(i), read_list(i), write_list(i) > catalogue
        print share_path(i)
    }
    printf "</samba></config>\n" > catalogue
    close(catalogue)

    for (v = 1; v <= 3; v++) {
        list = root volume_dir(v) "/.system_data/lighty.xml"
        count = 0
        for (i = v; i <= shares; i += 3) count++
        list_head(list, count)
        for (i = v; i <= shares; i += 3) list_item(list, share_name(i), "/" share_name(i))
        list_tail(list)
    }

    new_share = root "/opt/bench/new_share.xml"
    list_head(new_share, 1)
    list_item(new_share, share_name(shares + 1), share_path(shares + 1))
    list_tail(new_share)

    print share_path(shares) > (root "/opt/bench/get.path")

    start = root "/opt/bench/start.lines"
    print "touch /tmp/corvane_start_lock" > start
    print REMOVE_LINKS > start
    print REMOVE_LINKS > start
    link_lines(start, 0)
    print PLACE_CONF > start
    print "apache restart dav" > start

    do_lines = root "/opt/bench/do.lines"
    print REMOVE_LINKS > do_lines
    print REMOVE_LINKS > do_lines
    link_lines(do_lines, shares + 1)
    print PLACE_CONF > do_lines
    print "apache restart dav" > do_lines

    stop = root "/opt/bench/stop.lines"
    print REMOVE_LINKS > stop
    print REMOVE_LINKS > stop
    print REMOVE_LINKS > stop
    print PLACE_CONF > stop
    print "apache stop dav" > stop
}
