#!/usr/bin/env bash
# The signature check must notice a single changed byte of code: it accepts
# the universal launcher given, and refuses a copy in which one byte in the
# middle of the arm64 slice's __text section is flipped. Run by
# scripts/check-macos.sh, which names llvm-otool in LLVM_OTOOL.
set -euo pipefail
check=$(dirname "$0")/../../scripts/check-macho-signature.py
copy=$(mktemp)
trap 'rm -f "$copy"' EXIT
cp "$1" "$copy"
"$check" "$copy" arm64 >/dev/null
# The slice's offset in the universal file, and the section's in the slice.
slice=$("$LLVM_OTOOL" -f "$1" | awk '$2 == "16777228" { f = 1 } f && $1 == "offset" { print $2; exit }')
read -r text size < <("$LLVM_OTOOL" -arch arm64 -l "$1" |
  awk '$2 == "__text" { f = 1 } f && $1 == "size" { s = $2 } f && $1 == "offset" { print $2, s; exit }')
at=$((slice + text + size / 2))
byte=$(od -An -tu1 -j "$at" -N1 "$copy")
printf "\\$(printf %o $((byte ^ 1)))" | dd of="$copy" bs=1 seek="$at" conv=notrunc status=none
if result=$("$check" "$copy" arm64); then
  echo "FAILED (a changed byte at $at passed: $result)"
  exit 1
fi
echo "ok (refused with a byte of the arm64 code changed at offset $at: ${result#*(}"
