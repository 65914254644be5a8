# shellcheck shell=bash
# The appliance around davsync, for the demo and the real-server tests; meant
# to be sourced by bash. An appliance is a root folder in $TMPDIR (or /tmp)
# made by appliance/root, holding what the tool and its WebDAV server read and
# write at their fixed paths. Both run chrooted into it through appliance/root
# (a private mount namespace, the system bound read-only), sharing the host's
# network: the server listens on 127.0.0.1:PORT. Nothing is written outside
# the root. Needs root (unshare, chroot, the server's user).

appliance_repo="$(cd "$(dirname "${BASH_SOURCE[0]}")/.." && pwd)"
appliance_root=$appliance_repo/appliance/root
# Inside the root.
appliance_server_root=/usr/local/apache2_dav
# The server's user, as in Debian's base-passwd.
appliance_www_id=33

# Installs the Debian packages that are missing, through apt-get.
install_missing() {
    "$appliance_repo/scripts/need-packages" "$@"
}

# What a real-server run needs on the host: the server, htpasswd, the
# namespace tools, and a client.
appliance_packages=(apache2-bin apache2-utils util-linux coreutils curl)

# A loopback port nobody listens on (a guess checked by connecting).
free_port() {
    local port tries
    for ((tries = 0; tries < 50; tries++)); do
        port=$((20000 + RANDOM % 20000))
        (exec 3<>"/dev/tcp/127.0.0.1/$port") 2>/dev/null || { echo "$port"; return 0; }
    done
    return 1
}

