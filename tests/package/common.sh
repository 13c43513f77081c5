# What the tests of packages share. Source it; each test runs on a private host of its own:
#   NAME_test.sh PACKAGES_DIR [DIR_OF_THE_PACKAGES_BEFORE]
set -Eeuo pipefail
trap 'echo "$0: line $LINENO: $BASH_COMMAND" >&2' ERR
packages=$(realpath "$1")
source=$(realpath "$(dirname "${BASH_SOURCE[0]}")/../..")
export DEBIAN_FRONTEND=noninteractive LC_ALL=C
PATH=$PATH:/usr/sbin:/sbin
[ "$(findmnt -n -o FSTYPE /)" = overlay ] || { echo "only on a private host" >&2; exit 2; }
# Where the machine itself has been used for a try, a test begins on a clean one all the same.
rm -rf /usr/zyro /var/tmp/zyrovfs /var/tmp/user /tmp/zyrovfs /var/tmp/zos

fail() {
  echo "$*" >&2
  exit 1
}
expect() { # EXPECTED ACTUAL WHAT
  [ "$1" = "$2" ] || fail "$3: expected '$1', got '$2'"
}
# quietly COMMAND...: its output is shown when it fails.
quietly() {
  "$@" >/tmp/quietly 2>&1 || {
    cat /tmp/quietly >&2
    return 1
  }
}
eventually() {
  local try
  for ((try = 0; try < 100; ++try)); do
    ! "$@" >/dev/null 2>&1 || return 0
    sleep 0.1
  done
  fail "never came true: $*"
}

# add DIR PACKAGE...: as the README tells, by apt from files
add() {
  local dir=$1 files=() name
  shift
  for name in "$@"; do
    files+=("$dir/${name}"_*.deb)
  done
  quietly apt-get -q install -y --no-install-recommends --allow-downgrades "${files[@]}"
}
tool_packages=(zyrovfs libzyrovfs6 libzosplatform1)
all_packages=("${tool_packages[@]}" libzyrovfs-dev zyrovfs-web zyrovfs-doc)
add_tool() { add "${1:-$packages}" "${tool_packages[@]}"; }
take_away() { quietly apt-get -q "$@"; }
state() { dpkg-query -W -f '${db:Status-Abbrev}' zyrovfs 2>/dev/null || echo none; }

is_ready() { quietly zyrovfs host check || fail "the host is not ready"; }

# Every file of the machine that a package could have to do with; contents where ours replaces some.
snapshot() {
  find /etc /usr /opt /boot /var/lib /var/spool \( -path /var/lib/dpkg -o -path /var/lib/apt \
    -o -path /etc/ld.so.cache \) -prune -o -printf '%p %y %m %U:%G %l\n' | sort
  find /usr/share/gvfs /usr/lib/gvfs /etc/fuse.conf -type f -exec md5sum {} + | sort -k 2
  dpkg-divert --list '*zyrovfs*'
  find /tmp /var/tmp -maxdepth 1 \( -name 'zyro*' -o -name zos -o -name user \) -print
}
# is_as_before SNAPSHOT: what differs is shown
is_as_before() { snapshot | diff "$1" - >&2 || fail "the machine is not as it was"; }
plain_gvfs_is_whole() {
  local damaged
  damaged=$(dpkg --verify gvfs-daemons gvfs-backends gvfs-fuse fuse3 |
    grep -e /usr/share/gvfs -e /usr/lib/gvfs -e /etc/fuse.conf || true)
  expect "" "$damaged" "files of gvfs"
}

# A user with saved profiles, a certificate of the user's own, a policy, and two live connections.
uid=4001 user=amy
ftp=ftp://remo@127.0.0.1:2121 davs=davs://remo@localhost:8443
start_servers() {
  quietly "$source/tests/support/servers/remote" start secret
  useradd --create-home --uid $uid --gid 100 $user
  echo secret >/tmp/password
}
connect_user() {
  local server
  quietly zyrovfs policy set --type custom --enable $user
  for server in "ftp 127.0.0.1 2121" "davs localhost 8443"; do
    set -- $server
    quietly zyrovfs profile add --user $user --protocol "$1" --hostname "$2" --port "$3" \
      --account remo --password-file /tmp/password
    quietly zyrovfs connection add --accept "$1://remo@$2:$3" --user $user
  done
  echo "a remote file" >/srv/remote/kept.txt
  chown remo /srv/remote/kept.txt
}
as_user() { setpriv --reuid=$uid --regid=100 --clear-groups "$@"; }
tree_of() { zyrovfs path "$1" --user $user; }
daemons() { pgrep -u $uid -f 'dbus-daemon|gvfsd' | sort -n | xargs; }
