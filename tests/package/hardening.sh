#!/usr/bin/env bash
# Checks the hardening of shipped ELF files with readelf (any architecture): position-
# independent code, full RELRO with immediate binding, a non-executable stack, stack
# protection and glibc's checked functions. Prints one PASS/FAIL line per check and, as
# its last line, 'N passed, M failed'; exits 1 when a check fails.
set -euo pipefail

usage() {
  cat <<'TXT'
Usage: hardening.sh [--readelf PATH] [--fortify] [--compile-commands FILE] ELF...

Per ELF file:
  pie        ELF type DYN, no text relocations; an executable also carries the PIE flag
  relro      a GNU_RELRO segment and immediate binding (BIND_NOW or FLAGS_1 NOW)
  stack      a GNU_STACK segment without execute permission
  protector  imports __stack_chk_fail; a file without it passes only when its debug
             information shows every compile unit built with -fstack-protector-strong
             (a small library may have no function that needs a guard)
  fortify    (with --fortify) imports none of the printf family that _FORTIFY_SOURCE=2
             always replaces by its checked variant; the checked variants it imports are
             listed. glibc adds a check only where the compiler knows the buffer size, so
             a file without any *_chk import is reported, not failed: the compile-command
             check covers it.
With --compile-commands: every compile command of the build (compile_commands.json) has
-fstack-protector-strong, -D_FORTIFY_SOURCE=2 (when --fortify) and an optimisation level.
TXT
}

readelf=readelf
fortify=0
commands=""
files=()
while [ $# -gt 0 ]; do
  case "$1" in
    -h | --help) usage; exit 0 ;;
    --readelf) readelf="${2:?--readelf needs a path}"; shift 2 ;;
    --fortify) fortify=1; shift ;;
    --compile-commands) commands="${2:?--compile-commands needs a file}"; shift 2 ;;
    -*) echo "hardening.sh: unknown option '$1' (see --help)" >&2; exit 2 ;;
    *) files+=("$1"); shift ;;
  esac
done
[ ${#files[@]} -gt 0 ] || [ -n "$commands" ] || { usage >&2; exit 2; }

passed=0
failed=0
pass() { echo "PASS: $*"; passed=$((passed + 1)); }
fail() { echo "FAIL: $*"; failed=$((failed + 1)); }

# The printf family that _FORTIFY_SOURCE=2 routes through its *_chk variant at every call.
always_checked='^(printf|fprintf|vprintf|vfprintf|dprintf|vdprintf|wprintf|fwprintf|vwprintf|vfwprintf)$'

check_file() {
  local file=$1 name header dynamic segments imports
  name=$(basename "$file")
  if ! header=$("$readelf" -hW "$file" 2>/dev/null); then
    fail "$name: not an ELF file"
    return
  fi
  dynamic=$("$readelf" -dW "$file")
  segments=$("$readelf" -lW "$file")
  imports=$("$readelf" --dyn-syms -W "$file" | awk '$7 == "UND" { sub(/@.*/, "", $8); print $8 }')

  # pie
  local type executable=0
  type=$(awk -F: '/^ *Type:/ { gsub(/^ +/, "", $2); print $2 }' <<<"$header")
  grep -q '^ *INTERP ' <<<"$segments" && executable=1
  if [[ "$type" != DYN* ]]; then
    fail "$name: pie: ELF type is '$type', not DYN"
  elif grep -q 'TEXTREL' <<<"$dynamic"; then
    fail "$name: pie: has text relocations (code not position-independent)"
  elif [ "$executable" -eq 1 ] && ! grep -Eq 'FLAGS_1\).*\bPIE\b' <<<"$dynamic"; then
    fail "$name: pie: executable without the PIE flag"
  else
    pass "$name: pie ($type)"
  fi

  # relro
  if ! grep -q '^ *GNU_RELRO ' <<<"$segments"; then
    fail "$name: relro: no GNU_RELRO segment"
  elif ! grep -Eq '\(FLAGS\).*\bBIND_NOW\b|\(FLAGS_1\).*\bNOW\b' <<<"$dynamic"; then
    fail "$name: relro: partial only (no BIND_NOW)"
  else
    pass "$name: relro (full, BIND_NOW)"
  fi

  # stack
  local stack
  stack=$(awk '$1 == "GNU_STACK" { print $7 }' <<<"$segments")
  if [ -z "$stack" ]; then
    fail "$name: stack: no GNU_STACK segment (the loader makes the stack executable)"
  elif [[ "$stack" == *E* ]]; then
    fail "$name: stack: executable ($stack)"
  else
    pass "$name: stack not executable ($stack)"
  fi

  # protector
  if grep -qx '__stack_chk_fail' <<<"$imports"; then
    pass "$name: protector (__stack_chk_fail)"
  else
    local producers units unguarded
    producers=$("$readelf" --debug-dump=info "$file" 2>/dev/null | grep 'DW_AT_producer' || true)
    units=$(grep -c . <<<"$producers" || true)
    unguarded=$(grep -Evc -- '-fstack-protector-(strong|all)' <<<"$producers" || true)
    if [ -z "$producers" ]; then
      fail "$name: protector: no __stack_chk_fail and no debug information to show the flags"
    elif [ "$unguarded" -ne 0 ]; then
      fail "$name: protector: $unguarded of $units compile units built without -fstack-protector-strong"
    else
      pass "$name: protector (no function needs a guard; all $units compile units built with it)"
    fi
  fi

  # fortify
  if [ "$fortify" -eq 1 ]; then
    local plain checked
    plain=$(grep -E "$always_checked" <<<"$imports" | tr '\n' ' ' || true)
    checked=$(grep -E '^__.*_chk$' <<<"$imports" | grep -vx '__stack_chk_fail' | tr '\n' ' ' || true)
    if [ -n "$plain" ]; then
      fail "$name: fortify: unchecked ${plain% } (not built with _FORTIFY_SOURCE=2)"
    elif [ -n "$checked" ]; then
      pass "$name: fortify (${checked% })"
    else
      echo "NOTE: $name: fortify: no call with a buffer size known at compile time, so no *_chk import to show"
    fi
  fi
}

# Every compile command of the build: flags present, optimisation on.
check_commands() {
  local file=$1 total missing
  if [ ! -s "$file" ]; then
    fail "compile commands: $file missing or empty"
    return
  fi
  total=$(grep -c '"command":' "$file" || true)
  local labels=(-fstack-protector-strong) patterns=('-fstack-protector-strong( |")')
  if [ "$fortify" -eq 1 ]; then
    labels+=(-D_FORTIFY_SOURCE=2 'an optimisation level')
    patterns+=('-D_FORTIFY_SOURCE=2( |")' '-O[1-3sz]?( |")')
  fi
  local i
  for i in "${!labels[@]}"; do
    missing=$(grep '"command":' "$file" | grep -Evc -- "${patterns[$i]}" || true)
    if [ "$missing" -ne 0 ]; then
      fail "compile commands: $missing of $total without ${labels[$i]}"
    else
      pass "compile commands: all $total with ${labels[$i]}"
    fi
  done
}

for file in "${files[@]}"; do
  check_file "$file"
done
[ -z "$commands" ] || check_commands "$commands"

echo "$passed passed, $failed failed"
[ "$failed" -eq 0 ]
