#!/usr/bin/env bash
# Removal while a user is connected: the user is disconnected first, nothing remote is touched, stock
# gvfs is whole and works; profiles stay and serve the next installation.
. "$(dirname "$0")/common.sh"
start_servers
snapshot >/tmp/before
add_tool
connect_user
remote() { find /srv/remote -printf '%p %y %s\n' -type f -exec md5sum {} + | sort; }
remote >/tmp/remote-before
profiles=$(md5sum </usr/zyro/etc/zyrovfs/$uid/servers.conf)
records=$(md5sum </var/tmp/zyrovfs/$uid/connect.conf)

take_away remove -y zyrovfs
expect "rc " "$(state)" "state of the package"
expect "" "$(daemons)" "daemons of the user"
! grep -q /var/tmp/user/ /proc/self/mountinfo || fail "something is still mounted"
remote | diff /tmp/remote-before - >&2 || fail "remote files have changed"
expect "$profiles" "$(md5sum </usr/zyro/etc/zyrovfs/$uid/servers.conf)" "profiles"
expect "$records" "$(md5sum </var/tmp/zyrovfs/$uid/connect.conf)" "records of connections"
expect "" "$(dpkg-divert --list '*zyrovfs*')" "diversions"
plain_gvfs_is_whole
stock=$(as_user dbus-run-session -- sh -c '
  GIO_USE_VOLUME_MONITOR=unix; export GIO_USE_VOLUME_MONITOR
  printf "remo\nsecret\n" | gio mount ftp://127.0.0.1:2121 >/dev/null
  gio cat ftp://remo@127.0.0.1:2121/kept.txt || gio cat ftp://127.0.0.1:2121/kept.txt' 2>/dev/null)
expect "a remote file" "$stock" "file by stock gvfs"

add_tool
is_ready
quietly zyrovfs connection connect $ftp --user $user
expect "a remote file" "$(as_user cat "$(tree_of $ftp)/kept.txt")" "file after coming back"

# Libraries and all: what stays is users' data, and that the timer was switched on.
take_away remove -y "${tool_packages[@]}"
kept='^/usr/zyro|^/var/tmp/|^/tmp/zyrovfs|^/var/lib/systemd/deb-systemd-helper|/zyrovfs-sweep\.timer '
diff <(grep -vE "$kept" /tmp/before) <(snapshot | grep -vE "$kept") >&2 ||
  fail "removal left more than users' data"
