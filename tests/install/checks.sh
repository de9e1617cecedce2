# SPDX-License-Identifier: MIT
# shellcheck shell=bash disable=SC2034
# Sourced by the scripts beside it: a folder to work in, and checks that are counted.
export LC_ALL=C.UTF-8  # lists are compared in one order
work=$(realpath "$(mktemp -d /tmp/brivod-install.XXXXXX)")  # short: the path of a unix socket has 107 bytes
failed=0

# check WHAT COMMAND...: runs it; when it fails, shows what it printed and goes on.
check() {
  local what=$1
  shift
  if "$@" >"$work/output" 2>&1; then
    echo "ok: $what"
  else
    echo "NOT OK: $what" >&2
    cat "$work/output" >&2
    failed=1
  fi
}

# expected_files SOURCE LIBDIR VERSION [PACKAGE]: what is installed of one package, or of all, sorted.
expected_files() {
  local package file origin
  sed -e '/^#/d' -e "s|@LIBDIR@|$2|" -e "s|@VERSION@|$3|" "$1/tests/install/files.txt" |
    while read -r package file origin; do
      [ -z "${4-}" ] || [ "$package" = "$4" ] || continue
      [ -z "$origin" ] || [ -e "$1/$origin" ] || continue
      echo "$file"
    done | sort
}

# files_in FOLDER: the files and links there, sorted; the name of a build's configuration aside.
files_in() { (cd "$1" && find . ! -type d | sed -e 's|^\./||' -e 's|Targets-[a-z]*\.cmake|Targets-CONFIG.cmake|' | sort); }
