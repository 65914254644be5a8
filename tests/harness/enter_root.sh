#!/bin/sh
# Runs as the first process of the private mount and PID namespaces unshare
# made for one run: binds what the appliance root borrows from the host (/usr
# read-only, with the appliance's own /usr/local from ROOT/../usr_local over
# it), mounts a /proc of its own and the tmpfs asked for, starts what lies in
# ROOT/opt/alongside, and runs PROGRAM chrooted with umask 077 and PATH alone,
# plus the NAME=VALUE words given (LD_PRELOAD names a host library, bound at
# /opt/preload). Whatever is left when it ends goes with the namespace.
#   enter_root.sh ROOT PROGRAM [INSIDE_PATH SIZE | NAME=VALUE]... -- ARGS...
root=$1 program=$2
shift 2
fail() { echo "appliance harness: $*" >&2; exit 125; }
for dir in /bin /sbin /lib /lib32 /lib64 /usr; do  # a link in the root is the host's link, made already
    [ -L "$root$dir" ] || [ ! -d "$dir" ] || mount --rbind -o ro "$dir" "$root$dir" || fail "bind $dir"
done
mount --bind "$root/../usr_local" "$root/usr/local" && mount -t proc proc "$root/proc" &&
    mount --bind /dev/null "$root/dev/null" && mount --bind "$program" "$root/opt/program" ||
    fail "bind /usr/local, /proc, /dev/null or $program"
added=
while [ "$1" != -- ]; do
    case $1 in
    LD_PRELOAD=*)
        : >"$root/opt/preload" && mount --bind "${1#*=}" "$root/opt/preload" || fail "bind $1"
        added="${added}LD_PRELOAD=/opt/preload
" && shift && continue ;;
    *=*) added="$added$1
" && shift && continue ;;
    esac
    # The tmpfs starts with a copy of what the folder held, as far as it fits.
    mkdir -p "$root/opt/below" "$root$1" && mount --bind "$root$1" "$root/opt/below" &&
        mount -t tmpfs -o "size=$2" tmpfs "$root$1" || fail "tmpfs on $1"
    cp -a "$root/opt/below/." "$root$1/" 2>/dev/null
    umount "$root/opt/below" && shift 2
done
shift
for program in "$root"/opt/alongside/*; do [ -x "$program" ] && "$program" & done
umask 077
IFS='
'  # one added word a line
# shellcheck disable=SC2086
env -i PATH=/opt/recorder:/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin chroot "$root" env $added /opt/program "$@"
