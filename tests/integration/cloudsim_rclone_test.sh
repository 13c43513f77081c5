#!/usr/bin/env bash
# The simulated Box answers a client that was written for the real one: rclone, which knows only the
# real addresses, finds them on loopback here, under an authority that this machine trusts.
#   cloudsim_rclone_test.sh BUILD_DIR SOURCE_DIR
set -euo pipefail
build=$1
simulator=$build/tests/support/cloudsim/cloudsim
work=$(mktemp -d)
cd "$work"

fail() { echo "$*" >&2; exit 1; }
expect() { [ "$2" = "$1" ] || fail "expected '$1', got '$2'"; }

for name in api upload app dl; do
  echo "127.0.0.1 $name.box.com"
done >>/etc/hosts
"$simulator" --make-tls tls api.box.com upload.box.com app.box.com dl.box.com
cat tls/ca.pem >>/etc/ssl/certs/ca-certificates.crt

mkdir -p cloud/docs/deep
printf 'hello' >cloud/docs/hello.txt
head -c 3000000 /dev/urandom >cloud/docs/deep/large.bin
: >cloud/empty.txt
"$simulator" --box --tls tls/cert.pem tls/key.pem --port 443 \
  --hosts api.box.com upload.box.com dl.box.com \
  --client rclone-id:rclone-secret --account amy@example.com --serve cloud --tokens tokens.json \
  --journal journal --fault 'GET /2.0/folders/ answer=503 header=Retry-After:1' >said 2>errors &
server=$!
trap 'kill $server 2>/dev/null || true' EXIT
for _ in $(seq 100); do
  if grep -qx ready said; then break; fi
  kill -0 $server 2>/dev/null || fail "the simulator ended: $(cat errors)"
  sleep 0.1
done
grep -qx ready said || fail "the simulator is not ready"

token() {
  python3 - "$1" <<'PYTHON'
import json, sys
tokens = json.load(open("tokens.json"))
print(json.dumps({"access_token": tokens["access_token"], "token_type": "bearer",
                  "refresh_token": tokens["refresh_token"], "expiry": sys.argv[1]}))
PYTHON
}
cat >rclone.conf <<EOF
[box]
type = box
client_id = rclone-id
client_secret = rclone-secret
token = $(token 2099-01-01T00:00:00Z)
EOF
box() { timeout 60 rclone --config rclone.conf --retries 1 --low-level-retries 3 "$@"; }
requests() { grep -c "$1" journal || true; }

echo "listing"
box lsf -R box: >listed
expect "$(cd cloud && find . -mindepth 1 -type d -printf '%P/\n' -o -type f -printf '%P\n' | sort)" \
  "$(sort listed)"
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

kill -TERM $server
wait $server || fail "the simulator ended with $?: $(cat errors)"
echo "ok"
