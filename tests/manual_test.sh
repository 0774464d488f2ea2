#!/bin/bash
# The manual explains each message that a start has, in these words, and no other.
set -euo pipefail
cd "$(dirname "$0")/.."

# Whichever way something may be printed.
list_printed_messages() {
  cat src/{boot,driver,dataset,fs}/*.{h,cpp} | tr '\n' ' ' |
    grep -oE '((warnx?|errx?|perror|puts|printf)\(|cerr <<)[^";]*"[^"]*"' | sed 's/^[^"]*//' | sort
}

list_explained_messages() {
  sed -n '/^\.Sh DIAGNOSTICS/,/^\.Sh SEE ALSO/s/^\.It \("[^"]*"\)$/\1/p' \
    install/tzdata-select.8 | sort
}

diff <(list_printed_messages) <(list_explained_messages)
