#!/usr/bin/env bash
# Purging everything while a user is connected leaves the machine as it was, and the servers too.
. "$(dirname "$0")/common.sh"
start_servers
snapshot >/tmp/before
add "$packages" "${all_packages[@]}"
connect_user
remote() { find /srv/remote -printf '%p %y %s\n' -type f -exec md5sum {} + | sort; }
remote >/tmp/remote-before
# A tree that the library knows nothing of, mounted by the user where purging removes folders.
as_user mkdir -p /var/tmp/user/$uid/mine
as_user env HOME=/home/$user rclone mount --vfs-cache-mode full /srv/remote \
  /var/tmp/user/$uid/mine >/tmp/rclone 2>&1 &
eventually as_user test -s /var/tmp/user/$uid/mine/kept.txt

take_away purge -y "${all_packages[@]}"
expect none "$(state)" "state of the package"
remote | diff /tmp/remote-before - >&2 || fail "remote files have changed"
as_user test -s /var/tmp/user/$uid/mine/kept.txt || fail "the user's own mount was taken away"
as_user fusermount3 -u /var/tmp/user/$uid/mine
rm -rf /var/tmp/user # the mount point, which purging had to leave

is_as_before /tmp/before
plain_gvfs_is_whole
