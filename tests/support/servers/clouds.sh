# The simulated services, for the demo and the tests of the page. Debian has no gvfs backend for
# clouds, so a simulator also shows the tree that one would mount, and the connection is recorded as
# that mount would have left it. To be sourced; $build is the build tree, $tool the command line
# tool, $user and $uid the box's user, $google_top the folder that a box shows the own files of a
# Google account in (nothing: the tree is the account's), and `eventually` and `zyrovfs` are the caller's.
cloud_conf=/usr/zyro/etc/zyrovfs/cloud.conf
make_cloud_certificates() {
  "$build/tests/support/cloudsim/cloudsim" --make-tls /tmp/tls \
    {accounts,docs,content,login,public,cid-8c8ce076ca278000}.localhost &&
    cat /tmp/tls/ca.pem >>/etc/ssl/certs/ca-certificates.crt &&
    mkdir -p /tmp/journal /tmp/clouds /srv/{box,dropbox,google,onedrive}
}
# start_cloud NAME PORT OPTION...
start_cloud() {
  local name=$1 port=$2
  shift 2
  "$build/tests/support/cloudsim/cloudsim" --$name --tls /tmp/tls/cert.pem /tmp/tls/key.pem \
    --port $port --client demo:demo-secret --account amy@example.com --name Amy \
    --serve /srv/$name --mount /tmp/clouds/$name --journal /tmp/journal/$name "$@" >/tmp/$name-out 2>&1 &
  eventually grep -x ready /tmp/$name-out
}
# start_clouds SECONDS: how long an access token of Box lives
start_clouds() {
  make_cloud_certificates &&
    start_cloud box 8444 --token-life "$1" && start_cloud dropbox 8445 &&
    start_cloud google 8446 ${google_top:+--mount-top "$google_top"} &&
    start_cloud onedrive 8447 || return
  cat >$cloud_conf <<-END
	{"hosts": {"BoxApiHost": "https://localhost:8444",
	  "BoxUploadHost": "https://upload.localhost:8444", "BoxAccountHost": "https://localhost:8444",
	  "DropboxApiHost": "https://localhost:8445",
	  "DropboxContentHost": "https://content.localhost:8445",
	  "DropboxWebHost": "https://localhost:8445",
	  "GoogleApiHost": "https://localhost:8446",
	  "GoogleAccountsHost": "https://accounts.localhost:8446",
	  "LiveApiHost": "https://localhost:8447",
	  "LiveLoginHost": "https://login.localhost:8447",
	  "LiveStorageDomain": ".localhost:8447"}}
	END
  chmod 640 $cloud_conf
  grep -hE '^(api|upload|content|accounts|login)=' /tmp/{box,dropbox,google,onedrive}-out
}
# sign_in NAME: at the service's own page, in a browser that this plays
sign_in() {
  local page
  zyrovfs login $1 --port 0 </dev/null >/tmp/login-$1 2>&1 &
  eventually grep -q '^  http' /tmp/login-$1 && page=$(sed -n 's/^  //p' /tmp/login-$1) &&
    curl -sL --data account=amy@example.com --data decision=allow "$page" >/dev/null && wait $! &&
    tail -n 3 /tmp/login-$1 | head -n 2
}
save_account() {
  echo demo-secret | $tool cloud client add $1 demo --password-stdin && sign_in $1
}
# What is saved takes the place of all live connections.
save_accounts() {
  local name
  for name in box dropbox google onedrive; do save_account $name || return; done
  sed -E 's|"path":"","protocol":"([a-z]+)"|"path":"/tmp/clouds/\1","protocol":"\1"|g' \
    /usr/zyro/etc/zyrovfs/$uid/servers.conf >/var/tmp/zyrovfs/$uid/connect.conf
}
