# What the tests with rclone share: the simulator at the real hosts' addresses, found on loopback
# under an authority that this machine trusts, and a client that knows only those. Source it with
# the build directory as its argument; it changes to a directory of its own.
set -euo pipefail
simulator=$1/tests/support/cloudsim/cloudsim
work=$(mktemp -d)
cd "$work"

fail() { echo "$*" >&2; exit 1; }
expect() { [ "$2" = "$1" ] || fail "expected '$1', got '$2'"; }
# requests PATTERN: how many lines of the journal fit.
requests() { grep -c "$1" journal || true; }

# take_names NAME...: they lead to this machine, and their certificate is good.
take_names() {
  local name
  for name in "$@"; do
    echo "127.0.0.1 $name"
  done >>/etc/hosts
  "$simulator" --make-tls tls "$@"
  cat tls/ca.pem >>/etc/ssl/certs/ca-certificates.crt
}

# start OPTION...: serves the folder "cloud" until the test ends.
start() {
  "$simulator" "$@" --tls tls/cert.pem tls/key.pem --port 443 --client rclone-id:rclone-secret \
    --account amy@example.com --serve cloud --tokens tokens.json --journal journal >said 2>errors &
  server=$!
  trap 'kill $server 2>/dev/null || true' EXIT
  local _
  for _ in $(seq 100); do
    if grep -qx ready said; then break; fi
    kill -0 $server 2>/dev/null || fail "the simulator ended: $(cat errors)"
    sleep 0.1
  done
  grep -qx ready said || fail "the simulator is not ready"
}

stop() {
  kill -TERM $server
  wait $server || fail "the simulator ended with $?: $(cat errors)"
}

# token EXPIRY: what rclone keeps of a login.
token() {
  python3 - "$1" <<'PYTHON'
import json, sys
tokens = json.load(open("tokens.json"))
print(json.dumps({"access_token": tokens["access_token"], "token_type": "bearer",
                  "refresh_token": tokens["refresh_token"], "expiry": sys.argv[1]}))
PYTHON
}

# make_remote KIND: writes rclone.conf with one remote, called as its kind.
make_remote() {
  cat >rclone.conf <<CONF
[$1]
type = $1
client_id = rclone-id
client_secret = rclone-secret
token = $(token 2099-01-01T00:00:00Z)
CONF
}
rclone_here() { timeout 60 rclone --config rclone.conf --retries 1 --low-level-retries 3 "$@"; }

# names FOLDER: all below it as rclone lists them.
names() {
  (cd "$1" && find . -mindepth 1 -type d -printf '%P/\n' -o -type f -printf '%P\n' | sort)
}
