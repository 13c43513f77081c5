#!/usr/bin/env bash
# A disk that fills up while the catalogue is put in place: the installation fails in words, and is
# finished or undone when there is room again.
. "$(dirname "$0")/common.sh"
catalogue=/usr/share/gvfs/mounts
snapshot >/tmp/before

fill() {
  cp -a $catalogue /tmp/stock
  mount -t tmpfs -o size=10m,mode=755 tmpfs $catalogue
  cp -a /tmp/stock/. $catalogue
  rm -rf /tmp/stock
  # What is left is room for five of the files.
  mount -o "remount,size=$(($(df --output=used -k $catalogue | tail -1) + 20))k" $catalogue
}
fails_in_words() {
  ! dpkg -i "$packages"/{libzosplatform1,libzyrovfs6,zyrovfs}_*.deb >/tmp/log 2>&1 ||
    fail "the disk was not full"
  grep -q "Writing $catalogue/.* failed: No space left on device" /tmp/log || {
    cat /tmp/log >&2
    fail "nothing was said about the disk"
  }
}

fill
fails_in_words
mount -o remount,size=10m $catalogue
quietly dpkg --configure -a
is_ready
quietly dpkg --purge zyrovfs
umount $catalogue

fill
fails_in_words
quietly dpkg --purge "${tool_packages[@]}" # while it is still full
diff -r <(cd $catalogue && md5sum *) <(umount $catalogue && cd $catalogue && md5sum *) >&2 ||
  fail "stock files have changed"
is_as_before /tmp/before
