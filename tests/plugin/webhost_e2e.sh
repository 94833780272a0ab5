#!/usr/bin/env bash
# End-to-end tests of qv-webhost + the plug-in + qv-registry on the real socket path
# /tmp/qvPortableRegistry, driven with curl. Everything runs in private mount, network and
# pid namespaces (tmpfs on /tmp and /run, a private /etc with /etc/velmora/share, loopback
# up), so the fixed paths and port are ours and every process dies with the namespace.
# Exits 77 (skipped) where namespaces are not permitted or a tool is missing.
#
# Usage: webhost_e2e.sh BIN_DIR LIB_DIR [EMULATOR...]
set -uo pipefail

# shellcheck source=../lib/private_system.sh
. "$(dirname "$0")/../lib/private_system.sh"

if [ "${1:-}" != "--inside" ]; then
  [ $# -ge 2 ] || { echo "usage: $0 BIN_DIR LIB_DIR [EMULATOR...]" >&2; exit 2; }
  require_tools unshare ip curl timeout
  enter_private_namespaces "$0" "$@"
fi
shift

bin_dir=$(cd "$1" && pwd -P) || exit 1
lib_dir=$(cd "$2" && pwd -P) || exit 1
shift 2
emulator=("$@")

# ---------------------------------------------------------------- private system
make_private_system "$bin_dir"
printf '[SYSTEMSETTINGS]\nHost_Name = e2e\n' >/etc/velmora/share/qv-rt.ini

socket=/tmp/qvPortableRegistry
base=http://127.0.0.1:8080/qv_variable_iotolvane

registry_pid=
start_registry() {
  "${emulator[@]}" "$bin_dir/qv-registry" 2>>"$work/registry.log" &
  registry_pid=$!
  wait_for 20 test -S "$socket"
}
stop_registry() {
  [ -n "$registry_pid" ] || return 0
  kill "$registry_pid" 2>/dev/null
  wait "$registry_pid" 2>/dev/null
  registry_pid=
  rm -f "$socket"
}

webhost_pid=
start_webhost() {
  : >"$work/webhost.out"
  "${emulator[@]}" "$bin_dir/qv-webhost" --plugin "$lib_dir/libqv_variable_iotolvane.so" \
    --listen 127.0.0.1:8080 --threads 4 "$@" >"$work/webhost.out" 2>>"$work/webhost.log" &
  webhost_pid=$!
  wait_for 30 grep -q "listening on http://127.0.0.1:8080" "$work/webhost.out"
}

# get NAME URL [curl args...]: stores "<status>|<body with TABs and newlines escaped>".
get() {
  local name=$1 url=$2
  shift 2
  local out
  out=$(curl -s -o "$work/body" -w '%{http_code}' "$@" "$url") || out="curl-failed"
  printf -v "$name" '%s|%s' "$out" "$(sed -z 's/\t/\\t/g; s/\n/\\n/g' "$work/body" 2>/dev/null)"
}
expect() {  # expect LABEL ACTUAL WANTED
  if [ "$2" = "$3" ]; then pass "$1"; else failed "$1: got '$2', want '$3'"; fi
}

version_query="check_version_compatibility?X_QV_CLIENT_SIDE_VERSION=1&X_QV_OLDEST_COMPATIBLE_VERSION=1"
version_ok='200|0\tcheck_version_compatibility\n1\n1'

# -- A hanging registry (scenario "hang", slow): the held request times out after 60 s with
# -314730, and a request from another connection, waiting meanwhile, is answered after it.
if [ "${QV_E2E_SCENARIO:-}" = hang ]; then
  coproc HOLD { exec "${emulator[@]}" "$bin_dir/hanging_registry" "$socket" 2>>"$work/registry.log"; }
  wait_for 20 test -S "$socket" || { failed "hanging_registry did not start"; exit 1; }
  start_webhost --registry external || { failed "qv-webhost did not start"; exit 1; }
  started=$(date +%s)
  curl -s -o "$work/held" -w '%{http_code}' "$base/$version_query" >"$work/held.code" &
  held_pid=$!
  IFS= read -r -t 30 line <&"${HOLD[0]}"
  [ "${line:-}" = held ] || failed "the registry did not hold the first request"
  curl -s -o "$work/other" -w '%{http_code}' "$base/resolve_class_and_url?X_QV_TAG=a&X_QV_CONFIGURED_CLASS=b" >"$work/other.code" &
  other_pid=$!
  wait "$held_pid"
  elapsed=$(($(date +%s) - started))
  held="$(cat "$work/held.code")|$(sed -z 's/\t/\\t/g' "$work/held")"
  expect "held request times out" "$held" '500|-314730\t'
  [ "$elapsed" -ge 55 ] && pass "time-out after ${elapsed}s" || failed "time-out after only ${elapsed}s"
  wait "$other_pid"
  other="$(cat "$work/other.code")|$(sed -z 's/\t/\\t/g; s/\n/\\n/g' "$work/other")"
  expect "other connection answered after the time-out" "$other" '200|0\tresolve_class_and_url\na\nb'
  get answer "$base/$version_query"
  expect "next request served" "$answer" "$version_ok"
  kill -TERM "$webhost_pid"
  wait "$webhost_pid" && pass "SIGTERM: exit 0" || failed "SIGTERM: exit $?"
  exit "$fail"
fi

# -- Registry absent (external mode), then started: the plug-in connects on the next request.
if ! start_webhost --registry external; then
  failed "qv-webhost did not start: $(cat "$work/webhost.log")"
  exit 1
fi
get answer "$base/$version_query"
if [[ "$answer" =~ ^500\|-314[78][0-9][0-9]\\t$ ]]; then
  pass "registry absent: $answer"
else
  failed "registry absent gave '$answer'"
fi
start_registry || failed "qv-registry did not start"
get answer "$base/$version_query"
expect "registry started afterwards" "$answer" "$version_ok"

# -- Every operation, with variables from the query, a form body and headers.
get answer "$base/resolve_class_and_url?X_QV_TAG=t" -H 'X-Qv-Configured-Class: C'
expect "resolve_class_and_url (query + header)" "$answer" '200|0\tresolve_class_and_url\nt\nC'
get answer "$base/register_class_and_url" --data 'X_QV_TAG=t&X_QV_CONFIGURED_CLASS=C&X_QV_CLASS_HIERARCHY_CRC=9&parentCount=2&childCount=1&parent0=P0&parent1=P1&child0=K0'
expect "register_class_and_url (form)" "$answer" '200|0\tregister_class_and_url\nt\nC\n9\n2\n1\nP0\nP1\nK0'
get answer "$base/io_object_proxied?X_QV_LIBRARY_PATH_NAME=l&X_QV_FUNC_NAME=f&X_QV_CLASS_NAME=c&X_QV_CALLING_CONVENTION=cc&name=n&leafClassName=lc&resolvedTag=rt&remoteSession=rs"
expect "io_object_proxied" "$answer" '200|0\tio_object_proxied\nl\nf\nc\ncc\nn\nlc\nrt\nrs'
get answer "$base/invoke_method?X_QV_LIBRARY_PATH_NAME=l&X_QV_FUNC_NAME=f&X_QV_CLASS_NAME=c&X_QV_CALLING_CONVENTION=cc&code=0&returnErrClustCode=1&tdr=t&struct=s&numberOfPointers=1&value0=v" -H 'session: -9223372036854775808'
expect "invoke_method" "$answer" '200|0\tinvoke_method\n-9223372036854775808\nl\nf\nc\ncc\n0\n1\nt\ns\n1\nv'
get answer "$base/ACCESS_PROPERTY?ignoreErrors=0&argc=2&numberOfBatches=1&libraryPathName0=P&funcName0=f&className0=c&callingConvention0=cc&libraryPathName1=p&action0=0&id0=i0&flags0=f0&tdr0=t0&action1=1&id1=i1&flags1=f1&tdr1=t1&value1=v1&value0=never" -H 'session: 5'
expect "access_property (case-varied name)" "$answer" '200|0\tACCESS_PROPERTY\n5\n0\n2\n1\nP\nf\nc\ncc\np\n0\ni0\nf0\nt0\n1\ni1\nf1\nt1\nv1'
get answer "$base/close_session?X_QV_LIBRARY_PATH_NAME=l&X_QV_FUNC_NAME=f&X_QV_CLASS_NAME=c&X_QV_CALLING_CONVENTION=cc&session=0"
expect "close_session" "$answer" '200|0\tclose_session\n0\nl\nf\nc\ncc'

# -- Every status mapping, and the host's own refusals.
get answer "$base/check_version_compatibility?X_QV_CLIENT_SIDE_VERSION=1"
expect "missing variable -> 400" "$answer" '400|-356006\t'
get answer "$base/$version_query" -H 'X-QV-Accept: TEXT/HTML'
expect "X_QV_ACCEPT text/html -> 406" "$answer" '406|-356007\t'
get answer "$base/$version_query" -H 'X-QV-Accept: text/html; q=1'
expect "X_QV_ACCEPT with parameters proceeds" "$answer" "$version_ok"
get answer "$base/no_such_operation"
expect "unknown operation -> 501" "$answer" '501|-2147467263\t'
get answer "$base/close_session?X_QV_LIBRARY_PATH_NAME=l" -H 'session: 12abc'
expect "unobtainable session -> 500" "$answer" '500|-356020\t'
head -c 1048577 /dev/zero >"$work/big"
get answer "$base/$version_query" --data-binary "@$work/big"
[[ "$answer" == 413\|* ]] && pass "body over 1 MiB -> 413" || failed "big body gave '$answer'"
get answer "$base/resolve_class_and_url" --data 'X_QV_TAG=%zz'
[[ "$answer" == 400\|* ]] && pass "malformed form -> 400" || failed "malformed form gave '$answer'"
before=$(grep -c '"GET\|"POST' "$work/webhost.log")
[ "$before" -ge 14 ] && pass "access log has a line per request" || failed "access log: $before lines"

# -- The registry restarted between requests: at most one failed request, then served.
stop_registry
start_registry || failed "qv-registry did not restart"
get first "$base/$version_query"
get second "$base/$version_query"
if [ "$second" = "$version_ok" ] && { [ "$first" = "$version_ok" ] || [[ "$first" == 500\|-* ]]; }; then
  pass "registry restarted: '$first' then served"
else
  failed "registry restarted: '$first', '$second'"
fi

# -- 16 concurrent clients, 10 requests each: every answer is its own.
clients=()
for c in $(seq 1 16); do
  (
    for r in $(seq 1 10); do
      want="0"$'\t'"resolve_class_and_url"$'\n'"t$c-$r"$'\n'"class$c-$r"
      got=$(curl -s "$base/resolve_class_and_url?X_QV_TAG=t$c-$r&X_QV_CONFIGURED_CLASS=class$c-$r")
      [ "$got" = "$want" ] || echo "client $c request $r got '$got'"
    done
  ) >"$work/client$c.log" 2>&1 &
  clients+=($!)
done
wait "${clients[@]}"
crossed=$(cat "$work"/client*.log)
[ -z "$crossed" ] && pass "16 concurrent clients, no crossed answers" || failed "crossed: $crossed"

# -- SIGTERM: Finalize and exit 0.
kill -TERM "$webhost_pid"
if wait_for 30 bash -c "! kill -0 $webhost_pid 2>/dev/null"; then
  wait "$webhost_pid"
  rc=$?
  [ "$rc" -eq 0 ] && pass "SIGTERM: exit 0" || failed "SIGTERM: exit $rc"
else
  failed "qv-webhost still running after SIGTERM"
fi
webhost_pid=

# -- Embedded registry: nothing listens on the socket, the web host brings its own.
stop_registry
if start_webhost; then
  get answer "$base/$version_query"
  expect "embedded registry" "$answer" "$version_ok"
  kill -INT "$webhost_pid"
  wait "$webhost_pid"
  rc=$?
  [ "$rc" -eq 0 ] && pass "SIGINT: exit 0" || failed "SIGINT: exit $rc"
  [ ! -e "$socket" ] && pass "embedded registry removed its socket" || failed "socket left behind"
else
  failed "qv-webhost with the embedded registry did not start: $(tail -5 "$work/webhost.log")"
fi

[ "$fail" -eq 0 ] || { echo "--- webhost log"; tail -40 "$work/webhost.log"; }
exit "$fail"
