#!/bin/bash
# The tool's configuration served by a real Apache 2.4 through appliance/apache
# and reached by real clients, in a throw-away demo appliance (with two more
# shares whose names the configuration cannot carry: one would break the
# file, one would name the server root).
#   real_server.sh access|litmus|rclone|restarts|broken|churn DAVSYNC
# Status 77 (skipped) when not root.
set -uo pipefail
((EUID == 0)) || { echo "the real-server tests need root: skipped"; exit 77; }
source "$(dirname "${BASH_SOURCE[0]}")/../../appliance/appliance.sh"
# Changes under load, at a size for CI (latency bounded loosely: the tool is
# built with sanitizers); scripts/churn alone runs the full size.
[[ $1 != churn ]] ||
    exec "$appliance_repo/scripts/churn" --shares 0 --changes 3 --mb 32 --check --latency 1000 --davsync "$2"

port=$(free_port)
root=$(appliance_new "$2" "$port")
work=$(mktemp -d)
trap 'rm -rf "$work"; appliance_remove "$root" || exit 1' EXIT
demo_appliance "$root" $'Say"Hi|/mnt/HD/HD_a2/SayHi||||yes|\n../../..|/mnt/HD/HD_a2/Up||||yes|' \
    $'Say"Hi|/SayHi|1|1\n../../..|/Up|1|1'
url=http://127.0.0.1:$port
conf=$root$appliance_server_root/conf/extra/httpd-dav.conf
failures=0

expect() {  # WHAT EXPECTED ACTUAL
    [[ $2 == "$3" ]] && return
    echo "FAILED: $1"
    diff <(echo "$2") <(echo "$3") | sed 's/^/  /'
    failures=$((failures + 1))
}
davsync() {
    local out
    out=$(appliance_run "$root" davsync "$@" 2>&1)
    expect "davsync $*: status 0, nothing printed" "0 " "$? $out"
}
apache() { appliance_run "$root" apache "$@"; }
public() { access_codes "$url/Public"; }

# Rows: share, then list/read/write for anonymous | alice (reader) |
# carol (writer) | mallory (invalid).
case_access() {
    davsync start
    expect "access after start" "\
Public 207 200 201 | 207 200 201 | 207 200 201 | 207 200 201
Team 401 401 401 | 207 200 401 | 207 200 201 | 401 401 401
Sealed 401 401 401 | 401 401 401 | 401 401 401 | 401 401 401
Archive 403 403 403 | 403 403 403 | 403 403 403 | 403 403 403
Photos 403 403 403 | 403 403 403 | 403 403 403 | 403 403 403
Disc 207 200 201 | 207 200 201 | 207 200 201 | 207 200 201
usbdisk1 207 200 201 | 207 200 201 | 207 200 201 | 207 200 201
Say\"Hi 403 403 403 | 403 403 403 | 403 403 403 | 403 403 403
/ 403 403 403 | 403 403 403 | 403 403 403 | 403 403 403" \
        "$(access_matrix "$port" Public Team Sealed Archive Photos Disc usbdisk1 'Say"Hi' '')"
    share_list_items >"$root/tmp/publish.xml" <<<"Photos|/mnt/HD/HD_b2/Photos|1|1"
    davsync do /tmp/publish.xml
    davsync del /mnt/HD/HD_a2/Public
    expect "access after do Photos and del Public" "\
Photos 401 401 401 | 207 200 401 | 207 200 201 | 401 401 401
Public 403 403 403 | 403 403 403 | 403 403 403 | 403 403 403" \
        "$(access_matrix "$port" Photos Public)"
    appliance_switch "$root" 0
    davsync start
    expect "WebDAV switched off: no server" "000 000 000" "$(access_codes "$url/Team")"
}

case_litmus() {
    local target status
    davsync start
    for target in "Public" "Team carol carol-pw"; do
        set -- $target
        # litmus leaves its debug.log in the working folder.
        (cd "$work" && TESTS="basic copymove props locks http" litmus "$url/$1/" "${@:2}") \
            >"$work/litmus.out" 2>&1
        status=$?
        grep '^<- summary' "$work/litmus.out" | sed "s|^|$1: |"
        expect "litmus on $1" 0 $status
    done
}

