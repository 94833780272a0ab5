#!/usr/bin/env bash
# Leak check: the request flow under valgrind memcheck (--leak-check=full, errors for
# definitely lost blocks, --error-exitcode=1), in private namespaces:
#   1. leak_driver: the plug-in loaded by a host of its own with an in-process registry on
#      the real socket path; every operation, every error path, every scripted registry
#      fault, the registry stopped and started, several Init/Finalize cycles;
#   2. qv-webhost + plug-in (under memcheck) with qv-registry, driven with curl through every
#      operation and error path, the registry killed and restarted; then 15 s of wrk while
#      the registry is killed and restarted every 500 ms, and SIGTERM while wrk still runs.
# With dbus-daemon and avahi-daemon installed, both run in the namespace, so every Init
# announces the target and every Finalize withdraws it.
# Passes when both runs report no memcheck error and no definitely lost byte and their own
# checks pass. Nothing is suppressed. Exits 77 where namespaces or a tool (valgrind, wrk, ss,
# curl) are missing.
#
# Usage: leak_check.sh BIN_DIR LIB_DIR
set -euo pipefail

usage() { sed -n '2,/^set -euo/{/^#/s/^# \{0,1\}//p}' "$0"; }
case "${1:-}" in -h | --help) usage; exit 0 ;; esac

# shellcheck source=../lib/private_system.sh
. "$(dirname "$0")/../lib/private_system.sh"

