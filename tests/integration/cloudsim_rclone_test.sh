#!/usr/bin/env bash
# The simulated Box answers a client that was written for the real one.
#   cloudsim_rclone_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
# shellcheck source=tests/integration/cloudsim_rclone.sh
. "$2/tests/integration/cloudsim_rclone.sh" "$1"
take_names api.box.com upload.box.com app.box.com dl.box.com

mkdir -p cloud/docs/deep
printf 'hello' >cloud/docs/hello.txt
head -c 3000000 /dev/urandom >cloud/docs/deep/large.bin
: >cloud/empty.txt
start --box --hosts api.box.com upload.box.com dl.box.com \
  --fault 'GET /2.0/folders/ answer=503 header=Retry-After:1'
make_remote box
box() { rclone_here "$@"; }

echo "listing"
box lsf -R box: >listed
expect "$(names cloud)" "$(sort listed)"
expect 503 "$(python3 -c 'import json; print(json.loads(open("journal").readline())["status"])')"
expect "$(cd cloud && sha1sum docs/deep/large.bin)" "$(box sha1sum box:docs/deep | sed 's| \+|  docs/deep/|')"

echo "download"
box copy box: down
diff -r cloud down
expect "" "$(box cat --offset 0 --count 0 box:docs/hello.txt)"
expect "ell" "$(box cat --offset 1 --count 3 box:docs/hello.txt)"
expect "" "$(box cat box:empty.txt)"

echo "upload"
mkdir -p up/inner
printf 'small' >up/small.txt
head -c 20000000 /dev/urandom >up/inner/large.bin
: >up/nothing
printf 'umlauts' >"up/grüße & more.txt"
box copy up box:up
diff -r up cloud/up
box check up box:up
box check --download up box:up

echo "new version"
printf 'a longer one than before' >up/small.txt
box copy up box:up
diff -r up cloud/up
expect 1 "$(requests '"POST","number":[0-9]*,"status":201,"target":"/api/2.0/files/[0-9]*/content')"

echo "copy"
box copyto box:up/small.txt box:copied/other.txt
cmp up/small.txt cloud/copied/other.txt
expect 1 "$(requests '"target":"/2.0/files/[0-9]*/copy')"

echo "move and rename"
box moveto box:copied/other.txt box:docs/moved.txt
cmp up/small.txt cloud/docs/moved.txt
[ ! -e cloud/copied/other.txt ] || fail "the moved file is still there"
box moveto box:up/inner box:docs/inner
cmp up/inner/large.bin cloud/docs/inner/large.bin
expect 1 "$(requests '"PUT".*"target":"/2.0/folders/')"

echo "delete"
box deletefile box:docs/moved.txt
[ ! -e cloud/docs/moved.txt ] || fail "the deleted file is still there"
if box rmdir box:docs 2>refused; then fail "a full folder was removed"; fi
box rmdir box:copied
box purge box:docs
expect "empty.txt up" "$(cd cloud && echo *)"
box mkdir box:new/inside
[ -d cloud/new/inside ] || fail "no folder was made"

echo "quota"
expect '"used": 31' "$(box about --json box: | grep -o '"used": 31')"

echo "renewal"
sed -i 's/2099-01-01/2001-01-01/' rclone.conf
box lsf box: >listed
expect "empty.txt new/ up/" "$(sort listed | xargs)"
expect 1 "$(requests '"POST".*"status":200,"target":"/api/oauth2/token"')"
grep -q '"refresh_token"' rclone.conf
if grep -qF "$(sed -n 's/^refresh_token=//p' said)" rclone.conf; then fail "the old token was kept"; fi
box lsf box: >/dev/null

stop
echo "ok"