case_rclone() {
    local tree=$work/tree
    davsync start
    mkdir -p "$tree/nested/deeper/deepest" "$tree/Ünïcödé names" "$tree/with spaces"
    head -c 300000 /dev/urandom >"$tree/nested/deeper/deepest/blob one.bin"
    echo café >"$tree/Ünïcödé names/naïve café.txt"
    echo spaces >"$tree/with spaces/a b  c.txt"
    : >"$tree/empty file"
    export RCLONE_CONFIG=$work/rclone.conf RCLONE_CONFIG_DAV_TYPE=webdav \
        RCLONE_CONFIG_DAV_VENDOR=other RCLONE_CONFIG_DAV_URL=$url/Team
    as() {
        RCLONE_CONFIG_DAV_USER=$1 RCLONE_CONFIG_DAV_PASS=$(rclone obscure "$1-pw") \
            rclone -q --retries 1 --low-level-retries 1 "${@:2}" 2>>"$work/rclone.err"
    }
    as carol copy "$tree" dav:upload
    expect "the writer uploads the tree" 0 $?
    as carol check --download "$tree" dav:upload
    expect "the writer reads it back byte for byte" 0 $?
    expect "the reader lists it" "$(cd "$tree" && find . -type f | cut -c3- | LC_ALL=C sort)" \
        "$(as alice lsf -R --files-only dav:upload | LC_ALL=C sort)"
    as alice copy "$tree" dav:reader
    expect "the reader cannot upload" "1 absent" \
        "$? $([[ -e $root/mnt/HD/HD_a2/Team/reader ]] && echo present || echo absent)"
}

# A stop returns only when the server has exited, so a start at once succeeds.
case_restarts() {
    local round at_once='pid=$(cat /usr/local/apache2_dav/logs/httpd.pid) && apache stop dav &&
        ! grep -qs "^State:[[:space:]]*[^ZX[:space:]]" "/proc/$pid/status" && apache restart dav'
    davsync start
    for round in {1..20}; do
        appliance_run "$root" sh -c "$at_once"
        expect "stop, server gone, restart, round $round" "0 207 200 201" "$? $(public)"
    done
}

case_broken() {
    local good log=$root$appliance_server_root/logs/error_log
    davsync start
    good=$(cat "$conf")
    echo "Bogus directive" >>"$conf"
    apache restart dav
    expect "a refused configuration fails" 1 $?
    expect "the old server keeps serving" "207 200 201" "$(public)"
    expect "the accepted configuration is back" "$good" "$(cat "$conf")"
    expect "one line with the reason" 1 "$(grep -c "apache:error.*Invalid command 'Bogus'" "$log")"
    # As after a reboot: no server, and a broken configuration in place.
    apache stop dav
    echo "<Directory" >>"$conf"
    apache restart dav
    expect "refused again" 1 $?
    expect "started on the accepted configuration" "207 200 201" "$(public)"
    expect "the accepted configuration is back again" "$good" "$(cat "$conf")"
    # Parses, but the server cannot open its log: taken back at once.
    echo 'ErrorLog "/nonexistent/error_log"' >>"$conf"
    apache restart dav
    expect "a file the server cannot run fails" "1 207 200 201" "$? $(public)"
    expect "and the accepted one is back" "$good" "$(cat "$conf")"
    # Whatever a writer swaps in meanwhile, only what the server ran is accepted.
    local round
    cp "$conf" "$work/0"
    { cat "$conf"; echo; } >"$work/1"
    { cat "$conf"; echo Bogus; } >"$work/2"
    (for round in {1..600}; do cp "$work/$((round % 3))" "$conf.x" && mv "$conf.x" "$conf"; done) &
    for round in {1..10}; do apache restart dav; done
    wait
    expect "swapped: only a good file accepted, and served" "0 207 200 201" \
        "$(grep -c Bogus "$conf.accepted") $(public)"
    local usage
    usage=$(apache reload dav 2>&1)
    expect "other arguments: status 2, one line" "2 1" "$? $(wc -l <<<"$usage")"
}

"case_$1"
((failures == 0)) || exit 1
echo "real server, $1: passed"
