#!/bin/bash
# Tests what goes onto a system besides the program. Exits with 77 where a tool is missing.
# usage: tests/install_test.sh BUILD_DIRECTORY trees | unit | sandbox | manual | messages
set -euo pipefail
build=$(realpath "$1")
source=$(realpath "$(dirname "$0")/..")
installed=$(mktemp -d)
trap 'rm -r "$installed"' EXIT

need() { # TOOL
  command -v "$1" >/dev/null && return
  echo "skipped: there is no $1 on this machine"
  exit 77
}

install_below_prefix() { cmake --install "$build" --prefix "$installed" >/dev/null; }

# Runs a command that must have nothing to say, unless about other manuals on this machine, which
# mandoc ends with 1.
stay_silent() { # COMMAND ...
  local said status=0
  said=$("$@" 2>&1) || status=$?
  said=$(grep -vE 'referenced manual not found|outdated mandoc.db' <<<"$said" || true)
  echo "$said"
  [ -z "$said" ] && [ $status -le 1 ]
}

list_tree() { # DIRECTORY
  (cd "$1" && find . -type f | sort && grep -rh ^ExecStart= .)
}

list_expected() { # PREFIX
  local prefix=${1//%/%%}
  printf '%s\n' ./lib/systemd/system/tzdata-select.service ./lib/tmpfiles.d/tzdata-select.conf \
    ./sbin/tzdata-select ./share/man/man8/tzdata-select.8 \
    "ExecStart=${prefix// /\\x20}/sbin/tzdata-select"
}

# Whichever way something may be printed.
list_printed_messages() {
  cat "$source"/src/*/*.{h,cpp} | tr '\n' ' ' |
    grep -oE '((warnx?|errx?|perror|puts|printf)\(|cerr <<)[^";]*"[^"]*"' | sed 's/^[^"]*//' | sort
}

list_explained_messages() {
  sed -n '/^\.Sh DIAGNOSTICS/,/^\.Sh SEE ALSO/s/^\.It \("[^"]*"\)$/\1/p' \
    "$source/install/tzdata-select.8" | sort
}

case $2 in
  trees)
    (cd "$installed" && cmake --install "$build" --prefix "odd %prefix" >/dev/null)
    diff <(list_expected "$installed/odd %prefix") <(list_tree "$installed/odd %prefix")
    DESTDIR=$installed/one cmake --install "$build" --prefix /usr >/dev/null
    diff <(list_expected /usr) <(list_tree "$installed/one/usr")
    DESTDIR=$installed/other cmake --install "$build" --prefix / >/dev/null
    diff <(list_expected "") <(list_tree "$installed/other")
    ;;
  unit)
    need systemd-analyze
    install_below_prefix
    stay_silent systemd-analyze verify --man=no \
      "$installed/lib/systemd/system/tzdata-select.service"
    ;;
  sandbox)
    need systemd-analyze
    install_below_prefix
    # Ten times the score that it has: what is left is that it runs as root, for all to read, and
    # the clock that ProtectClock= itself allows to be read.
    systemd-analyze security --offline=true --no-pager --threshold=5 \
      "$installed/lib/systemd/system/tzdata-select.service" | grep -v '^✓'
    ;;
  manual)
    need mandoc
    stay_silent mandoc -T lint "$source/install/tzdata-select.8"
    ;;
  messages) diff <(list_printed_messages) <(list_explained_messages) ;;
  *)
    echo "no such case: $2" >&2
    exit 2
    ;;
esac
