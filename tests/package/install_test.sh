#!/usr/bin/env bash
# apt installs the packages, asks nothing, and the machine is ready: a user connects at once.
. "$(dirname "$0")/common.sh"
start_servers

add "$packages" "${all_packages[@]}" </dev/null
is_ready
expect "zyrovfs 6" "$(zyrovfs --version | cut -d. -f1)" "version"
expect /lib/systemd/system/zyrovfs-sweep.timer \
  "$(readlink /etc/systemd/system/timers.target.wants/zyrovfs-sweep.timer)" "timer"
quietly man -w 1 zyrovfs
quietly man -w 5 zyrovfs-cloud.conf
quietly man -w 5 zyrovfs.mount
quietly man -w 8 zyrovfs-host
[ -s /usr/share/doc/zyrovfs/host-setup.md ] || fail "no documents"

connect_user
expect "a remote file" "$(as_user cat "$(tree_of $ftp)/kept.txt")" "file by ftp"
expect "a remote file" "$(as_user cat "$(tree_of $davs)/kept.txt")" "file by davs"

# Once more, while the user is connected.
quietly apt-get -q install --reinstall -y "$packages"/{zyrovfs,libzyrovfs6,libzosplatform1}_*.deb
is_ready
expect "a remote file" "$(as_user cat "$(tree_of $ftp)/kept.txt")" "file after a reinstallation"
