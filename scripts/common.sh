# What the scripts share. Source it; it changes to the top of the tree.
set -euo pipefail
cd "$(dirname "${BASH_SOURCE[0]}")/.."

# What the library is built with and what it runs on.
BUILD_PACKAGES=(
  g++ cmake ninja-build pkg-config ccache
  mold libglib2.0-dev libsoup2.4-dev libjsoncpp-dev libcurl4-openssl-dev libssl-dev libcli11-dev
  zlib1g-dev
)
RUN_PACKAGES=(
  dbus-daemon gvfs gvfs-daemons gvfs-backends gvfs-fuse fuse3 libglib2.0-bin
  openssh-client ca-certificates
)
# The servers that demo and tests mount, and what the private view of the machine needs.
SERVER_PACKAGES=(
  vsftpd openssh-server lighttpd lighttpd-mod-webdav lighttpd-mod-openssl samba glib-networking
  iproute2 util-linux openssl procps libmicrohttpd-dev libgnutls28-dev libfuse3-dev
)
# The web servers that the web layer is set up for, with their log-in by PAM.
WEB_PACKAGES=(
  lighttpd lighttpd-mod-authn-pam nginx libnginx-mod-http-auth-pam fcgiwrap spawn-fcgi
)
TEST_PACKAGES=(
  "${WEB_PACKAGES[@]}" unzip
  libgtest-dev libgmock-dev clang clang-tidy clang-format libclang-rt-14-dev python3
  man-db groff-base bsdextrautils rclone curl strace
)
# The page in its browsers, behind its web server.
BROWSER_PACKAGES=(
  chromium chromium-driver firefox-esr fonts-dejavu-core python3 curl lighttpd-mod-deflate socat
)
BENCH_PACKAGES=(libbenchmark-dev python3 libmicrohttpd-dev libgnutls28-dev libfuse3-dev nginx curl rclone)
PACKAGE_PACKAGES=(debhelper lintian diffoscope-minimal abigail-tools autopkgtest xz-utils systemd)

need_root() {
  [ "$(id -u)" = 0 ] || { echo "$0: root is needed: sudo $0" >&2; exit 2; }
}

# Installs what is missing and says so; a machine that has everything is not asked for network.
install_packages() {
  local missing=() package
  for package in "$@"; do
    dpkg-query -W -f '${Status}' "$package" 2>/dev/null | grep -q ' installed$' ||
      missing+=("$package")
  done
  [ ${#missing[@]} -gt 0 ] || return 0
  echo "Installing: ${missing[*]}"
  # Packages of servers start them; ours run on the private view of the machine only.
  local policy=/usr/sbin/policy-rc.d made=""
  if [ ! -e $policy ]; then
    printf '#!/bin/sh\nexit 101\n' >$policy
    chmod +x $policy
    made=yes
  fi
  local code=0
  { apt-get update && DEBIAN_FRONTEND=noninteractive \
      apt-get install -y --no-install-recommends "${missing[@]}"; } >/tmp/zyrovfs-apt.log 2>&1 || code=$?
  [ -z "$made" ] || rm -f $policy
  if [ $code != 0 ]; then
    tail -n 20 /tmp/zyrovfs-apt.log >&2
    echo "The packages could not be installed." >&2
    exit 1
  fi
  rm -f /tmp/zyrovfs-apt.log
}

# build PRESET [TARGET]...: configures and builds, silent unless it fails.
build() {
  local log
  log=$(mktemp)
  if ! { cmake --preset "$1" && cmake --build --preset "$1" ${2:+--target "${@:2}"}; } >"$log" 2>&1; then
    tail -n 60 "$log" >&2
    rm -f "$log"
    echo "The build ($1) failed." >&2
    exit 1
  fi
  rm -f "$log"
}
