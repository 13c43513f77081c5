#!/usr/bin/env bash
# What the machine's owner has set passes through upgrades, and through a removal what is not ours.
. "$(dirname "$0")/common.sh"
printf '# mine\nmount_max = 7\nuser_allow_other\n' >/etc/fuse.conf
add_tool
expect 1 "$(grep -c user_allow_other /etc/fuse.conf)" "lines of fuse.conf"
quietly zyrovfs policy set --type admin
echo '{"hosts":{"BoxApiHost":"https://box.example"}}' >/usr/zyro/etc/zyrovfs/cloud.conf
quietly systemctl disable zyrovfs-sweep.timer
mkdir -p /etc/systemd/system/zyrovfs-sweep.timer.d /etc/tmpfiles.d
printf '[Timer]\nOnCalendar=weekly\n' >/etc/systemd/system/zyrovfs-sweep.timer.d/mine.conf
echo 'd /var/tmp/user 1777 root root -' >/etc/tmpfiles.d/zyrovfs.conf
owners() {
  md5sum /etc/fuse.conf /usr/zyro/etc/zyrovfs/{user,cloud}.conf /etc/tmpfiles.d/zyrovfs.conf \
    /etc/systemd/system/zyrovfs-sweep.timer.d/mine.conf
}
# Conffiles of the packages, each changed by its owner.
add "$packages" zyrovfs-web
conffiles=$(dpkg-query -W -f '${Conffiles}\n' zyrovfs zyrovfs-web | awk 'NF {print $1}')
for file in $conffiles; do
  echo "# mine" >>"$file"
done
owners >/tmp/owners

quietly apt-get -q install --reinstall -y "$packages"/{zyrovfs,zyrovfs-web}_*.deb
owners | diff /tmp/owners - >&2 || fail "what the owner has set was changed"
for file in $conffiles; do
  expect "# mine" "$(tail -1 "$file")" "$file"
done
[ ! -e /etc/systemd/system/timers.target.wants/zyrovfs-sweep.timer ] ||
  fail "the timer is switched on again"

quietly dpkg --remove zyrovfs-web zyrovfs
owners | diff /tmp/owners - >&2 || fail "removal changed what the owner has set"
quietly dpkg --purge zyrovfs-web zyrovfs
expect user_allow_other "$(tail -1 /etc/fuse.conf)" "the owner's line of fuse.conf"
