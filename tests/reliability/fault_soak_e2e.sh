#!/usr/bin/env bash
# Fault soak: qv-webhost (--registry external) under wrk load while qv-registry is killed
# with SIGKILL and restarted every 500 ms for 30 s, in private namespaces. Each cycle:
#   1. kill -9 the registry and reap it;
#   2. probe with curl while it is down: the answer must be a transport code (this also
#      makes the plug-in notice the dead connection, if wrk has not already);
#   3. start a new registry and wait until its socket is listening (ss);
#   4. probe again: the first probe request after the registry listens must succeed.
# Every answer seen (wrk's, counted by code, and the probes') must be code 0 with HTTP 200
# or a transport code (-314899..-314700, -356060) with HTTP 500; the web host must be alive
# at the end and stop cleanly on SIGTERM.
# Exits 77 (skipped) where namespaces are not permitted or a tool is missing.
#
# Usage: fault_soak_e2e.sh BIN_DIR LIB_DIR
# Environment: QV_SOAK_SECONDS (default 30), QV_SOAK_PERIOD_MS (default 500).
set -euo pipefail

usage() { sed -n '2,/^set -euo/{/^#/s/^# \{0,1\}//p}' "$0"; }
case "${1:-}" in -h | --help) usage; exit 0 ;; esac

# shellcheck source=../lib/private_system.sh
. "$(dirname "$0")/../lib/private_system.sh"

