#!/bin/bash
# The Debian package: built by cpack from a Release build of its own, it
# holds the tool and its manual page, declares libxml2, and lintian finds no
# error in it (skipped without lintian).   package_test.sh SOURCE_DIR BUILD_DIR
set -uo pipefail
command -v lintian >/dev/null || { echo "lintian is not installed: skipped"; exit 77; }
source=$1 build=$2
cmake -S "$source" -B "$build" -DCMAKE_BUILD_TYPE=Release -DDAVSYNC_TESTS=OFF >/dev/null &&
    cmake --build "$build" -j2 >/dev/null && rm -f "$build"/*.deb &&
    (cd "$build" && cpack -G DEB >/dev/null 2>&1) || { echo "FAILED: building the package"; exit 1; }
deb=$(ls "$build"/davsync_*.deb)
failures=0
dpkg-deb -f "$deb" Depends | grep -q 'libxml2' || { echo "FAILED: no libxml2 dependency"; failures=1; }
contents=$(dpkg-deb -c "$deb")
for file in ./usr/sbin/davsync ./usr/share/man/man8/davsync.8.gz ./usr/share/doc/davsync/copyright; do
    grep -q " $file$" <<<"$contents" || { echo "FAILED: $file missing"; failures=1; }
done
lintian "$deb" 2>&1 | grep -v 'running with root privileges' | tee "$build/lintian.out"
grep -q '^E:' "$build/lintian.out" && { echo "FAILED: lintian errors"; failures=1; }
((failures == 0)) && echo "$(basename "$deb"): $(dpkg-deb -f "$deb" Depends); lintian: no errors"
