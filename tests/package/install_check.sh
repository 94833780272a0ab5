#!/usr/bin/env bash
# Checks the Debian packages that scripts/package made: their fields and contents, the
# unpacked files (ELF machine, sonames, no RUNPATH, hardening), Depends against what
# dpkg-shlibdeps derives, and a run of the installed qv-webhost with the installed plug-in
# from a scratch root (dpkg -x) inside private namespaces. Prints PASS/FAIL lines and, as
# its last line, 'N passed, M failed'; exits 1 when a check fails.
set -euo pipefail
export LC_ALL=C

here=$(cd "$(dirname "$0")" && pwd)

usage() {
  cat <<'TXT'
Usage: install_check.sh --native ARCH PACKAGE_DIR ARCH...

Checks qv-variable-iotolvane and qv-variable-iotolvane-devkit of each ARCH in
PACKAGE_DIR (scripts/package --check calls it). The packages of the native ARCH are
unpacked with dpkg -x and run directly; those of another ARCH run under qemu-arm when it
is installed (binfmt is not needed). The runs take place in private mount, network and
pid namespaces (a private /tmp, so /tmp/qvPortableRegistry is ours); where namespaces
are not permitted the runs are reported as SKIPPED, not passed.
TXT
}

# ------------------------------------------------------------------ inside the namespaces
# install_check.sh --inside ROOT TRIPLET [EMULATOR...]
if [ "${1:-}" = "--inside" ]; then
  shift
  scratch=$1 triplet=$2
  shift 2
  emulator=("$@")
  # shellcheck source=../lib/private_system.sh
  . "$here/../lib/private_system.sh"
  set +e
  make_private_system "$scratch"
  printf '[SYSTEMSETTINGS]\nHost_Name = installcheck\n' >/etc/velmora/share/qv-rt.ini
  arch_label=${QV_CHECK_ARCH:-?}
  libdir="$scratch/usr/lib/$triplet"

  # No --plugin: the installed qv-webhost finds the installed plug-in by its default.
  LD_LIBRARY_PATH="$libdir" "${emulator[@]}" "$scratch/usr/bin/qv-webhost" \
    --listen 127.0.0.1:0 --registry embedded >"$work/webhost.out" 2>"$work/webhost.log" &
  webhost=$!
  if ! wait_for 60 grep -q '^listening on http://127.0.0.1:[0-9]*$' "$work/webhost.out"; then
    failed "$arch_label: installed qv-webhost did not start: $(tr '\n' ' ' <"$work/webhost.log")"
    exit 1
  fi
  pass "$arch_label: installed qv-webhost started with its default plug-in path"
  port=$(sed -n 's|^listening on http://127.0.0.1:\([0-9]*\)$|\1|p' "$work/webhost.out")

  url="http://127.0.0.1:$port/qv_variable_iotolvane/check_version_compatibility?X_QV_CLIENT_SIDE_VERSION=1&X_QV_OLDEST_COMPATIBLE_VERSION=1"
  code=$(curl -s -m 60 -o "$work/body" -w '%{http_code}' "$url") || code=curl-failed
  body=$(sed -z 's/\t/\\t/g; s/\n/\\n/g' "$work/body" 2>/dev/null)
  want='0\tcheck_version_compatibility\n1\n1'
  if [ "$code" = 200 ] && [ "$body" = "$want" ]; then
    pass "$arch_label: installed plug-in answered through the embedded registry ($code, $body)"
  else
    failed "$arch_label: answer $code '$body', want 200 '$want'"
  fi

  # What the process really loaded: the plug-in and all three platform libraries from the
  # scratch root, none from a build tree or elsewhere.
  maps=$(cat "/proc/$webhost/maps" 2>/dev/null)
  for file in qv-webservices/libqv_variable_iotolvane.so libws_runtime.so.13 \
              libqvAvahiClient.so.14 libqvtargetcfg.so.1; do
    name=$(basename "$file")
    from=$(grep -o "/[^ ]*/$name\$" <<<"$maps" | sort -u | tr '\n' ' ')
    if [ "${from% }" = "$libdir/$file" ]; then
      pass "$arch_label: $name loaded from the scratch root"
    else
      failed "$arch_label: $name loaded from '${from% }', want $libdir/$file"
    fi
  done

  kill -TERM "$webhost"
  wait "$webhost"
  status=$?
  if [ "$status" -eq 0 ]; then
    pass "$arch_label: installed qv-webhost finalised the plug-in and exited 0 on SIGTERM"
  else
    failed "$arch_label: installed qv-webhost exited $status on SIGTERM"
  fi
  exit "$fail"
