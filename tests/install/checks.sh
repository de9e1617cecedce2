# SPDX-License-Identifier: MIT
# shellcheck shell=bash disable=SC2034
# Sourced by the scripts beside it: a folder to work in, checks that are counted, and what is to be installed.
export LC_ALL=C.UTF-8  # lists are compared in one order
work=$(realpath "$(mktemp -d /tmp/brivod-install.XXXXXX)")  # short: the path of a unix socket has 107 bytes
source "$(dirname "${BASH_SOURCE[0]}")/../support/checks.sh"

# expected_files SOURCE LIBDIR VERSION [PACKAGE]: what is installed of one package, or of all, sorted.
expected_files() {
  local package file
  sed -e '/^#/d' -e "s|@LIBDIR@|$2|" -e "s|@VERSION@|$3|" "$1/tests/install/files.txt" |
    while read -r package file; do
      [ -z "${4-}" ] || [ "$package" = "$4" ] || continue
      echo "$file"
    done | sort
}

# files_in FOLDER: the files and links there, sorted; the name of a build's configuration aside.
files_in() { (cd "$1" && find . ! -type d | sed -e 's|^\./||' -e 's|Targets-[a-z]*\.cmake|Targets-CONFIG.cmake|' | sort); }
