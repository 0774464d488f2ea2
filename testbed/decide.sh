#!/bin/sh
# One start as a shell script would do it, for scripts/bench to compare with. It decides the same
# on a device whose names and local time are in order, that has no link of earlier systems, and
# where no call fails.
set -eu

state=/var/db/timezone
area=$state/tz
system=/usr/share/zoneinfo.default

warn() { echo "decide: $*" >&2; }

# Whether version ONE is newer than version OTHER; both as in 2019c.1.0, with years of four digits.
is_newer() { # ONE OTHER
  IFS=.
  # shellcheck disable=SC2086 # split into fields
  set -- $1 $2
  IFS=' '
  # shellcheck disable=SC3012 # Debian's shells compare texts like this
  if [ "$1" != "$4" ]; then
    [ "$1" \> "$4" ]
  elif [ "$2" -ne "$5" ]; then
    [ "$2" -gt "$5" ]
  else
    [ "$3" -gt "$6" ]
  fi
}

# Puts the schema of the update at PATH into schema.
find_schema() { # PATH
  schema=
  for file in "$1"/icutz/icutz*[lbe].dat; do
    if [ -f "$file" ]; then
      schema=${file##*/icutz}
      schema=${schema%.dat}
    fi
  done
}

install_links() { # PATH
  rm -f $state/zoneinfo $state/icutz
  if [ -z "$1" ]; then
    ln -s $system $state/zoneinfo
  else
    ln -s "$1/zoneinfo" $state/zoneinfo
    ln -s "$1/icutz" $state/icutz
  fi
}

rm -f $state/needs_cleanup /var/db/icu
read -r system_version <$system/+VERSION
system_name=$system_version.1.0
read -r system_schema </usr/share/icu/icutzformat.txt

latest=$(readlink $state/tz_latest || :)
target=$(readlink $state/zoneinfo || :)
current_name=$system_name
schema=$system_schema
on_update=false
case $target in
  "$area"/*/*)
    on_update=true
    find_schema "${target%/*}"
    current_name=${target#"$area"/}
    current_name=${current_name%/*}
    ;;
  "$system") ;;
  *)
    warn "Bad zoneinfo link $target"
    install_links ''
    ;;
esac
in_use=$current_name
if [ "$schema" != "$system_schema" ] || is_newer "$system_name" "$current_name"; then
  warn "Symlink points at data incompatible with installed system"
  install_links ''
  : >$state/needs_cleanup
  in_use=$system_name
  on_update=false
fi

if [ -n "$latest" ]; then
  latest_name=${latest#"$area"/}
  find_schema "$latest"
  if [ "$schema" = "$system_schema" ] && is_newer "$latest_name" "$current_name"; then
    install_links "$latest"
    ! $on_update || : >$state/needs_cleanup
    printf %s "${in_use}_$latest_name" >$state/TZVersionDiffRecord
  else
    warn "New update not compatible or older version: $latest_name vs. $current_name"
  fi
fi

zone=$(readlink $state/localtime || :)
case $zone in
  $state/zoneinfo*) ;;
  *)
    warn "localtime link invalid; resetting to America/Los_Angeles"
    rm -f $state/localtime
    ln -s $state/zoneinfo/America/Los_Angeles $state/localtime
    ;;
esac