fi

# ------------------------------------------------------------------ outside
native=""
while [ $# -gt 0 ]; do
  case "$1" in
    -h | --help) usage; exit 0 ;;
    --native) native="${2:?--native needs an architecture}"; shift 2 ;;
    -*) echo "install_check.sh: unknown option '$1' (see --help)" >&2; exit 2 ;;
    *) break ;;
  esac
done
[ -n "$native" ] && [ $# -ge 2 ] || { usage >&2; exit 2; }
dir=$(cd "$1" && pwd)
shift
arches=("$@")

passed=0
failed=0
pass() { echo "PASS: $*"; passed=$((passed + 1)); }
fail() { echo "FAIL: $*"; failed=$((failed + 1)); }
expect() {  # expect LABEL ACTUAL WANTED
  if [ "$2" = "$3" ]; then pass "$1"; else fail "$1: got '$2', want '$3'"; fi
}
# Counts the PASS/FAIL lines of a sub-check and passes them on.
relay() {
  local line
  while IFS= read -r line; do
    case "$line" in
      PASS:*) echo "$line"; passed=$((passed + 1)) ;;
      FAIL:*) echo "$line"; failed=$((failed + 1)) ;;
      NOTE:* | SKIP*) echo "$line" ;;
    esac
  done
}

plugin_name=qv-variable-iotolvane
devkit_name=qv-variable-iotolvane-devkit
platform_libs=(libws_runtime.so.13 libqvAvahiClient.so.14 libqvtargetcfg.so.1)
tools=(qv-discover qv-registry qv-webhost)

# Files (not directories) of a package, without the leading "./"; a symlink shows as
# "link -> target".
package_files() {
  dpkg-deb -c "$1" | awk '$1 !~ /^d/ { $1 = $2 = $3 = $4 = $5 = ""; sub(/^ +/, ""); sub(/^\.\//, ""); print }' |
    sort | tr '\n' ' ' | sed 's/ $//'
}

# What dpkg-shlibdeps derives for FILES of ARCH: prints the Depends value.
derived_depends() {
  local arch=$1 libdir=$2 work
  shift 2
  work=$(mktemp -d)
  mkdir "$work/debian"
  printf 'Source: check\n\nPackage: check\nArchitecture: any\n' >"$work/debian/control"
  (cd "$work" && DEB_HOST_ARCH="$arch" dpkg-shlibdeps -O -l"$libdir" --ignore-missing-info \
    --warnings=0 "$@" 2>/dev/null) | sed -n 's/^shlibs:Depends=//p'
  rm -rf "$work"
}

runtime_check() {
  local arch=$1 scratch=$2 triplet=$3
  shift 3
  local emulator=("$@") unshare=(unshare --mount --net --pid --fork --mount-proc --propagation private)
  local tool
  for tool in unshare ip curl; do
    command -v "$tool" >/dev/null || { echo "SKIPPED $arch run: $tool is not installed"; return; }
  done
  if ! "${unshare[@]}" true 2>/dev/null; then
    echo "SKIPPED $arch run: private namespaces are not permitted here"
    return
  fi
  local output
  output=$(QV_CHECK_ARCH=$arch "${unshare[@]}" "$here/install_check.sh" --inside "$scratch" \
           "$triplet" "${emulator[@]}" 2>&1) || true
  relay <<<"$output"
  grep -q '^PASS: .*answered' <<<"$output" || fail "$arch: installed qv-webhost run gave no answer"
}

