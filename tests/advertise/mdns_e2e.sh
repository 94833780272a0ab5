#!/usr/bin/env bash
# End-to-end tests of the mDNS announcement against a real avahi-daemon. Everything runs in
# private mount, network and pid namespaces: a tmpfs on /tmp and /run, a private copy of
# /etc with /etc/velmora/share, a veth pair, its own dbus-daemon and avahi-daemon. The
# namespace's processes die with it. Exits 77 (skipped) where namespaces are not permitted
# or the daemons are not installed.
#
# Usage: mdns_e2e.sh BIN_DIR [EMULATOR...]
#   BIN_DIR holds advertise_probe, qvAvahiClient_test and qv-discover; EMULATOR (for a
#   cross build) is put before each of them.
set -uo pipefail

# shellcheck source=../lib/private_system.sh
. "$(dirname "$0")/../lib/private_system.sh"

if [ "${1:-}" != "--inside" ]; then
  [ $# -ge 1 ] || { echo "usage: $0 BIN_DIR [EMULATOR...]" >&2; exit 2; }
  require_tools unshare ip dbus-daemon avahi-daemon avahi-browse avahi-publish timeout
  enter_private_namespaces "$0" "$@"
fi
shift

bin_dir=$1
shift
emulator=("$@")
probe=("${emulator[@]}" "$bin_dir/advertise_probe")
discover=("${emulator[@]}" "$bin_dir/qv-discover")

# ---------------------------------------------------------------- private system
bin_dir=$(cd "$bin_dir" && pwd -P) || exit 1
make_private_system "$bin_dir"
# v1 carries the default route and is the only interface Avahi uses; v0 sorts first by
# name, so a wrong choice of the default interface shows up as the wrong MAC.
ip link add v0 type veth peer name v1
ip link set v0 address 02:00:00:00:00:01
ip link set v1 address 02:1a:2b:3c:4d:5e
ip link set v0 multicast on up
ip link set v1 multicast on up
ip addr add 169.254.7.2/16 dev v0
ip addr add 169.254.7.1/16 dev v1
ip route add default via 169.254.7.2 dev v1
expected_mac=02:1A:2B:3C:4D:5E

dbus_pid=
start_dbus() {
  mkdir -p /run/dbus
  dbus_pid=$(dbus-daemon --system --fork --nopidfile --print-pid) || return 1
  wait_for 10 test -S /run/dbus/system_bus_socket
}

stop_dbus() {
  [ -n "$dbus_pid" ] || return 0
  kill "$dbus_pid" 2>/dev/null
  wait_for 10 bash -c "! kill -0 $dbus_pid 2>/dev/null"
  rm -f /run/dbus/system_bus_socket
  dbus_pid=
}

avahi_pid=
start_avahi() {
  cat >"$work/avahi.conf" <<CONF
[server]
host-name=qvtarget
domain-name=local
use-ipv4=yes
use-ipv6=no
allow-interfaces=v1
enable-dbus=yes
ratelimit-interval-usec=1000000
ratelimit-burst=1000
[wide-area]
enable-wide-area=no
[publish]
publish-hinfo=no
publish-workstation=no
[reflector]
enable-reflector=no
[rlimits]
CONF
  : >"$work/avahi.log"
  avahi-daemon --no-drop-root --no-rlimits --no-chroot --no-proc-title -f "$work/avahi.conf" \
    >"$work/avahi.log" 2>&1 &
  avahi_pid=$!
  wait_for 20 grep -q "Server startup complete" "$work/avahi.log"
}

stop_avahi() {
  [ -n "$avahi_pid" ] || return 0
  kill "$avahi_pid" 2>/dev/null
  wait "$avahi_pid" 2>/dev/null
  avahi_pid=
}

set_host_name() {
  printf '[SYSTEMSETTINGS]\nHost_Name = %s\n' "$1" >/etc/velmora/share/qv-rt.ini
}

# Resolved services of our type, one per line: name<TAB>port<TAB>TXT (pairs sorted, one
# space apart), with Avahi's \DDD escapes decoded.
browse() {
  timeout 20 avahi-browse -rpt _qv-iovar._tcp 2>/dev/null |
    awk -F';' '$1 == "=" && $3 == "IPv4" { print $4 "\t" $9 "\t" $10 }' |
    perl -pe 's/\\(\d{3})/chr($1)/ge' |
    while IFS=$'\t' read -r name port txt; do
      sorted=$(tr ' ' '\n' <<<"$txt" | sort | paste -sd' ')
      printf '%s\t%s\t%s\n' "$name" "$port" "$sorted"
    done | sort -u
}

announced() { browse | grep -qxF "$1"; }
not_announced() { ! browse | cut -f1 | grep -qxF "$1"; }

# The probe runs as a coprocess; ask sends one command and reads one answer line.
probe_pid=
start_probe() {
  coproc PROBE { exec timeout 120 "${probe[@]}" 2>"$work/probe.err"; }
  probe_pid=$PROBE_PID
}
ask() {
  local answer to=${PROBE[1]:-} from=${PROBE[0]:-}
  [ -n "$to" ] && [ -n "$from" ] || return 1
  echo "$1" >&"$to" || return 1
  IFS= read -r -t 60 answer <&"$from" || return 1
  printf '%s\n' "$answer"
}
end_probe() {
  [ -n "$probe_pid" ] || return 0
  local to=${PROBE[1]:-}
  [ -z "$to" ] || exec {to}>&-
  if ! wait "$probe_pid"; then
    echo "probe exited with failure:" >&2
    cat "$work/probe.err" >&2
    return 1
  fi
  probe_pid=
}

pairs="\"MAC=$expected_mac\" \"supportTolvane=yes\""

if ! start_dbus || ! start_avahi; then
  echo "cannot start dbus-daemon and avahi-daemon in the namespace:" >&2
  cat "$work/avahi.log" >&2
  exit 1
fi

# -- The wrapper library against the daemon.
if QV_REQUIRE_AVAHI_DAEMON=1 timeout 120 "${emulator[@]}" "$bin_dir/qvAvahiClient_test" \
  >"$work/wrapper.log" 2>&1; then
  pass "wrapper library: threaded poll, callbacks, re-entrant lock"
else
  cat "$work/wrapper.log"
  failed "wrapper library against the daemon"
fi

# -- Announced name with spaces, port 80, exactly the two TXT pairs, withdrawn at stop.
set_host_name '"lab rig 2"'
start_probe
reply=$(ask start)
if [ "$reply" = "start 0" ]; then
  expected="lab rig 2 qv_variable_iotolvane"$'\t'"80"$'\t'"$pairs"
  if wait_for 20 announced "$expected"; then
    pass "announced '$expected'"
  else
    failed "announcement not seen; browse shows: $(browse)"
  fi
  want="lab rig 2 qv_variable_iotolvane"$'\t'"qvtarget.local"$'\t'"169.254.7.1"$'\t'"80"
  want+=$'\t'"MAC=$expected_mac"$'\t'"supportTolvane=yes"
  listed=$(timeout 60 "${discover[@]}" --timeout 20 2>"$work/discover.err")
  if [ $? -eq 0 ] && grep -qxF "$want" <<<"$listed"; then
    pass "qv-discover lists the target"
  else
    failed "qv-discover printed '$listed' ($(cat "$work/discover.err"))"
  fi
  # The daemon changes its host name: the client passes through "registering", the group
  # is withdrawn, and once the client runs again the service must be back, on the new host.
  if command -v avahi-set-host-name >/dev/null; then
    listed_on_new_host() {
      timeout 60 "${discover[@]}" --timeout 20 2>/dev/null |
        grep -q "^lab rig 2 qv_variable_iotolvane"$'\t'"qvtarget2.local"$'\t'
    }
    if avahi-set-host-name qvtarget2 && wait_for 30 listed_on_new_host; then
      pass "announced again after the daemon's host name changed"
    else
      failed "not announced again after a host-name change: $(timeout 60 "${discover[@]}" 2>&1)"
    fi
  fi
  reply=$(ask stop)
  if [ "$reply" = stopped ] && wait_for 20 not_announced "lab rig 2 qv_variable_iotolvane"; then
    pass "withdrawn at stop"
  else
    failed "not withdrawn at stop ($reply); browse shows: $(browse)"
  fi
else
  failed "start gave '$reply'"
fi
end_probe || failed "probe exit"

# -- A service of the same name published first: ours takes Avahi's alternative name.
avahi-publish -s "lab rig 2 qv_variable_iotolvane" _qv-iovar._tcp 1234 >"$work/publish.log" 2>&1 &
publish_pid=$!
if wait_for 20 announced "lab rig 2 qv_variable_iotolvane"$'\t'"1234"$'\t'; then
  start_probe
  reply=$(ask start)
  name=$(ask name)
  expected="lab rig 2 qv_variable_iotolvane #2"$'\t'"80"$'\t'"$pairs"
  if [ "$reply" = "start 0" ] && [ "$name" = "name lab rig 2 qv_variable_iotolvane #2" ] &&
    wait_for 20 announced "$expected"; then
    pass "collision renamed to '${name#name }'"
  else
    failed "collision: start '$reply', '$name'; browse shows: $(browse)"
  fi
  ask stop >/dev/null
  end_probe || failed "probe exit"
else
  failed "avahi-publish did not announce: $(cat "$work/publish.log")"
fi
kill "$publish_pid" 2>/dev/null
wait "$publish_pid" 2>/dev/null

# -- An empty Host_Name gives "unknown".
set_host_name ''
start_probe
reply=$(ask start)
expected="unknown qv_variable_iotolvane"$'\t'"80"$'\t'"$pairs"
if [ "$reply" = "start 0" ] && wait_for 20 announced "$expected"; then
  pass "empty host name announced as 'unknown qv_variable_iotolvane'"
else
  failed "empty host name: start '$reply'; browse shows: $(browse)"
fi
ask stop >/dev/null
end_probe || failed "probe exit"

# -- No avahi-daemon (dbus still up): the mapped "no daemon" code, at once.
stop_avahi
start_probe
reply=$(ask start)
name=$(ask name)
if [ "$reply" = "start -8" ] && [ "$name" = "name -" ]; then
  pass "no avahi-daemon gives -8 and no record"
else
  failed "no avahi-daemon: '$reply', '$name'"
fi
end_probe || failed "probe exit"
timeout 60 "${discover[@]}" >"$work/discover.out" 2>"$work/discover.err"
rc=$?
if [ "$rc" -eq 1 ] && grep -q "cannot reach the Avahi daemon" "$work/discover.err" &&
  [ ! -s "$work/discover.out" ]; then
  pass "qv-discover without a daemon: $(cat "$work/discover.err")"
else
  failed "qv-discover without a daemon exited $rc: $(cat "$work/discover.err")"
fi

# -- No D-Bus either: a negative code, nothing hangs.
stop_dbus
start_probe
reply=$(ask start)
if [[ "$reply" =~ ^start\ -[0-9]+$ ]]; then
  pass "no D-Bus at all gives '${reply#start }'"
else
  failed "no D-Bus: '$reply'"
fi
end_probe || failed "probe exit"

exit "$fail"
