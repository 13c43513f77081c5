#!/usr/bin/env bash
# What killed writers left is swept away: only that, only when it is old, and through no link.
#   host_sweep_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
build=$1
zyrovfs() { "$build/tools/zyrovfs/zyrovfs" "$@"; }
fail() {
  echo "$*" >&2
  exit 1
}
useradd --uid 4001 --gid 100 amy
useradd --uid 4002 --gid 100 bob
digits=0123456789abcdef
config=/usr/zyro/etc/zyrovfs
mkdir -p -m 1777 $config/4001 /var/tmp/{zyrovfs,user} /var/tmp/zyrovfs/4001 /var/tmp/user/4001 \
  /var/tmp/user/4001/{dbus,zyrovfs,gvfs}
chmod 1777 $config/4001 /var/tmp/zyrovfs /var/tmp/zyrovfs/4001 /var/tmp/user /var/tmp/user/4001
mkdir -p $config/4001/{ssl,sftp} /var/tmp/zos/task/amy /outside
chown amy $config/4001/ssl

# make OWNER PATH...: files of two days ago
make() {
  local owner=$1
  shift
  install -m 600 -o "$owner" /dev/null -D "$1"
  touch -d '2 days ago' "$1"
}
swept=(
  $config/user.conf.$digits $config/4001/servers.conf.$digits $config/4001/sftp/known_hosts.$digits
  /var/tmp/zyrovfs/4001/connect.conf.$digits /var/tmp/user/4001/dbus/dbus.pid.$digits
  /var/tmp/user/4001/zyrovfs/gvfsd.pid.$digits
  /usr/zyro/etc/private/.new-$digits /var/tmp/zos/task/amy/.new-$digits
)
kept=(
  $config/user.conf $config/4001/servers.conf $config/4001/ssl/host:443
  $config/4001/.foreign.servers.conf.$digits # somebody's data
  $config/4001/servers.conf.0123456789abcde $config/4001/servers.conf.0123456789ABCDEF
  $config/4001/servers.conf.$digits.bak .$digits
  /var/tmp/zos/task/amy/1700000000.000000001-0badcafe /var/tmp/zos/task/amy/task.$digits
  /var/tmp/zos/task/amy/.new-0123
  /var/tmp/user/4001/gvfs/report.$digits $config/notauser/servers.conf.$digits
  /outside/servers.conf.$digits
)
cd /outside
for file in "${swept[@]}" "${kept[@]}"; do make root "$file"; done
make amy $config/4001/ssl/host:443.$digits
swept+=($config/4001/ssl/host:443.$digits)
make bob /var/tmp/zyrovfs/4001/servers.conf.$digits # a stranger's
kept+=(/var/tmp/zyrovfs/4001/servers.conf.$digits)
make root $config/4001/young.$digits
touch $config/4001/young.$digits # its writer may be at work
ln /outside/servers.conf.$digits $config/4001/hard.$digits
ln -s /outside/servers.conf.$digits $config/4001/soft.$digits
mkfifo $config/4001/fifo.$digits
mkdir $config/4001/folder.$digits
touch -h -d '2 days ago' $config/4001/{soft,fifo,folder}.$digits
kept+=($config/4001/{young,hard,fifo,folder}.$digits)

# Users' ways to lead it elsewhere: links in the place of folders, and a mount.
ln -s /outside /var/tmp/user/4002
mkdir -p /outside/dbus
make root /outside/dbus/dbus.pid.$digits
mkdir -p /var/tmp/user/4003 /elsewhere && ln -s /elsewhere /var/tmp/user/4003/zyrovfs
make root /elsewhere/gvfsd.pid.$digits
mkdir -p /var/tmp/user/4004/dbus && mount -t tmpfs tmpfs /var/tmp/user/4004/dbus
make root /var/tmp/user/4004/dbus/dbus.pid.$digits
mkdir -p /var/tmp/user/4005/dbus && chown bob /var/tmp/user/4005/dbus # not that user's
make root /var/tmp/user/4005/dbus/dbus.pid.$digits
kept+=(/outside/dbus/dbus.pid.$digits /elsewhere/gvfsd.pid.$digits
  /var/tmp/user/400{4,5}/dbus/dbus.pid.$digits)

! setpriv --reuid=4001 --regid=100 --clear-groups "$build/tools/zyrovfs/zyrovfs" host sweep \
  2>/dev/null || fail "a user may sweep"
zyrovfs host sweep | sed 's/^Removed //' | sort >/tmp/said
printf '%s\n' "${swept[@]}" | sort | diff - /tmp/said >&2 || fail "other files were swept"
for file in "${swept[@]}"; do [ ! -e "$file" ] || fail "$file is left"; done
for file in "${kept[@]}"; do [ -e "$file" ] || fail "$file is gone"; done
[ -L $config/4001/soft.$digits ] || fail "the link is gone"
[ "$(zyrovfs host sweep)" = "" ] || fail "a second time finds more"
[ "$(zyrovfs host sweep --json | tr -d ' \n')" = '{"removed":[]}' ] || fail "the JSON is wrong"
