#!/usr/bin/env bash
# Installation, removal and purging, killed at one step after the other and repeated.
. "$(dirname "$0")/common.sh"
snapshot >/tmp/before
apt-get -q install -y --download-only "$packages"/{zyrovfs,libzyrovfs6,libzosplatform1}_*.deb \
  >/dev/null 2>&1 || true

# break_at PROGRAM N: the Nth start of the program kills whoever started it, and dpkg or not
break_at() {
  cat >/run/wrapper <<END
#!/bin/bash
echo x >>/run/count
if [ \$(wc -l </run/count) = $2 ]; then
  ${3:-kill -KILL \$PPID}
  exit 1
fi
exec $1.real "\$@"
END
  chmod 755 /run/wrapper
  : >/run/count
  [ -e "$1.real" ] || cp -a "$1" "$1.real"
  cp /run/wrapper "$1"
}
mend() { mv "$1.real" "$1"; }

kill_dpkg='kill -KILL $(pgrep -x dpkg) $PPID'
divert=/usr/bin/dpkg-divert
for step in 1 2 3 20 34; do
  for whom in 'kill -KILL $PPID' "$kill_dpkg"; do
    break_at $divert $step "$whom"
    ! dpkg -i "$packages"/{libzosplatform1,libzyrovfs6,zyrovfs}_*.deb >/tmp/log 2>&1 ||
      fail "installation was not broken off at step $step"
    mend $divert
    quietly dpkg --configure -a || fail "the installation could not be taken up at step $step"
    expect "ii " "$(state)" "state after step $step"
    is_ready

    break_at $divert $step "$whom"
    ! dpkg --remove zyrovfs >/tmp/log 2>&1 || fail "removal was not broken off at step $step"
    mend $divert
    quietly dpkg --configure -a
    quietly dpkg --remove zyrovfs || fail "the removal could not be repeated at step $step"
    plain_gvfs_is_whole
  done
done

# A broken installation can also be purged as it stands.
break_at $divert 20 "$kill_dpkg"
! dpkg -i "$packages"/{libzosplatform1,libzyrovfs6,zyrovfs}_*.deb >/tmp/log 2>&1
mend $divert
quietly dpkg --purge zyrovfs
quietly add_tool

# Purging removes folder after folder.
dpkg --remove zyrovfs >/dev/null 2>&1
for step in 1 3 6; do
  break_at /bin/rm $step "$kill_dpkg"
  ! dpkg --purge zyrovfs >/tmp/log 2>&1 || fail "purging was not broken off at step $step"
  mend /bin/rm
done
quietly dpkg --purge "${tool_packages[@]}"
rm -f /run/wrapper /run/count
is_as_before /tmp/before
