#!/usr/bin/env bash
# Load test: qv-registry and qv-webhost (+ the plug-in) in private namespaces, driven by wrk
# with 8 connections on one operation: a 5 s warm-up, then 30 s. Passes when wrk saw no
# socket error and no non-2xx answer, every answer carried code 0, and the resident memory
# of the web host after the run is within 1 MiB of its value after the warm-up.
# Exits 77 (skipped) where namespaces are not permitted or a tool is missing.
#
# Usage: load_e2e.sh BIN_DIR LIB_DIR
# Environment: QV_LOAD_SECONDS (default 30), QV_WARMUP_SECONDS (default 5).
set -euo pipefail

usage() { sed -n '2,/^set -euo/{/^#/s/^# \{0,1\}//p}' "$0"; }
case "${1:-}" in -h | --help) usage; exit 0 ;; esac

# shellcheck source=../lib/private_system.sh
. "$(dirname "$0")/../lib/private_system.sh"

if [ "${1:-}" != "--inside" ]; then
  [ $# -eq 2 ] || { usage >&2; exit 2; }
  require_tools unshare ip curl wrk
  enter_private_namespaces "$0" "$@"
fi
shift

bin_dir=$(cd "$1" && pwd -P)
lib_dir=$(cd "$2" && pwd -P)
here=$(cd "$(dirname "$0")" && pwd -P)
seconds=${QV_LOAD_SECONDS:-30}
warmup=${QV_WARMUP_SECONDS:-5}

make_private_system "$bin_dir"
printf '[SYSTEMSETTINGS]\nHost_Name = load\n' >/etc/velmora/share/qv-rt.ini
socket=/tmp/qvPortableRegistry
url="http://127.0.0.1:8080/qv_variable_iotolvane/resolve_class_and_url?X_QV_TAG=tag1&X_QV_CONFIGURED_CLASS=Pump"

"$bin_dir/qv-registry" 2>"$work/registry.log" &
registry_pid=$!
wait_for 20 test -S "$socket" || { failed "qv-registry did not start"; exit 1; }
"$bin_dir/qv-webhost" --plugin "$lib_dir/libqv_variable_iotolvane.so" --listen 127.0.0.1:8080 \
  --threads 4 --registry external >"$work/webhost.out" 2>"$work/webhost.log" &
webhost_pid=$!
wait_for 30 grep -q "listening on" "$work/webhost.out" || { failed "qv-webhost did not start"; exit 1; }

answer=$(curl -s "$url")
want=$'0\tresolve_class_and_url\ntag1\nPump'
[ "$answer" = "$want" ] && pass "one request answered: ${answer//$'\n'/\\n}" ||
  { failed "first answer '$answer'"; exit 1; }

rss_kib() { awk '/^VmRSS:/ { print $2 }' "/proc/$webhost_pid/status"; }

# Runs wrk for $1 seconds; prints its report into $2 and the figures into the variables
# requests, rate, non2xx, socket_errors.
run_wrk() {
  wrk -c 8 -t 2 -d "${1}s" -s "$here/answer_codes.lua" "$url" >"$2" 2>&1 || true
  requests=$(awk '/requests in/ { print $1 }' "$2")
  rate=$(awk '/^Requests\/sec:/ { print $2 }' "$2")
  non2xx=$(awk '/Non-2xx or 3xx responses:/ { print $NF }' "$2")
  non2xx=${non2xx:-0}
  socket_errors=$(sed -n 's/.*Socket errors: //p' "$2")
  socket_errors=${socket_errors:-none}
}

run_wrk "$warmup" "$work/warmup.txt"
echo "warm-up: $requests requests in ${warmup}s"
rss_warm=$(rss_kib)
run_wrk "$seconds" "$work/load.txt"
rss_after=$(rss_kib)
cat "$work/load.txt"

[ -n "$requests" ] && [ "$requests" -gt 0 ] && pass "load: $requests requests in ${seconds}s, $rate requests/s" ||
  failed "wrk made no requests"
[ "$socket_errors" = none ] && pass "socket errors: none" || failed "socket errors: $socket_errors"
[ "$non2xx" -eq 0 ] && pass "non-2xx answers: 0" || failed "non-2xx answers: $non2xx"
# The Lua script counts answers by their code; every one must be 0.
codes=$(grep '^answer code' "$work/load.txt" || true)
if [ -n "$codes" ] && [ "$(grep -vc '^answer code 0 ' <<<"$codes")" -eq 0 ]; then
  pass "every answer has code 0"
else
  failed "answer codes: ${codes:-none counted}"
fi
growth=$((rss_after - rss_warm))
echo "RSS after warm-up ${rss_warm} KiB, after the run ${rss_after} KiB (${growth} KiB)"
[ "${growth#-}" -le 1024 ] && pass "RSS within 1 MiB of its warm-up value" ||
  failed "RSS changed by ${growth} KiB"

kill -0 "$webhost_pid" 2>/dev/null && pass "qv-webhost alive after the run" || failed "qv-webhost died"
kill -TERM "$webhost_pid"
rc=0
wait "$webhost_pid" || rc=$?
[ "$rc" -eq 0 ] && pass "qv-webhost: SIGTERM, exit 0" || failed "qv-webhost: exit $rc after SIGTERM"
kill -TERM "$registry_pid"
wait "$registry_pid" || true

[ "$fail" -eq 0 ] && echo "PASS: load" || { echo "FAIL: load"; tail -5 "$work/webhost.log"; }
exit "$fail"