if [ "${1:-}" != "--inside" ]; then
  [ $# -eq 2 ] || { usage >&2; exit 2; }
  require_tools unshare ip curl valgrind ss wrk
  enter_private_namespaces "$0" "$@"
fi
shift

bin_dir=$(cd "$1" && pwd -P)
lib_dir=$(cd "$2" && pwd -P)
plugin=$lib_dir/libqv_variable_iotolvane.so

make_private_system "$bin_dir"
printf '[SYSTEMSETTINGS]\nHost_Name = leaks\n' >/etc/velmora/share/qv-rt.ini
socket=/tmp/qvPortableRegistry
listening() { ss -xlnH | grep -qF " $socket "; }
memcheck=(valgrind --tool=memcheck --leak-check=full --errors-for-leak-kinds=definite
          --error-exitcode=1 --num-callers=30)

# summarize NAME LOG RC: prints the memcheck summary and judges it.
summarize() {
  local name=$1 log=$2 rc=$3 errors definite indirect reachable
  errors=$(sed -n 's/.*ERROR SUMMARY: \([0-9]*\) errors.*/\1/p' "$log" | tail -1)
  definite=$(sed -n 's/.*definitely lost: \([0-9,]*\) bytes.*/\1/p' "$log" | tail -1)
  indirect=$(sed -n 's/.*indirectly lost: \([0-9,]*\) bytes.*/\1/p' "$log" | tail -1)
  reachable=$(sed -n 's/.*still reachable: \([0-9,]*\) bytes.*/\1/p' "$log" | tail -1)
  # A run whose every block was freed prints no leak summary.
  grep -q "All heap blocks were freed" "$log" && definite=0 indirect=0 reachable=0
  grep -m1 "Command:" "$log" | sed "s/^==[0-9]*== */$name: /"
  grep -m1 "total heap usage" "$log" | sed "s/^==[0-9]*== */$name: /"
  echo "$name memcheck: ${errors:-?} errors, definitely lost ${definite:-?} bytes," \
    "indirectly lost ${indirect:-?} bytes, still reachable ${reachable:-?} bytes (exit $rc)"
  if [ "${errors:-x}" = 0 ] && [ "${definite:-x}" = 0 ] && [ "$rc" -eq 0 ]; then
    pass "$name under memcheck: no errors, no definitely lost bytes"
  else
    failed "$name under memcheck"
    grep -A25 -E "definitely lost in|Invalid|uninitialised|Mismatched|Syscall param" "$log" | head -120 || true
  fi
}

# With a dbus-daemon and an avahi-daemon in the namespace every Init really announces the
# target and every Finalize withdraws it, so the publisher's success path is checked too.
announcing=no
if command -v dbus-daemon >/dev/null && command -v avahi-daemon >/dev/null; then
  ip link add v0 type veth peer name v1
  ip link set v0 multicast on up
  ip link set v1 multicast on up
  ip addr add 169.254.7.2/16 dev v0
  ip addr add 169.254.7.1/16 dev v1
  ip route add default via 169.254.7.2 dev v1
  mkdir -p /run/dbus
  cat >"$work/avahi.conf" <<CONF
[server]
host-name=leaks
use-ipv4=yes
use-ipv6=no
allow-interfaces=v1
enable-dbus=yes
[wide-area]
enable-wide-area=no
[publish]
publish-hinfo=no
publish-workstation=no
CONF
  if dbus-daemon --system --fork --nopidfile >/dev/null && wait_for 10 test -S /run/dbus/system_bus_socket; then
    avahi-daemon --no-drop-root --no-rlimits --no-chroot --no-proc-title -f "$work/avahi.conf" \
      >"$work/avahi.log" 2>&1 &
    wait_for 20 grep -q "Server startup complete" "$work/avahi.log" && announcing=yes
  fi
fi
echo "announcement daemons (dbus-daemon, avahi-daemon) running: $announcing"

# -- 1. The plug-in in a host of its own.
rc=0
"${memcheck[@]}" --log-file="$work/driver.vg" "$bin_dir/leak_driver" "$plugin" 3 \
  >"$work/driver.out" 2>&1 || rc=$?
grep -E '^(PASS|FAIL)' "$work/driver.out" | grep -c '^PASS' | sed 's/^/leak_driver checks passed: /'
grep '^FAIL' "$work/driver.out" || true
grep -q '^PASS: leak driver' "$work/driver.out" && pass "leak_driver: all checks" ||
  failed "leak_driver: its checks failed (see above)"
summarize leak_driver "$work/driver.vg" "$rc"

# -- 2. qv-webhost under memcheck, driven with curl.
"$bin_dir/qv-registry" 2>>"$work/registry.log" &
registry_pid=$!
wait_for 20 test -S "$socket" || { failed "qv-registry did not start"; exit 1; }
"${memcheck[@]}" --log-file="$work/webhost.vg" "$bin_dir/qv-webhost" --plugin "$plugin" \
  --listen 127.0.0.1:8080 --threads 2 --registry external >"$work/webhost.out" 2>"$work/webhost.log" &
webhost_pid=$!
wait_for 120 grep -q "listening on" "$work/webhost.out" ||
  { failed "qv-webhost did not start under memcheck"; cat "$work/webhost.vg"; exit 1; }

base=http://127.0.0.1:8080/qv_variable_iotolvane
call="X_QV_LIBRARY_PATH_NAME=l&X_QV_FUNC_NAME=f&X_QV_CLASS_NAME=c&X_QV_CALLING_CONVENTION=cc"
# expect LABEL WANTED_STATUS WANTED_BODY_PREFIX URL [curl args...]
expect() {
  local label=$1 status=$2 prefix=$3 url=$4 got
  shift 4
  got=$(curl -s -m 60 -o "$work/body" -w '%{http_code}' "$@" "$url") || got=curl-failed
  if [ "$got" = "$status" ] && [[ "$(cat "$work/body")" == "$prefix"* ]]; then
    pass "$label"
  else
    failed "$label: got $got '$(tr '\t\n' '||' <"$work/body")'"
  fi
}
requests() {
  expect "check_version_compatibility" 200 $'0\tcheck_version_compatibility' \
    "$base/check_version_compatibility?X_QV_CLIENT_SIDE_VERSION=1&X_QV_OLDEST_COMPATIBLE_VERSION=1"
  expect "resolve_class_and_url" 200 $'0\tresolve_class_and_url' \
    "$base/resolve_class_and_url?X_QV_TAG=t" -H 'X-Qv-Configured-Class: C'
  expect "register_class_and_url" 200 $'0\tregister_class_and_url' "$base/register_class_and_url" \
    --data 'X_QV_TAG=t&X_QV_CONFIGURED_CLASS=C&X_QV_CLASS_HIERARCHY_CRC=9&parentCount=2&childCount=1&parent0=P0&parent1=P1&child0=K0'
  expect "io_object_proxied" 200 $'0\tio_object_proxied' \
    "$base/io_object_proxied?$call&name=n&leafClassName=lc&resolvedTag=rt&remoteSession=rs"
  expect "invoke_method" 200 $'0\tinvoke_method' \
    "$base/invoke_method?$call&code=0&returnErrClustCode=1&tdr=t&struct=s&numberOfPointers=1&value0=v" \
    -H 'session: 7'
  expect "access_property" 200 $'0\taccess_property' \
    "$base/access_property?ignoreErrors=0&argc=1&numberOfBatches=1&libraryPathName0=P&funcName0=f&className0=c&callingConvention0=cc&action0=1&id0=i&flags0=f&tdr0=t&value0=v" \
    -H 'session: 5'
  expect "close_session" 200 $'0\tclose_session' "$base/close_session?$call&session=0"
  expect "missing variable" 400 $'-356006\t' "$base/check_version_compatibility?X_QV_CLIENT_SIDE_VERSION=1"
  expect "text/html" 406 $'-356007\t' "$base/close_session?$call&session=0" -H 'X-QV-Accept: text/html'
  expect "unknown operation" 501 $'-2147467263\t' "$base/no_such_operation"
  expect "bad session" 500 $'-356020\t' "$base/close_session?$call" -H 'session: 12abc'
  expect "malformed form" 400 "" "$base/resolve_class_and_url" --data 'X_QV_TAG=%zz'
  head -c 1048577 /dev/zero >"$work/big"
  expect "body over 1 MiB" 413 "" "$base/resolve_class_and_url" --data-binary "@$work/big"
}
if [ "$announcing" = yes ] && command -v avahi-browse >/dev/null; then
  if wait_for 30 bash -c "timeout 10 avahi-browse -rpt _qv-iovar._tcp 2>/dev/null |
      grep -qF ';leaks\032qv_variable_iotolvane;_qv-iovar._tcp;local;'"; then
    pass "qv-webhost under memcheck announces the target"
  else
    failed "qv-webhost under memcheck: no announcement seen"
  fi
fi
requests
# The registry killed: transport codes, then served again after it restarts.
kill -KILL "$registry_pid"
wait "$registry_pid" 2>/dev/null || true
got=$(curl -s -m 60 "$base/resolve_class_and_url?X_QV_TAG=t&X_QV_CONFIGURED_CLASS=C")
[[ "$got" =~ ^(-3147[0-9][0-9]|-3148[0-9][0-9]|-356060)$'\t'$ ]] && pass "registry killed: ${got%$'\t'}" ||
  failed "registry killed: '$got'"
got=$(curl -s -m 60 "$base/resolve_class_and_url?X_QV_TAG=t&X_QV_CONFIGURED_CLASS=C")
[[ "$got" =~ ^-3147[0-9][0-9]$'\t'$ ]] && pass "registry down: ${got%$'\t'}" || failed "registry down: '$got'"
"$bin_dir/qv-registry" 2>>"$work/registry.log" &
registry_pid=$!
wait_for 20 listening || failed "qv-registry did not restart"
requests

# Under a modest load (memcheck is slow): wrk for 15 s while the registry is killed and
# restarted every 500 ms for 10 s, then SIGTERM while wrk still sends requests.
wrk -c 8 -t 2 -d 15s "$base/resolve_class_and_url?X_QV_TAG=t&X_QV_CONFIGURED_CLASS=C" \
  >"$work/wrk.txt" 2>&1 &
wrk_pid=$!
for _ in $(seq 1 20); do
  sleep 0.5
  kill -KILL "$registry_pid"
  wait "$registry_pid" 2>/dev/null || true
  "$bin_dir/qv-registry" 2>>"$work/registry.log" &
  registry_pid=$!
done
kill -TERM "$webhost_pid"
rc=0
wait "$webhost_pid" || rc=$?
wait "$wrk_pid" || true
echo "under memcheck with 20 registry restarts: $(awk '/requests in/ { print $1 }' "$work/wrk.txt") requests," \
  "then SIGTERM while requests ran"
summarize qv-webhost "$work/webhost.vg" "$rc"
kill -TERM "$registry_pid"
wait "$registry_pid" || true

[ "$fail" -eq 0 ] && echo "PASS: leak check" || echo "FAIL: leak check"
exit "$fail"
