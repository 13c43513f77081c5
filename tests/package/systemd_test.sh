#!/usr/bin/env bash
# The units are valid and closed, and the folders made at boot are those that the library makes.
. "$(dirname "$0")/common.sh"
add_tool
quietly systemd-analyze verify /lib/systemd/system/zyrovfs-sweep.{service,timer}
# In tenths; 2.0 is what systemd itself calls OK.
quietly systemd-analyze security --offline=true --threshold=20 \
  /lib/systemd/system/zyrovfs-sweep.service

folders=(/tmp/zyrovfs /tmp/zyrovfs/lock /tmp/zyrovfs/lock/user /var/tmp/zyrovfs /var/tmp/user
  /var/tmp/zos /var/tmp/zos/task)
list() { stat -c '%n %a %U:%G %F' "${folders[@]}"; }
list >/tmp/made-at-installation
rm -rf /tmp/zyrovfs /var/tmp/zyrovfs /var/tmp/user /var/tmp/zos
quietly systemd-tmpfiles --create zyrovfs.conf
list | diff /tmp/made-at-installation - >&2 || fail "boot makes other folders"
while read -r path mode owner _; do
  case $path in
    /var/tmp/zos*) expect 755 "$mode" "mode of $path" ;;
    *) expect 1777 "$mode" "mode of $path" ;;
  esac
  expect root:root "$owner" "owner of $path"
done </tmp/made-at-installation

# As the library makes them without systemd.
rm -rf /tmp/zyrovfs /var/tmp/zyrovfs /var/tmp/user /var/tmp/zos
start_servers
connect_user
folders=(/tmp/zyrovfs /tmp/zyrovfs/lock /tmp/zyrovfs/lock/user /var/tmp/zyrovfs /var/tmp/user)
list | diff <(grep -v /zos /tmp/made-at-installation) - >&2 || fail "the library makes other folders"

# Cleaning by age leaves connections alone, however old.
find /var/tmp/zyrovfs /var/tmp/user/$uid/dbus -exec touch -h -d '1 year ago' {} +
printf 'q /var/tmp 1777 root root 10d\nq /tmp 1777 root root 10d\n' >/etc/tmpfiles.d/age.conf
touch -d '1 year ago' /var/tmp/other
quietly systemd-tmpfiles --clean
[ -s /var/tmp/zyrovfs/$uid/connect.conf ] || fail "a record of connections was cleaned away"
[ -e /var/tmp/user/$uid/dbus/dbus.pid ] || fail "a pid file was cleaned away"
