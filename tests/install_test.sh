#!/bin/bash
# Tests what goes onto a system besides the program. Exits with 77 where a tool is missing.
# usage: tests/install_test.sh BUILD_DIRECTORY
set -euo pipefail
build=$(realpath "$1")
cd "$(dirname "$0")/.."

# Whichever way something may be printed.
list_printed_messages() {
  cat src/*/*.{h,cpp} | tr '\n' ' ' |
    grep -oE '((warnx?|errx?|perror|puts|printf)\(|cerr <<)[^";]*"[^"]*"' | sed 's/^[^"]*//' | sort
}

list_explained_messages() {
  sed -n '/^\.Sh DIAGNOSTICS/,/^\.Sh SEE ALSO/s/^\.It \("[^"]*"\)$/\1/p' \
    install/tzdata-select.8 | sort
}

diff <(list_printed_messages) <(list_explained_messages)

if ! command -v systemd-analyze >/dev/null; then
  echo "skipped: there is no systemd-analyze on this machine"
  exit 77
fi
# In a directory whose name systemd reads as something else, unless the unit takes care.
installed=$(mktemp -d)
trap 'rm -r "$installed"' EXIT
cmake --install "$build" --prefix "$installed/odd %prefix" >/dev/null
unit="$installed/odd %prefix/lib/systemd/system/tzdata-select.service"
# It complains about a program that it doesn't find.
diff <(systemd-analyze verify --man=no "$unit" 2>&1) /dev/null
# Ten times the score that it has: what is left is that it runs as root, for all to read, and the
# clock that ProtectClock= itself allows to be read.
systemd-analyze security --offline=true --no-pager --threshold=5 "$unit" | grep -v '^✓'
