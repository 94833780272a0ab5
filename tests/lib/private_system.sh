# Shared by the end-to-end scripts (sourced, not run): entering private namespaces, the
# PASS/FAIL bookkeeping, bounded polling and the private system they run in.

# Exits 77 (CTest's skip) unless every named tool is installed.
require_tools() {
  local tool
  for tool in "$@"; do
    command -v "$tool" >/dev/null || { echo "SKIP: $tool is not installed"; exit 77; }
  done
}

# Runs SCRIPT --inside ARGS... in private mount, network and pid namespaces, whose processes
# die with it; exits 77 where such namespaces are not permitted.
enter_private_namespaces() {
  local script=$1
  shift
  local unshare=(unshare --mount --net --pid --fork --mount-proc --propagation private)
  if ! "${unshare[@]}" true 2>/dev/null; then
    echo "SKIP: private namespaces are not permitted here"
    exit 77
  fi
  exec "${unshare[@]}" "$script" --inside "$@"
}

fail=0
pass() { echo "PASS: $*"; }
failed() { echo "FAIL: $*"; fail=1; }

# Polls a command until it succeeds or the deadline (seconds) passes.
wait_for() {
  local deadline=$(($(date +%s) + $1))
  shift
  until "$@"; do
    [ "$(date +%s)" -lt "$deadline" ] || return 1
    sleep 0.1
  done
}

# Inside the namespaces: tmpfs on /tmp and /run, a private /etc with an empty
# /etc/velmora/share, loopback up; sets work=/tmp/work. A build tree under /tmp or /run
# (BIN_DIR lies in it) would vanish under the tmpfs: its top folder is bound back at the
# same path, as its RUNPATHs need it.
make_private_system() {
  local bin_dir=$1 top rel old
  for top in /tmp /run; do
    rel=${bin_dir#"$top"/}
    if [ "$rel" = "$bin_dir" ]; then
      mount -t tmpfs tmpfs "$top" || exit 1
      continue
    fi
    rel=${rel%%/*}
    exec {old}<"$top"
    mount -t tmpfs tmpfs "$top" || exit 1
    mkdir -p "$top/$rel"
    mount --no-canonicalize --bind "/proc/self/fd/$old/$rel" "$top/$rel" || exit 1
    exec {old}<&-
  done
  work=/tmp/work
  mkdir -p "$work/etc"
  mount -t tmpfs tmpfs "$work/etc" && cp -a /etc/. "$work/etc/" && mount --bind "$work/etc" /etc ||
    { echo "cannot make a private /etc" >&2; exit 1; }
  mkdir -p /etc/velmora/share
  rm -f /etc/velmora/share/qv-rt.ini
  ip link set lo up
}
