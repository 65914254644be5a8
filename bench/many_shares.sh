#!/bin/bash
# Times one "start" over COUNT shares on one volume, in a throwaway appliance
# root (chroot in a private mount namespace; needs root).
#   bench/many_shares.sh path/to/davsync [COUNT] [WEBDAV_ENABLE]
# With WEBDAV_ENABLE 1 every share also gets its link, one "ln -s" each.
set -euo pipefail
binary=$(realpath "${1:?usage: many_shares.sh DAVSYNC [COUNT] [WEBDAV_ENABLE]}")
count=${2:-3000}
enable=${3:-0}
root=$(mktemp -d /tmp/davsync-bench.XXXXXX)
trap 'rm -rf "$root"' EXIT

mkdir -p "$root"/{etc/NAS_CFG,tmp,var/www/xml,proc,dev,opt/bin,usr/local/apache2_dav/conf/extra}
mkdir -p "$root"/mnt/HD/HD_a2/.system_data
chmod 1777 "$root/tmp"
for dir in /usr/bin /usr/lib /usr/lib64 /usr/sbin; do [ -d "$dir" ] && mkdir -p "$root$dir"; done
for link in bin lib lib64 sbin; do [ -L "/$link" ] && ln -s "$(readlink "/$link")" "$root/$link"; done
touch "$root/dev/null" "$root/opt/bin/davsync"
printf '#!/bin/sh\n' > "$root/opt/bin/apache" && chmod +x "$root/opt/bin/apache"
echo '/dev/sda4 /mnt/HD/HD_a2 ext4 rw 0 0' > "$root/etc/mtab"
printf 'root:x:0:\nstaff:x:100:bob,carol\n' > "$root/etc/group"
printf 'passwd: files\ngroup: files\n' > "$root/etc/nsswitch.conf"
echo "<config><system_mgr><webdav><enable>$enable</enable></webdav></system_mgr></config>" \
    > "$root/etc/NAS_CFG/config_db.xml"

{
    printf '<?xml version="1.0" encoding="UTF-8"?>\n<config>\n\t<WebDAV>\n\t\t<count>%d</count>\n\t\t<allen>1</allen>\n' "$count"
    for ((i = 0; i < count; i++)); do
        printf '\t\t\t<item>\n\t\t\t\t<shared_name>s%d</shared_name>\n\t\t\t\t<path>/s%d</path>\n\t\t\t\t<RW>1</RW>\n\t\t\t\t<enable>1</enable>\n\t\t\t</item>\n' "$i" "$i"
    done
    printf '\t</WebDAV>\n</config>\n'
} > "$root/mnt/HD/HD_a2/.system_data/lighty.xml"
{
    printf '<config><samba>'
    for ((i = 0; i < count; i++)); do
        printf '<item><name>s%d</name><path>/mnt/HD/HD_a2/s%d</path><read_list>#u%d#,#@staff#</read_list><write_list>#w%d#</write_list></item>' "$i" "$i" "$i" "$i"
        mkdir "$root/mnt/HD/HD_a2/s$i"
    done
    printf '</samba></config>'
} > "$root/var/www/xml/smb.xml"

unshare --mount --fork sh -c '
    root=$1 binary=$2
    mount --make-rprivate /
    for dir in /usr/bin /usr/lib /usr/lib64 /usr/sbin; do
        [ -d "$dir" ] && mount --rbind -o ro "$dir" "$root$dir"
    done
    mount --bind /dev/null "$root/dev/null"
    mount --rbind /proc "$root/proc"
    mount --bind "$binary" "$root/opt/bin/davsync"
    chroot "$root" /usr/bin/env -i PATH=/opt/bin:/usr/bin:/bin \
        /usr/bin/time -f "start over '"$count"' shares: %e s, %M KB peak" /opt/bin/davsync start
' sh "$root" "$binary"
echo "links made: $(ls "$root/usr/local/apache2_dav/webdav" | wc -l)"
