#!/bin/sh
# Makes the Debian packages: debian_packages.sh FOLDER
#
# dpkg-buildpackage wants debian/ at the top of the tree that it builds and leaves its results beside
# it, so it gets a copy of this one in FOLDER/source, with the objects of an earlier run.
set -eu

mkdir -p "$1"
folder=$(CDPATH='' cd -- "$1" && pwd)
cd "$(dirname -- "$0")/.."
version=$(cat VERSION)

source=$folder/source
mkdir -p "$source"
find "$source" -mindepth 1 -maxdepth 1 ! -name 'obj-*' -exec rm -rf {} +
rm -f "$folder"/*.deb "$folder"/*.changes "$folder"/*.buildinfo
tar -c --exclude='./build*' --exclude='./.[!.]*' --exclude=__pycache__ . | tar -x -C "$source"
mv "$source/packaging/debian" "$source/debian"

export SOURCE_DATE_EPOCH="${SOURCE_DATE_EPOCH:-$(date +%s)}"
maintainer=$(sed -n 's/^Maintainer: //p' "$source/debian/control")
cat >"$source/debian/changelog" <<EOF
libvswitch ($version) unstable; urgency=medium

  * CHANGELOG.md says what is new.

 -- $maintainer  $(date -R -u -d "@$SOURCE_DATE_EPOCH")
EOF

cd "$source"
export DEB_BUILD_OPTIONS="terse ${DEB_BUILD_OPTIONS-}"
nice dpkg-buildpackage --build=binary --no-sign --no-pre-clean
