#!/usr/bin/env bash
# gvfs is upgraded while ours is installed: its new files go to where its old ones were moved, a new
# one that names no protocol is moved too, and all of the new ones are there when ours goes.
. "$(dirname "$0")/common.sh"
catalogue=/usr/share/gvfs/mounts
add_tool

# The installed gvfs-backends as a package of a higher version, with two changes.
tree=/tmp/newer
mkdir -p $tree/DEBIAN
dpkg -L gvfs-backends | grep '^/' | while read -r path; do
  stock=$(dpkg-divert --truename "$path")
  if [ ! -d "$path" ] || [ -L "$path" ]; then
    mkdir -p "$tree$(dirname "$path")"
    cp -a "$stock" "$tree$path"
  fi
done
echo "# newer" >>$tree$catalogue/ftp.mount
printf '[Mount]\nType=zebra\n' >$tree$catalogue/zebra.mount
dpkg-query -s gvfs-backends | sed '/^Status:/d;/^Conffiles:/,/^[A-Z]/{/^[A-Z]/!d;/^Conffiles:/d}' |
  sed 's/^Version: .*/&+newer/' >$tree/DEBIAN/control
quietly dpkg-deb --build --root-owner-group $tree /tmp/newer.deb
quietly apt-get -q install -y --no-install-recommends /tmp/newer.deb

expect "" "$(dpkg-query -W -f '${Version}' gvfs-backends | sed 's/.*+newer$//')" "version of gvfs"
is_ready
cmp -s /usr/share/zyrovfs/mounts/ftp.mount $catalogue/ftp.mount || fail "our file was replaced"
[ ! -e $catalogue/zebra.mount ] || fail "the new file shows in the catalogue"

quietly dpkg --purge "${tool_packages[@]}"
expect "# newer" "$(tail -1 $catalogue/ftp.mount)" "the newer file of gvfs"
expect "Type=zebra" "$(tail -1 $catalogue/zebra.mount)" "the new file of gvfs"
expect "" "$(dpkg-divert --list '*zyrovfs*')" "diversions"