if [ "${1:-}" != "--inside" ]; then
  [ $# -eq 2 ] || { usage >&2; exit 2; }
  require_tools unshare ip curl wrk ss
  enter_private_namespaces "$0" "$@"
fi
shift

bin_dir=$(cd "$1" && pwd -P)
lib_dir=$(cd "$2" && pwd -P)
here=$(cd "$(dirname "$0")" && pwd -P)
seconds=${QV_SOAK_SECONDS:-30}
period_ms=${QV_SOAK_PERIOD_MS:-500}

make_private_system "$bin_dir"
printf '[SYSTEMSETTINGS]\nHost_Name = soak\n' >/etc/velmora/share/qv-rt.ini
socket=/tmp/qvPortableRegistry
url="http://127.0.0.1:8080/qv_variable_iotolvane/resolve_class_and_url?X_QV_TAG=tag1&X_QV_CONFIGURED_CLASS=Pump"

registry_pid=
start_registry() {
  "$bin_dir/qv-registry" 2>>"$work/registry.log" &
  registry_pid=$!
}
listening() { ss -xlnH | grep -qF " $socket "; }
# Polls every 10 ms until the registry listens or $1 ms have passed.
await_listening() {
  local deadline=$(($(now_ms) + $1))
  until listening; do
    [ "$(now_ms)" -lt "$deadline" ] || return 1
    sleep 0.01
  done
}

now_ms() { date +%s%3N; }

# probe: stores "<HTTP status> <code>" of one request in $probe ("curl-failed" when the
# web host did not answer at all).
probe() {
  local status
  status=$(curl -s -m 10 -o "$work/probe.body" -w '%{http_code}' "$url") || status=curl-failed
  probe="$status $(sed -n '1s/\t.*//p' "$work/probe.body" 2>/dev/null)"
}
is_success() { [ "$1" = "200 0" ]; }
is_transport() {
  local status=${1%% *} code=${1#* }
  [ "$status" = 500 ] || return 1
  [[ "$code" =~ ^-[0-9]+$ ]] || return 1
  { [ "$code" -le -314700 ] && [ "$code" -ge -314899 ]; } || [ "$code" -eq -356060 ]
}

declare -A probe_answers=()
record() { probe_answers[$1]=$((${probe_answers[$1]:-0} + 1)); }

start_registry
wait_for 20 listening || { failed "qv-registry did not start"; exit 1; }
"$bin_dir/qv-webhost" --plugin "$lib_dir/libqv_variable_iotolvane.so" --listen 127.0.0.1:8080 \
  --threads 4 --registry external >"$work/webhost.out" 2>"$work/webhost.log" &
webhost_pid=$!
wait_for 30 grep -q "listening on" "$work/webhost.out" || { failed "qv-webhost did not start"; exit 1; }
probe
is_success "$probe" && pass "served before the soak" || { failed "first answer '$probe'"; exit 1; }

wrk -c 8 -t 2 -d "$((seconds + 1))s" -s "$here/answer_codes.lua" "$url" >"$work/wrk.txt" 2>&1 &
wrk_pid=$!

faults=0
down_bad=0
up_bad=0
slow_restarts=0
next=$(now_ms)
end=$((next + seconds * 1000))
# Cycles start on a fixed 500 ms schedule, so a slow cycle does not shift the later ones.
while [ "$next" -lt "$end" ]; do
  kill -KILL "$registry_pid"
  wait "$registry_pid" 2>/dev/null || true
  faults=$((faults + 1))

  probe
  record "$probe"
  if ! is_transport "$probe"; then
    down_bad=$((down_bad + 1))
    echo "cycle $faults: registry down, answer '$probe'"
  fi

  start_registry
  if ! await_listening 10000; then
    failed "cycle $faults: the restarted registry does not listen"
    break
  fi
  probe
  record "$probe"
  if ! is_success "$probe"; then
    up_bad=$((up_bad + 1))
    echo "cycle $faults: first probe after the registry listens answered '$probe'"
  fi

  next=$((next + period_ms))
  left=$((next - $(now_ms)))
  if [ "$left" -gt 0 ]; then
    sleep "$((left / 1000)).$(printf %03d $((left % 1000)))"
  else
    slow_restarts=$((slow_restarts + 1))
  fi
done
soak_ms=$(($(now_ms) - end + seconds * 1000))
wrk_rc=0
wait "$wrk_pid" || wrk_rc=$?
cat "$work/wrk.txt"

echo "faults injected: $faults (registry killed with SIGKILL and restarted every ${period_ms} ms for ${seconds}s; $slow_restarts cycles overran)"
for answer in "${!probe_answers[@]}"; do
  echo "probe answers: HTTP ${answer% *} code ${answer#* }: ${probe_answers[$answer]}"
done
[ "$soak_ms" -le $(((seconds + 2) * 1000)) ] && pass "$faults faults injected in $soak_ms ms" ||
  failed "$faults faults took $soak_ms ms"
[ "$down_bad" -eq 0 ] && pass "every probe while the registry was down got a transport code" ||
  failed "$down_bad probes while the registry was down got another answer"
[ "$up_bad" -eq 0 ] && pass "first probe after every restart succeeded ($faults restarts)" ||
  failed "$up_bad restarts: the first probe after the registry listened did not succeed"

# wrk's answers by code: each must be 0 or a transport code.
[ "$wrk_rc" -eq 0 ] || failed "wrk exited with $wrk_rc"
requests=$(awk '/requests in/ { print $1 }' "$work/wrk.txt")
[ -n "$requests" ] && [ "$requests" -gt 0 ] && pass "wrk: $requests requests during the soak" ||
  failed "wrk made no requests"
socket_errors=$(sed -n 's/.*Socket errors: //p' "$work/wrk.txt")
[ -z "$socket_errors" ] && pass "wrk: no socket errors" || failed "wrk socket errors: $socket_errors"
bad_codes=0
counted=0
while read -r _ _ code count; do
  counted=$((counted + count))
  if [ "$code" = 0 ]; then
    continue
  elif [[ "$code" =~ ^-[0-9]+$ ]] && { { [ "$code" -le -314700 ] && [ "$code" -ge -314899 ]; } ||
    [ "$code" -eq -356060 ]; }; then
    continue
  fi
  bad_codes=$((bad_codes + count))
  echo "wrk: $count answers with code $code"
done < <(grep '^answer code' "$work/wrk.txt" || true)
http_other=$(grep '^answer http' "$work/wrk.txt" | grep -Ev '^answer http (200|500) ' || true)
[ "$bad_codes" -eq 0 ] && [ "$counted" -gt 0 ] &&
  pass "wrk: all $counted answers are code 0 or a transport code" ||
  failed "wrk: $bad_codes answers with other codes (of $counted counted)"
[ -z "$http_other" ] && pass "wrk: HTTP statuses only 200 and 500" || failed "wrk: $http_other"
# A success must come with 200 and a transport code with 500: the counts must agree.
ok_codes=$(awk '/^answer code 0 / { print $4 }' "$work/wrk.txt")
ok_http=$(awk '/^answer http 200 / { print $4 }' "$work/wrk.txt")
[ "${ok_codes:-0}" = "${ok_http:-0}" ] && pass "wrk: ${ok_codes:-0} successes, all HTTP 200" ||
  failed "wrk: ${ok_codes:-0} answers with code 0 but ${ok_http:-0} with HTTP 200"

if kill -0 "$webhost_pid" 2>/dev/null; then
  pass "qv-webhost alive after the soak"
  probe
  is_success "$probe" && pass "served after the soak" || failed "after the soak: '$probe'"
  kill -TERM "$webhost_pid"
  rc=0
  wait "$webhost_pid" || rc=$?
  [ "$rc" -eq 0 ] && pass "qv-webhost: SIGTERM, exit 0" || failed "qv-webhost: exit $rc after SIGTERM"
else
  rc=0
  wait "$webhost_pid" || rc=$?
  failed "qv-webhost died during the soak (exit $rc)"
fi

[ "$fail" -eq 0 ] && echo "PASS: fault soak" || { echo "FAIL: fault soak"; tail -5 "$work/webhost.log"; }
exit "$fail"
