#!/usr/bin/env bash
# The simulated Dropbox answers a client that was written for the real one.
#   cloudsim_rclone_dropbox_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
# shellcheck source=tests/integration/cloudsim_rclone.sh
. "$2/tests/integration/cloudsim_rclone.sh" "$1"
take_names api.dropboxapi.com content.dropboxapi.com notify.dropboxapi.com

mkdir -p cloud/Docs/deep
printf 'hello' >cloud/Docs/Hello.txt
head -c 3000000 /dev/urandom >cloud/Docs/deep/large.bin
: >cloud/empty.txt
# More than one page of a listing.
mkdir cloud/many
for i in $(seq 1005); do : >"cloud/many/$i"; done
start --dropbox --hosts api.dropboxapi.com content.dropboxapi.com notify.dropboxapi.com \
  --fault 'POST /2/files/list_folder answer=503 header=Retry-After:1'
make_remote dropbox
dropbox() { rclone_here "$@"; }
count() { requests "\"POST\".*\"status\":200,\"target\":\"/2/files/$1\""; }

echo "listing"
dropbox lsf -R dropbox: >listed
expect "$(names cloud)" "$(sort listed)"
[ "$(count list_folder/continue)" -ge 1 ] || fail "one page held all"
dropbox purge dropbox:many
grep -q '"status":503' journal || fail "the fault was not met"
expect "Hello.txt" "$(dropbox lsf --files-only dropbox:docs)"

echo "content hashes"
dropbox check cloud dropbox: >checked 2>&1 || fail "$(cat checked)"
grep -q "3 matching files" checked || fail "not compared: $(cat checked)"
if grep -q "could not be checked" checked; then fail "without hashes: $(cat checked)"; fi

echo "download"
dropbox copy dropbox: down
diff -r cloud down
expect "ell" "$(dropbox cat --offset 1 --count 3 dropbox:Docs/Hello.txt)"
expect "" "$(dropbox cat dropbox:empty.txt)"

echo "upload"
mkdir -p up/inner
printf 'small' >up/small.txt
head -c 20000000 /dev/urandom >up/inner/large.bin
: >up/nothing
printf 'umlauts' >"up/grüße & more.txt"
dropbox copy --dropbox-chunk-size 8M up dropbox:up
diff -r up cloud/up
dropbox check up dropbox:up
dropbox check --download up dropbox:up
[ "$(count upload_session/start)" -ge 4 ] || fail "no upload sessions: $(count upload_session/start)"
[ "$(count upload_session/append_v2)" -ge 2 ] || fail "no pieces"
[ "$(count upload_session/finish_batch_v2)" -ge 1 ] || fail "no batch"

echo "upload without batches"
dropbox copy --dropbox-batch-mode off --dropbox-chunk-size 8M up dropbox:again
diff -r up cloud/again
[ "$(count upload)" -ge 3 ] || fail "no uploads in one request"
[ "$(count upload_session/finish)" -ge 1 ] || fail "no session was finished"

echo "new version"
printf 'a longer one than before' >up/small.txt
dropbox copy up dropbox:up
diff -r up cloud/up

echo "copy"
dropbox copyto dropbox:up/small.txt dropbox:copied/other.txt
cmp up/small.txt cloud/copied/other.txt
expect 1 "$(count copy_v2)"

echo "move and rename"
dropbox moveto dropbox:copied/other.txt dropbox:Docs/moved.txt
cmp up/small.txt cloud/Docs/moved.txt
[ ! -e cloud/copied/other.txt ] || fail "the moved file is still there"
dropbox moveto dropbox:up/inner dropbox:Docs/inner
cmp up/inner/large.bin cloud/Docs/inner/large.bin
expect 2 "$(count move_v2)"

echo "delete"
dropbox deletefile dropbox:Docs/moved.txt
[ ! -e cloud/Docs/moved.txt ] || fail "the deleted file is still there"
if dropbox rmdir dropbox:Docs 2>refused; then fail "a full folder was removed"; fi
dropbox rmdir dropbox:copied
dropbox purge dropbox:docs
dropbox purge dropbox:again
expect "empty.txt up" "$(cd cloud && echo *)"
dropbox mkdir dropbox:new/inside
[ -d cloud/new/inside ] || fail "no folder was made"

echo "quota"
expect '"used": 31' "$(dropbox about --json dropbox: | grep -o '"used": 31')"

echo "renewal"
sed -i 's/2099-01-01/2001-01-01/' rclone.conf
dropbox lsf dropbox: >listed
expect "empty.txt new/ up/" "$(sort listed | xargs)"
[ "$(requests '"POST".*"status":200,"target":"/\(1/\)\?oauth2/token"')" = 1 ] || fail "no renewal"
grep -q '"refresh_token"' rclone.conf
dropbox lsf dropbox: >/dev/null

stop
echo "ok"
