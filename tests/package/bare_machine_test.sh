#!/usr/bin/env bash
# A machine without /dev/fuse, one without systemd, and a container that may not mount.
. "$(dirname "$0")/common.sh"
debs=("$packages"/{libzosplatform1,libzyrovfs6,zyrovfs}_*.deb)
snapshot >/tmp/before

umount /dev/fuse
rm /dev/fuse
quietly dpkg -i "${debs[@]}"
expect "zyrovfs: /dev/fuse is missing; load the kernel module fuse." \
  "$(zyrovfs host check 2>&1 | head -1)" "what is missing"
quietly dpkg --purge "${tool_packages[@]}"
is_as_before /tmp/before
echo "without /dev/fuse: ok"

[ ! -e /run/systemd/system ] || fail "this machine runs systemd"
for program in /bin/systemctl /bin/systemd-tmpfiles /usr/bin/deb-systemd-invoke; do
  mv $program $program.away
done
quietly dpkg -i "${debs[@]}"
quietly zyrovfs protocol list
quietly dpkg --purge "${tool_packages[@]}"
for program in /bin/systemctl /bin/systemd-tmpfiles /usr/bin/deb-systemd-invoke; do
  mv $program.away $program
done
is_as_before /tmp/before
echo "without systemd: ok"

contained() {
  setpriv --bounding-set -sys_admin,-mknod,-net_admin,-sys_module,-sys_ptrace,-sys_rawio \
    --inh-caps -sys_admin,-mknod,-net_admin,-sys_module,-sys_ptrace,-sys_rawio "$@"
}
! contained mount -t tmpfs tmpfs /mnt 2>/dev/null || fail "the container may mount"
quietly contained dpkg -i "${debs[@]}"
expect "zyrovfs: /dev/fuse is missing; load the kernel module fuse." \
  "$(contained zyrovfs host check 2>&1 | head -1)" "what is missing in a container"
quietly contained dpkg --purge "${tool_packages[@]}"
is_as_before /tmp/before
echo "in a container: ok"