check_arch() {
  local arch=$1 triplet machine class abi
  triplet=$(dpkg-architecture -a "$arch" -qDEB_HOST_MULTIARCH 2>/dev/null) ||
    { fail "$arch: unknown to dpkg-architecture"; return; }
  case "$arch" in
    amd64) machine="Advanced Micro Devices X86-64" class=ELF64 abi="" ;;
    armhf) machine="ARM" class=ELF32 abi=" hard-float" ;;
    *) fail "$arch: no ELF expectations for this architecture"; return ;;
  esac

  local plugin_deb devkit_deb debs
  debs=("$dir/${plugin_name}"_*_"$arch".deb)
  [ ${#debs[@]} -eq 1 ] && [ -f "${debs[0]}" ] || { fail "$arch: want one $plugin_name package, found ${#debs[@]}"; return; }
  plugin_deb=${debs[0]}
  debs=("$dir/${devkit_name}"_*_"$arch".deb)
  [ ${#debs[@]} -eq 1 ] && [ -f "${debs[0]}" ] || { fail "$arch: want one $devkit_name package, found ${#debs[@]}"; return; }
  devkit_deb=${debs[0]}

  # Fields.
  local version
  version=$(dpkg-deb -f "$plugin_deb" Version)
  expect "$arch: $plugin_name Package/Architecture" \
    "$(dpkg-deb -f "$plugin_deb" Package)/$(dpkg-deb -f "$plugin_deb" Architecture)" "$plugin_name/$arch"
  expect "$arch: $devkit_name Package/Architecture/Version" \
    "$(dpkg-deb -f "$devkit_deb" Package)/$(dpkg-deb -f "$devkit_deb" Architecture)/$(dpkg-deb -f "$devkit_deb" Version)" \
    "$devkit_name/$arch/$version"
  local plugin_depends devkit_depends
  plugin_depends=$(dpkg-deb -f "$plugin_deb" Depends)
  devkit_depends=$(dpkg-deb -f "$devkit_deb" Depends)
  if grep -q 'qv-' <<<"$plugin_depends$(dpkg-deb -f "$plugin_deb" Pre-Depends Recommends)"; then
    fail "$arch: $plugin_name must run against the vendor's pieces, but depends on: $plugin_depends"
  else
    pass "$arch: $plugin_name depends on no package of ours"
  fi

  # Contents: exactly these files, no links.
  local libdir="usr/lib/$triplet"
  expect "$arch: $plugin_name files" "$(package_files "$plugin_deb")" \
    "$libdir/qv-webservices/libqv_variable_iotolvane.so"
  expect "$arch: $devkit_name files" "$(package_files "$devkit_deb")" \
    "usr/bin/qv-discover usr/bin/qv-registry usr/bin/qv-webhost $libdir/libqvAvahiClient.so.14 $libdir/libqvtargetcfg.so.1 $libdir/libws_runtime.so.13"

  # The devkit's control files: shlibs for its libraries, an ldconfig trigger.
  expect "$arch: $devkit_name shlibs" "$(dpkg-deb -I "$devkit_deb" shlibs 2>&1 | sort | tr '\n' ' ')" \
    "libqvAvahiClient 14 $devkit_name (>= $version) libqvtargetcfg 1 $devkit_name (>= $version) libws_runtime 13 $devkit_name (>= $version) "
  expect "$arch: $devkit_name triggers" "$(dpkg-deb -I "$devkit_deb" triggers 2>&1)" \
    "activate-noawait ldconfig"

  # Unpack both into a fresh scratch root.
  local scratch="$dir/check/$arch"
  rm -rf "$scratch"
  mkdir -p "$scratch"
  if dpkg -x "$plugin_deb" "$scratch" && dpkg -x "$devkit_deb" "$scratch"; then
    pass "$arch: both packages unpacked with dpkg -x"
  else
    fail "$arch: dpkg -x failed"
    return
  fi

  # Every shipped ELF: machine, class, no RUNPATH (nothing points back into a build
  # tree), stripped; a library is named by its soname, so ldconfig needs no link.
  local file name header dynamic soname="" elves=()
  for file in "$scratch/$libdir/qv-webservices/libqv_variable_iotolvane.so" \
              "${platform_libs[@]/#/$scratch/$libdir/}" "${tools[@]/#/$scratch/usr/bin/}"; do
    name=$(basename "$file")
    elves+=("$file")
    header=$(readelf -hW "$file" 2>&1)
    dynamic=$(readelf -dW "$file" 2>&1)
    local got_machine got_class problems=""
    got_machine=$(awk -F: '/^ *Machine:/ { gsub(/^ +/, "", $2); print $2 }' <<<"$header")
    got_class=$(awk -F: '/^ *Class:/ { gsub(/^ +/, "", $2); print $2 }' <<<"$header")
    [ "$got_machine" = "$machine" ] || problems+=" machine '$got_machine'"
    [ "$got_class" = "$class" ] || problems+=" class '$got_class'"
    if [ "$arch" = armhf ] && ! grep -q 'hard-float ABI' <<<"$header"; then
      problems+=" not hard-float ABI"
    fi
    ! grep -Eq '\((RUNPATH|RPATH)\)' <<<"$dynamic" ||
      problems+=" has RUNPATH $(sed -n 's/.*Library r[un]*path: //p' <<<"$dynamic")"
    ! readelf -SW "$file" | grep -q ' \.symtab ' || problems+=" not stripped"
    if [[ "$name" == *.so* ]]; then
      soname=$(sed -n 's/.*Library soname: \[\(.*\)\]/\1/p' <<<"$dynamic")
      [ "$soname" = "$name" ] || problems+=" soname '$soname'"
    fi
    if [ -z "$problems" ]; then
      pass "$arch: $name is $class $machine${abi}${soname:+, soname $soname}, no RUNPATH, stripped"
    else
      fail "$arch: $name:$problems"
    fi
    soname=""
  done

  # The plug-in and qv-webhost need our platform libraries by exactly the sonames shipped.
  local needed
  needed=$(readelf -dW "$scratch/$libdir/qv-webservices/libqv_variable_iotolvane.so" |
           sed -n 's/.*Shared library: \[\(libws_runtime\|libqvAvahiClient\|libqvtargetcfg\)\(.*\)\]/\1\2/p' |
           sort | tr '\n' ' ')
  expect "$arch: plug-in needs the platform libraries by soname" "$needed" \
    "libqvAvahiClient.so.14 libqvtargetcfg.so.1 libws_runtime.so.13 "
  needed=$(readelf -dW "$scratch/usr/bin/qv-webhost" | sed -n 's/.*Shared library: \[\(libws_runtime.*\)\]/\1/p')
  expect "$arch: qv-webhost needs libws_runtime by soname" "$needed" "libws_runtime.so.13"

  # Depends as dpkg-shlibdeps derives it from the unpacked files.
  if command -v dpkg-shlibdeps >/dev/null; then
    expect "$arch: $plugin_name Depends matches dpkg-shlibdeps" "$plugin_depends" \
      "$(derived_depends "$arch" "$scratch/$libdir" "$scratch/$libdir/qv-webservices/libqv_variable_iotolvane.so")"
    expect "$arch: $devkit_name Depends matches dpkg-shlibdeps" "$devkit_depends" \
      "$(derived_depends "$arch" "$scratch/$libdir" "${platform_libs[@]/#/$scratch/$libdir/}" "${tools[@]/#/$scratch/usr/bin/}")"
  else
    echo "SKIPPED $arch Depends check: dpkg-shlibdeps (dpkg-dev) is not installed"
  fi

  # Hardening of the packaged (stripped) files.
  local hardening
  hardening=$("$here/hardening.sh" --fortify "${elves[@]}" 2>&1) || true
  relay < <(sed "s/^\(PASS\|FAIL\|NOTE\): /&$arch: /" <<<"$hardening")
  grep -Eq '^[0-9]+ passed, 0 failed$' <<<"$hardening" ||
    grep -q '^FAIL:' <<<"$hardening" || fail "$arch: hardening check did not run: $hardening"

  # Run it.
  if [ "$arch" = "$native" ]; then
    runtime_check "$arch" "$scratch" "$triplet"
  elif [ "$arch" = armhf ] && command -v qemu-arm >/dev/null && [ -e /lib/ld-linux-armhf.so.3 ]; then
    runtime_check "$arch" "$scratch" "$triplet" qemu-arm -L /
  else
    echo "SKIPPED $arch run: no qemu-arm or armhf C library to run it"
  fi
}

for arch in "${arches[@]}"; do
  check_arch "$arch"
done

echo "$passed passed, $failed failed"
[ "$failed" -eq 0 ]
