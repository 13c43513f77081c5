#!/usr/bin/env bash
# Two versions of the library side by side: no file of the one is a file of the next.
. "$(dirname "$0")/common.sh"
add_tool
next=/tmp/next
mkdir $next
for package in libzyrovfs6:libzyrovfs7:libzyrovfs.so.6:libzyrovfs.so.7 \
  libzosplatform1:libzosplatform2:libzosplatform.so.1:libzosplatform.so.2; do
  IFS=: read -r old new so next_so <<<"$package"
  quietly dpkg-deb --raw-extract "$packages/${old}"_*.deb $next/$new
  sed -i "s/^Package: .*/Package: $new/; s/\b$old\b/$new/g; s/^Depends: .*/Depends: libc6/" \
    $next/$new/DEBIAN/control
  find $next/$new -depth -name "*$so*" | while read -r file; do
    mv "$file" "$(dirname "$file")/$(basename "$file" | sed "s/$so/$next_so/")"
  done
  find $next/$new -depth -path "*/$old" | while read -r file; do mv "$file" "$(dirname "$file")/$new"; done
  find $next/$new/usr/lib -type l -lname "*$so*" | while read -r link; do
    ln -sf "$(readlink "$link" | sed "s/$so/$next_so/")" "$link"
  done
  rm -f $next/$new/DEBIAN/{md5sums,symbols,shlibs}
  quietly dpkg-deb --build --root-owner-group $next/$new $next/$new.deb
  quietly dpkg -i $next/$new.deb || fail "$new does not fit beside $old"
done
for package in libzyrovfs6 libzyrovfs7 libzosplatform1 libzosplatform2; do
  expect "ii " "$(dpkg-query -W -f '${db:Status-Abbrev}' $package)" "state of $package"
done
ldd /usr/bin/zyrovfs | grep -q 'libzyrovfs.so.6 => /lib' || fail "the tool has lost its library"
quietly zyrovfs protocol list
quietly dpkg --purge libzyrovfs7 libzosplatform2
quietly zyrovfs protocol list
