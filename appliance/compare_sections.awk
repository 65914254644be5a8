# Reads the new configuration, then the accepted one. Prints "known" as soon
# as the new one is read when every line of it has the form the tool writes
# (which the server parses), else "unknown"; then, one a line, the names of
# the shares the new one withdraws or narrows: gone, Dav On to Off, open to
# authenticated, or a name gone from the read or the write line. A section
# that cannot be read counts as narrowed, and a changed header narrows all.
function finish(    ok) {
    ok = complete && open == "" && dav != "" && (auth == "None" || auth == "Basic" && count == 2)
    if (FILENAME == ARGV[2]) {
        if (!ok || name in old_dav) odd[name]
        else { old_dav[name] = dav; old_auth[name] = auth; old_read[name] = users[1]; old_write[name] = users[2] }
    } else if (!ok || name in new_dav) { odd[name]; bad = 1 }
    else { new_dav[name] = dav; new_auth[name] = auth; new_read[name] = users[1]; new_write[name] = users[2] }
    state = "out"
}
# Whether every name of the old line is on the new one.
function kept(old, new,    n, i, list, have) {
    if (old == new) return 1
    split(new, list, " "); for (i in list) have[list[i]]
    n = split(old, list, " ")
    for (i = 1; i <= n; i++) if (!(list[i] in have)) return 0
    return 1
}
BEGIN {
    n = split("\tOptions FollowSymLinks|\tAllowOverride None|\tOrder Allow,Deny|\tAllow from all|" \
        "\tAuthName DAV-upload|\tAuthUserFile \"/etc/passwd.webdav\"|", lines, "|")
    for (i = 1; i <= n; i++) fixed[lines[i]] = ""
    # Each block opens only where none is open and closes only what is.
    fixed["\t<Limit GET HEAD PROPFIND OPTIONS>"] = "+Limit"
    fixed["\t<LimitExcept GET PROPFIND HEAD OPTIONS>"] = "+LimitExcept"
    fixed["\t</Limit>"] = "-Limit"
    fixed["\t</LimitExcept>"] = "-LimitExcept"
}
function verdict() {
    if (told++) return
    if (state != "out") { bad = 1; odd[name] }
    print bad ? "unknown" : "known"
    fflush()
}
FNR == 1 && FILENAME == ARGV[2] { verdict(); state = "out" }
BEGIN { state = "out" }
state == "out" && /^Alias "\/[^"]*" "[^"]*"$/ {
    split($0, quoted, "\"")
    name = substr(quoted[2], 2)
    complete = quoted[4] == "/usr/local/apache2_dav/webdav/" name && name != "" && name !~ /[$\/\\]/
    state = "alias"; dav = auth = open = ""; count = 0; delete users
    next
}
state == "out" {
    if (FILENAME == ARGV[1] && $0 !~ /^(DavLockDB "\/usr\/local\/apache2_dav\/var\/DavLock"|BrowserMatch "[^"\\$]*" redirect-carefully)?$/) bad = 1
    if ($0 != "") header[FILENAME] = header[FILENAME] $0 "\n"
    next
}
state == "alias" { complete = complete && $0 == "<Directory \"/usr/local/apache2_dav/webdav/" name "\">"; state = "body"; next }
# The server reads a user line as a string expression: no quoting, no
# variables.
substr($0, 1, 15) == "\t\tRequire user " && count < 2 && $0 !~ /["\\$%]/ &&
    !index(substr($0, 3), "\t") && substr($0, length($0)) == " " {
    users[++count] = substr($0, 16)
    next
}
$0 in fixed {
    block = fixed[$0]
    if (block != "") {
        if (substr(block, 1, 1) == "+") { complete = complete && open == ""; open = substr(block, 2) }
        else { complete = complete && open == substr(block, 2); open = "" }
    }
    next
}
$0 == "</Directory>" { finish(); next }
$0 == "\tDav On" || $0 == "\tDav Off" { dav = substr($0, 6); next }
$0 == "\tAuthType None" { auth = "None"; next }
$0 == "\tAuthType Basic" { auth = "Basic"; next }
{ complete = 0 }
END {
    if (!told) verdict()
    else if (state != "out") odd[name]
    all = header[ARGV[1]] != header[ARGV[2]]
    for (name in old_dav) {
        if (old_dav[name] != "On") continue
        if (all || name in odd || !(name in new_dav) || new_dav[name] != "On" ||
            old_auth[name] == "None" && new_auth[name] != "None" ||
            old_auth[name] == "Basic" && new_auth[name] == "Basic" &&
            !(kept(old_read[name], new_read[name]) && kept(old_write[name], new_write[name])))
            print name
    }
    for (name in odd) if (!(name in old_dav)) print name
}
