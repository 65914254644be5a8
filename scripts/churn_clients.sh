# shellcheck shell=bash
# The clients of scripts/churn and its probes of the server, sourced by it:
# raw requests that time the server, the status page read, the tool run
# through the appliance's shell, and the clients on untouched shares and in
# flight on the shares a change takes away. They read churn's $port, $work,
# $rate, $slow_rate, $mb, $runner and $flight.
now() { echo "${EPOCHREALTIME/./}"; }  # microseconds
ms() { echo $((($1 + 500) / 1000)); }
# Base64 of USER:PASSWORD for a Basic authorization header.
basic() { printf '%s' "$1" | base64 -w0; }

# probe PATH [USER:PASSWORD]: the status code of a GET, by a raw request on a
# new connection (no client program to start, so it times the server).
probe() {
    local fd code=000 header=
    [[ -z ${2:-} ]] || header="Authorization: Basic $(basic "$2")"$'\r\n'
    if exec {fd}<>"/dev/tcp/127.0.0.1/$port"; then
        printf 'GET %s HTTP/1.0\r\n%s\r\n' "$1" "$header" >&"$fd"
        read -r -t 10 -u "$fd" _ code _ || code=000
        exec {fd}>&-
    fi
    echo "$code"
} 2>/dev/null

# Whether a live worker still serves a request whose line contains TEXT (the
# slot of one that has exited keeps its line until the server reaps it).
serving() {
    local fd pid state
    exec {fd}<>"/dev/tcp/127.0.0.1/$port" || return 1
    printf 'GET /server-status HTTP/1.0\r\nHost: status.invalid\r\n\r\n' >&"$fd"
    for pid in $(awk -v text="$1" 'BEGIN { RS = "<tr>" } {
        n = split($0, cell, "</td>"); mode = cell[4]; pid = cell[2]; gsub(/<[^>]*>|\n/, "", mode)
        gsub(/<[^>]*>|\n/, "", pid)
        if (n >= 15 && mode != "_" && mode != "." && index(cell[15], text)) print pid
    }' <&"$fd"); do
        read -r _ _ state _ 2>/dev/null <"/proc/$pid/stat" && [[ $state != Z ]] && break
        pid=
    done
    exec {fd}>&-
    [[ -n ${pid:-} ]]
}

# The server's generation, from its status page: it grows with every reload.
generation() {
    local fd page
    exec {fd}<>"/dev/tcp/127.0.0.1/$port" || return 1
    printf 'GET /server-status?auto HTTP/1.0\r\nHost: status.invalid\r\n\r\n' >&"$fd"
    IFS= read -r -d '' -t 10 -u "$fd" page || true
    exec {fd}>&-
    [[ $page =~ "ParentServerMPMGeneration: "([0-9]+) ]] && echo "${BASH_REMATCH[1]}"
}

# Runs a tool command in the appliance; sets began and ended (microseconds).
tool() {
    echo "$*" >&"${runner[1]}"
    read -r began ended <&"${runner[0]}"
}

# The clients on untouched shares; each appends one line per transfer to its
# log and stops when the stop file appears, or after an hour whatever happens.
deadline=$((SECONDS + 3600))
downloads() {  # URL BYTES [USER:PASSWORD]
    local auth=() out
    [[ -z ${3:-} ]] || auth=(--user "$3")
    while [[ ! -e $work/stop ]] && ((SECONDS < deadline)); do
        out=$(curl -s -o /dev/null --limit-rate "$rate" "${auth[@]}" -w '%{http_code} %{size_download}' "$1") || true
        [[ $out == "200 $2" ]] && echo ok || echo "cut $out"
    done >>"$work/transfers"
}
uploads() {  # URL USER:PASSWORD
    local n=0 out
    while [[ ! -e $work/stop ]] && ((SECONDS < deadline)); do
        n=$((n + 1))
        out=$(curl -s -o /dev/null --limit-rate "$rate" --user "$2" -T "$work/large.bin" \
            -w '%{http_code}' "$1/up-$((n % 3)).bin") || true
        [[ $out == 201 || $out == 204 ]] && echo ok || echo "cut upload $out"
    done >>"$work/transfers"
}
small_requests() {  # URL
    local args=() i
    for ((i = 0; i < 50; i++)); do args+=(-o /dev/null "$1"); done
    while [[ ! -e $work/stop ]] && ((SECONDS < deadline)); do
        curl -s -w '%{http_code} %{time_total}\n' "${args[@]}" || true
    done >>"$work/small"
}
syncs() {  # URL USER PASSWORD
    export RCLONE_CONFIG=$work/rclone.conf RCLONE_CONFIG_DAV_TYPE=webdav \
        RCLONE_CONFIG_DAV_VENDOR=other RCLONE_CONFIG_DAV_URL=$1 RCLONE_CONFIG_DAV_USER=$2
    RCLONE_CONFIG_DAV_PASS=$(rclone obscure "$3")
    export RCLONE_CONFIG_DAV_PASS
    local round=0
    while [[ ! -e $work/stop ]] && ((SECONDS < deadline)); do
        round=$((round + 1))
        head -c $((mb * 65536)) /dev/urandom >"$work/tree/changing.bin"
        echo "$round" >"$work/tree/round.txt"
        if rclone sync -q --retries 1 --low-level-retries 1 --bwlimit "$((rate / 1024))K" "$work/tree" dav:sync \
            2>>"$work/rclone.err"; then
            echo ok
        else
            echo "cut rclone round $round"
        fi
    done >>"$work/transfers"
}

# in_flight NAME URL [CURL ARGS]: a slow transfer of a share that a change is
# about to take away; its end time and outcome go to $work/NAME.
in_flight() {
    local name=$1 url=$2
    shift 2
    (
        out=$(curl -s -o /dev/null --limit-rate "$slow_rate" -w '%{http_code} %{size_download}' "$@" "$url") || true
        echo "$(now) $out" >"$work/$name"
    ) &
    flight[$name]=$!
}

# Records how long after the tool returned the server went on serving an
# in-flight transfer (its request line contains TEXT), then waits for the
# client. The client may still read what was sent before.
outlived() {  # NAME TEXT
    local tries=0 end out
    while serving "$2" && ((++tries < 1000)); do sleep 0.005; done
    echo "$1 $(ms $(($(now) - ended)))" >>"$work/revoked"
    wait "${flight[$1]}"
}
