#!/usr/bin/env bash
# Checks that the shipped plug-in exports exactly its five entry points and names the three
# platform libraries by soname. Usage: exports.sh NM READELF LIBRARY
set -uo pipefail
nm=$1 readelf=$2 library=$3
fail=0
exported=$("$nm" -D --defined-only "$library" | awk '{print $3}' | sort | paste -sd' ')
expected="qv_variable_iotolvaneFinalize qv_variable_iotolvaneInit qv_variable_iotolvanePause"
expected+=" qv_variable_iotolvaneResume qv_variable_iotolvaneRun"
if [ "$exported" = "$expected" ]; then
  echo "PASS: exports exactly the five entry points"
else
  echo "FAIL: exports '$exported'"
  fail=1
fi
needed=$("$readelf" -d "$library" | sed -n 's/.*(NEEDED).*\[\(.*\)\]/\1/p')
for soname in libws_runtime.so.13 libqvAvahiClient.so.14 libqvtargetcfg.so.1; do
  if grep -qxF "$soname" <<<"$needed"; then
    echo "PASS: NEEDED $soname"
  else
    echo "FAIL: no NEEDED $soname (has: $(paste -sd' ' <<<"$needed"))"
    fail=1
  fi
done
exit "$fail"