# The quoted replacements keep a newer bash from reading & as the match.
xml_escape() {
    local text=${1//&/"&amp;"}
    text=${text//</"&lt;"}
    text=${text//>/"&gt;"}
    printf '%s' "${text//\"/"&quot;"}"
}

# appliance_new DAVSYNC PORT: prints the new root's path.
appliance_new() {
    local davsync=$1 port=$2 root
    root=$(mktemp -d "${TMPDIR:-/tmp}/davsync-appliance.XXXXXX") || return 1
    root=$(realpath "$root")
    "$appliance_root" make "$root" || return 1
    mkdir -p "$root/usr/local/sbin" "$root$appliance_server_root"/{var,logs,htdocs}
    printf 'www-data:x:%s:%s:www-data:/var/www:/usr/sbin/nologin\n' "$appliance_www_id" "$appliance_www_id" \
        >>"$root/etc/passwd"
    printf 'www-data:x:%s:\n' "$appliance_www_id" >>"$root/etc/group"
    : >"$root/etc/passwd.webdav"
    chown "0:$appliance_www_id" "$root/etc/passwd.webdav"
    chmod 640 "$root/etc/passwd.webdav"
    install -m 755 "$davsync" "$root/usr/local/sbin/davsync"
    install -m 755 "$appliance_repo/appliance/apache" "$root/usr/local/sbin/apache"
    install -D -m 644 -t "$root/usr/local/lib/apache" "$appliance_repo"/appliance/*.awk
    appliance_main_conf "$port" >"$root$appliance_server_root/conf/httpd.conf"
    # The lock database: without it every write answers 500.
    chown "$appliance_www_id:$appliance_www_id" "$root$appliance_server_root/var"
    echo "$root"
}

# The server's main configuration, listening on 127.0.0.1:PORT.
appliance_main_conf() {
    sed "s/@LISTEN@/127.0.0.1:$1/" "$appliance_repo/appliance/httpd.conf"
}

# appliance_switch ROOT 0|1: the WebDAV switch in the configuration database.
appliance_switch() {
    sed -i "s|<webdav><enable>[01]</enable>|<webdav><enable>$2</enable>|" "$1/etc/NAS_CFG/config_db.xml"
}

# appliance_user ROOT NAME PASSWORD: an account with a WebDAV password.
appliance_user() {
    local id
    id=$((1000 + $(wc -l <"$1/etc/passwd")))
    printf '%s:x:%s:%s::/home/%s:/bin/sh\n' "$2" "$id" "$id" "$2" >>"$1/etc/passwd"
    printf '%s' "$3" | htpasswd -i -B -C 5 "$1/etc/passwd.webdav" "$2" 2>/dev/null
}

# appliance_group ROOT NAME MEMBER,...
appliance_group() {
    printf '%s:x:%s:%s\n' "$2" $((1000 + $(wc -l <"$1/etc/group"))) "$3" >>"$1/etc/group"
}

# appliance_mount ROOT DIR [DEVICE [TYPE]]: a mounted volume, as the mount
# table says; its folder belongs to the server's user.
appliance_mount() {
    printf '%s %s %s rw 0 0\n' "${3:-/dev/sda4}" "$2" "${4:-ext4}" >>"$1/etc/mtab"
    appliance_folder "$1" "$2"
}

# appliance_folder ROOT PATH: a folder the server may write, with a file to read.
appliance_folder() {
    mkdir -p "$1$2"
    [[ -e "$1$2/hello.txt" ]] || printf 'hello from %s\n' "$2" >"$1$2/hello.txt"
    chown -R "$appliance_www_id:$appliance_www_id" "$1$2"
}

# catalogue_items ROOT: share catalogue items from lines on standard input,
# NAME|PATH|READ_LIST|WRITE_LIST|INVALID_USERS|PUBLIC|WEB_PUBLIC; every
# share's folder is made.
catalogue_items() {
    local root=$1 name path read write invalid public web field value
    while IFS='|' read -r name path read write invalid public web; do
        [[ -n $name ]] || continue
        appliance_folder "$root" "$path"
        printf '<item>'
        for field in name path read_list write_list invalid_users public web_public; do
            case $field in
            name) value=$name ;; path) value=$path ;; read_list) value=$read ;;
            write_list) value=$write ;; invalid_users) value=$invalid ;;
            public) value=$public ;; web_public) value=$web ;;
            esac
            [[ -z $value ]] || printf '<%s>%s</%s>' "$field" "$(xml_escape "$value")" "$field"
        done
        printf '</item>'
    done
}

# appliance_catalogue ROOT: the share catalogue from catalogue_items lines on
# standard input.
appliance_catalogue() {
    printf '<?xml version="1.0" encoding="UTF-8"?>\n<config><samba>%s</samba></config>\n' \
        "$(catalogue_items "$1")" >"$1/var/www/xml/smb.xml"
}

# appliance_catalogue_add ROOT: adds catalogue_items lines to the catalogue.
appliance_catalogue_add() {
    local items
    items=$(catalogue_items "$1")
    items=${items//\\/\\\\}
    items=${items//&/\\&}
    sed -i "s|</samba></config>|${items//|/\\|}&|" "$1/var/www/xml/smb.xml"
}

# appliance_bench ROOT SHARES: the benchmark's users, groups and shares
# (bench/make_root.awk) on volumes HD_a2, HD_b2 and HD_c2 of a new
# appliance, in place of the demo's.
appliance_bench() {
    local root=$1 data
    data=$(mktemp -d) || return 1
    mkdir -p "$data"/{etc,var/www/xml,opt/bench} "$data"/mnt/HD/HD_{a,b,c}2/.system_data
    awk -v root="$data" -v shares="$2" -f "$appliance_repo/bench/make_root.awk" |
        sed "s|^|$root|" | xargs -d '\n' mkdir -p --
    tail -n +2 "$data/etc/passwd" >>"$root/etc/passwd"
    tail -n +2 "$data/etc/group" >>"$root/etc/group"
    cp "$data/var/www/xml/smb.xml" "$root/var/www/xml/smb.xml"
    local volume
    for volume in a b c; do
        appliance_mount "$root" "/mnt/HD/HD_${volume}2" "/dev/sd${volume}4"
        cp -r "$data/mnt/HD/HD_${volume}2/.system_data" "$root/mnt/HD/HD_${volume}2/"
    done
    rm -rf "$data"
}

# share_list_items: WebDAV share list items from lines NAME|PATH|RW|ENABLE on
# standard input, as the tool's list files and its do/merge input hold them.
share_list_items() {
    local name path rw enable count=0 items=""
    while IFS='|' read -r name path rw enable; do
        [[ -n $name ]] || continue
        count=$((count + 1))
        items+=$(printf '\t\t\t<item>\n\t\t\t\t<shared_name>%s</shared_name>\n\t\t\t\t<path>%s</path>\n\t\t\t\t<RW>%s</RW>\n\t\t\t\t<enable>%s</enable>\n\t\t\t</item>' \
            "$(xml_escape "$name")" "$(xml_escape "$path")" "$rw" "$enable")$'\n'
    done
    printf '<?xml version="1.0" encoding="UTF-8"?>\n<config>\n\t<WebDAV>\n\t\t<count>%s</count>\n\t\t<allen>1</allen>\n%s\t</WebDAV>\n</config>\n' \
        "$count" "$items"
}

# appliance_share_list ROOT VOLUME [LIST_NAME]: a volume's WebDAV share list
# (paths relative to the volume) from share_list_items lines on standard input.
appliance_share_list() {
    mkdir -p "$1$2/.system_data"
    share_list_items >"$1$2/.system_data/${3:-lighty.xml}"
}

# appliance_run ROOT COMMAND...: runs a command in the root, with PATH as its
# whole environment. What it leaves running (the server) keeps the namespace
# and its mounts.
appliance_run() {
    local root=$1
    shift
    "$appliance_root" enter "$root" -- "$@"
}

# Stops the server, ends what else still runs in the root (by pid, and then
# the status is 1: a stopped server leaves nothing), and removes the root
# once nothing is mounted in it.
appliance_remove() {
    local root=$1 status=0 leftovers pid tries
    [[ -n $root && -d $root ]] || return 0
    if [[ -x "$root/usr/local/sbin/apache" ]]; then
        appliance_run "$root" apache stop dav || status=1
    fi
    # find fails on the processes that end while it looks.
    leftovers=$(find /proc/[0-9]*/root -maxdepth 0 -lname "$root*" 2>/dev/null | cut -d/ -f3) || true
    if [[ -n $leftovers ]]; then
        echo "appliance: processes left running in $root, ended:" $leftovers >&2
        for pid in $leftovers; do kill -KILL "$pid" 2>/dev/null || true; done
        status=1
    fi
    for ((tries = 0; tries < 50; tries++)); do
        grep -q " ${root}[/ ]" /proc/self/mountinfo || break
        sleep 0.1
    done
    if grep -q " ${root}[/ ]" /proc/self/mountinfo; then
        echo "appliance: $root is still mounted on; left in place" >&2
        return 1
    fi
    rm -rf --one-file-system "$root"
    return $status
}

# access_codes URL [USER:PASSWORD]: list, read and write as seen over HTTP:
# the status codes of a PROPFIND of the share, a GET of its hello.txt and a
# PUT of a new file (000 when nothing answers). The file is deleted again.
access_codes() {
    local url=$1 auth=() request codes
    [[ -z ${2:-} ]] || auth=(--user "$2")
    local name="probe-$$-$RANDOM.txt" common=(-s -o /dev/null -w '%{http_code} ' --max-time 10)
    local requests=("-X PROPFIND -H Depth:1 $url/" "$url/hello.txt"
                    "-X PUT --data-binary probe $url/$name" "-X DELETE $url/$name")
    local args=()
    for request in "${requests[@]}"; do
        # shellcheck disable=SC2206 # the words of a request split on purpose
        args+=("${common[@]}" "${auth[@]}" $request --next)
    done
    codes=$(curl "${args[@]:0:${#args[@]}-1}" 2>/dev/null) || true
    set -- $codes 000 000 000
    echo "$1 $2 $3"
}

# The users of the demo appliance and the tests: a reader (through the group
# staff), a writer, and a user named invalid on the shares that name readers.
appliance_credentials=(alice:alice-pw carol:carol-pw mallory:mallory-pw)

# demo_appliance ROOT [CATALOGUE_LINES [HD_A2_LIST_LINES]]: two data volumes,
# an iso mount, a marked USB volume, and a catalogue with an open share, an
# authenticated share with a reader group, a writer and an invalid user, a
# share that names nobody, a share published with WebDAV off, an open iso
# share, and Photos, which is in the catalogue but not yet published. Extra
# catalogue shares and HD_a2 list entries may be given.
demo_appliance() {
    local root=$1 credential
    for credential in "${appliance_credentials[@]}"; do
        appliance_user "$root" "${credential%%:*}" "${credential#*:}"
    done
    appliance_group "$root" staff alice,mallory
    appliance_mount "$root" /mnt/HD/HD_a2 /dev/sda4
    appliance_mount "$root" /mnt/HD/HD_b2 /dev/sdb4
    appliance_mount "$root" /mnt/USB/USB1 /dev/sdc1 vfat
    echo ON >"$root/mnt/USB/USB1/.davconf"
    echo "usbdisk1 = USB1" >"$root/etc/shared_name"
    appliance_catalogue "$root" <<EOF
Public|/mnt/HD/HD_a2/Public||||yes|
Team|/mnt/HD/HD_a2/Team|#@staff#|#carol#|#mallory#||
Sealed|/mnt/HD/HD_b2/Sealed|||||
Archive|/mnt/HD/HD_b2/Archive|#@staff#|#carol#|||
Photos|/mnt/HD/HD_b2/Photos|#alice#|#carol#|||
Disc|/mnt/isoMount/Disc|||||1
${2:-}
EOF
    appliance_share_list "$root" /mnt/HD/HD_a2 <<EOF
Public|/Public|1|1
Team|/Team|1|1
${3:-}
EOF
    appliance_share_list "$root" /mnt/HD/HD_b2 <<EOF
Sealed|/Sealed|1|1
Archive|/Archive|1|0
EOF
    appliance_share_list "$root" /mnt/HD/HD_a2 lighty_iso.xml <<EOF
Disc|/Disc|0|1
EOF
}

# access_matrix PORT SHARE...: per share, one line: its name, then the
# list/read/write codes of an anonymous client and of each user of
# appliance_credentials, the groups separated by "|".
access_matrix() {
    local port=$1 share credential line
    shift
    for share in "$@"; do
        line="${share:-/} $(access_codes "http://127.0.0.1:$port/$share")"
        for credential in "${appliance_credentials[@]}"; do
            line+=" | $(access_codes "http://127.0.0.1:$port/$share" "$credential")"
        done
        echo "$line"
    done
}

# published_shares ROOT PORT: what the placed configuration publishes, one
# line per share: name, URL, who may read, who may write.
published_shares() {
    awk -v base="http://127.0.0.1:$2/" '
        function names(text,    n, i, seen, list, out) {
            n = split(text, list, " ")
            for (i = 1; i <= n; i++) if (!(list[i] in seen)) { seen[list[i]]; out = out " " list[i] }
            return out == "" ? "nobody" : substr(out, 2)
        }
        /^Alias "/ { split($0, quoted, "\""); name = substr(quoted[2], 2); users = 0 }
        /^\tDav / { dav = $2 }
        /^\tAuthType None/ { reader = writer = "everyone" }
        /^\t\tRequire user/ { text = substr($0, 16); if (users++) writer = names(text); else reader = names(text) }
        /^<\/Directory>/ {
            if (dav == "On") printf "  %-9s %-32s read: %-20s write: %s\n", name, base name, reader, writer
            else printf "  %-9s %-32s WebDAV off for this share\n", name, "(not served)"
        }
    ' "$1$appliance_server_root/conf/extra/httpd-dav.conf"
}
