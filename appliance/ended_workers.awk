# Reads the status page; prints "end PID" for each worker of an older
# generation whose request lies under a share named in `taken` (one name a
# line), and "wait PID" for one still reading a request. The scoreboard
# keeps the first 63 bytes of the request line, HTML- and log-escaped and
# URL-encoded as the client sent it: it is decoded before it is compared,
# and a path cut before its share name ends matches every taken share its
# visible part may begin. Our own status requests are left alone.
BEGIN {
    RS = "<tr>"
    for (i = 1; i < 256; i++) byte[sprintf("%02x", i)] = sprintf("%c", i)
    ntaken = split(taken, names, "\n")
}
NR == 1 { next }
function text(cell) { gsub(/<[^>]*>|\n/, "", cell); return cell }
function unescape(s,    out, c, i) {
    gsub(/&lt;/, "<", s); gsub(/&gt;/, ">", s); gsub(/&quot;/, "\"", s); gsub(/&amp;/, "\\&", s)
    out = ""
    for (i = 1; i <= length(s); i++) {
        c = substr(s, i, 1)
        if (c == "\\" && substr(s, i + 1, 1) == "x" && (tolower(substr(s, i + 2, 2)) in byte)) {
            out = out byte[tolower(substr(s, i + 2, 2))]; i += 3
        } else if (c == "\\" && i < length(s)) { out = out substr(s, i + 1, 1); i++ }
        else out = out c
    }
    return out
}
function url_decode(s, cut,    out, c, i) {
    out = ""
    for (i = 1; i <= length(s); i++) {
        c = substr(s, i, 1)
        if (c == "%" && (tolower(substr(s, i + 1, 2)) in byte)) { out = out byte[tolower(substr(s, i + 1, 2))]; i += 2 }
        else if (c == "%" && cut && i + 2 > length(s)) break
        else out = out c
    }
    return out
}
# Whether the request line reaches a taken share. Its path is resolved as
# the server does (slashes merged, dot segments applied); when the line is
# cut, a share name cut with it matches every taken name it begins.
function reaches(line,    cut, uri, n, segs, i, depth, first, open_end) {
    cut = length(line) >= 63
    if (!sub(/^[^ ]+ /, "", line)) return 0
    uri = line
    if (sub(/ .*/, "", uri)) cut = 0
    if (uri ~ /^[A-Za-z][A-Za-z0-9+.-]*:\/\//) { sub(/^[^:]*:\/\/[^\/]*/, "", uri); if (uri == "") return cut && ntaken }
    if (sub(/[?#].*/, "", uri)) cut = 0
    uri = url_decode(uri, cut)
    if (substr(uri, 1, 1) != "/") return 0
    n = split(uri, segs, "/")
    depth = 0
    for (i = 2; i <= n; i++) {
        if (segs[i] == "" || segs[i] == ".") continue
        if (segs[i] == "..") { if (depth > 0) depth--; continue }
        if (++depth == 1) { first = segs[i]; open_end = i == n }
    }
    if (depth == 0) return cut && ntaken
    for (i = 1; i <= ntaken; i++)
        if (first == names[i] || cut && open_end && index(names[i], first) == 1) return 1
    return 0
}
{
    n = split($0, cells, "</td>")
    if (n < 15) next
    split(text(cells[1]), srv, "-")
    pid = text(cells[2]); mode = text(cells[4]); host = text(cells[14])
    if (srv[2] + 0 >= current + 0 || pid !~ /^[0-9]+$/ || index(host, "status.invalid:") == 1) next
    if (mode == "R") print "wait", pid
    else if (reaches(unescape(text(cells[15])))) print "end", pid
}
