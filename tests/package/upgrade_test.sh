#!/usr/bin/env bash
# Profiles, certificates, policy and live connections pass through an upgrade; what reads and what
# writes by then goes on.
. "$(dirname "$0")/common.sh"
before=$(realpath "$2")
start_servers
add_tool "$before"
old=$(dpkg-query -W -f '${Version}' zyrovfs)
connect_user
config=/usr/zyro/etc/zyrovfs
kept() {
  find $config /usr/zyro/etc/private /var/tmp/zyrovfs -type f -exec md5sum {} + | sort -k 2
  find $config /usr/zyro/etc/private /var/tmp/zyrovfs -printf '%p %y %m %U:%G\n' | sort
}
kept >/tmp/kept-before
grep -q "$config/$uid/ssl/localhost:8443" /tmp/kept-before || fail "no certificate was saved"
processes=$(daemons)
head -c 3000000 /dev/urandom >/srv/remote/large
chown remo /srv/remote/large
tree=$(tree_of $davs)
eventually as_user test -s "$tree/large"
mkfifo -m 666 /tmp/go
as_user sh -c "exec 9<'$tree/large'; head -c 100000 <&9; read -r go </tmp/go; cat <&9" >/tmp/read &
reader=$!
eventually test -s /tmp/read

add_tool
new=$(dpkg-query -W -f '${Version}' zyrovfs)
dpkg --compare-versions "$new" gt "$old" || fail "$old was not upgraded by $new"
is_ready
kept | diff /tmp/kept-before - >&2 || fail "files of users have changed"
expect "$processes" "$(daemons)" "daemons of the user"
echo go >/tmp/go
wait "$reader"
expect "$(md5sum </srv/remote/large)" "$(md5sum </tmp/read)" "file that was read meanwhile"
expect "a remote file" "$(as_user cat "$(tree_of $ftp)/kept.txt")" "file by ftp"
echo new | as_user tee "$(tree_of $ftp)/new.txt" >/dev/null
eventually grep -qx new /srv/remote/new.txt
quietly zyrovfs policy check --user $user
