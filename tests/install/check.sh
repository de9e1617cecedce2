#!/usr/bin/env bash
# SPDX-License-Identifier: MIT
# Installs a build in a fresh folder, looks at what is there, and runs the main job with it. Usage:
#
#   check.sh BUILD SOURCE COMPILER LIBDIR VERSION     (LIBDIR is relative to the prefix)
set -uo pipefail
build=$1 source=$2 compiler=$3 libdir=$4 version=$5
# shellcheck source=tests/install/checks.sh
. "$source/tests/install/checks.sh"
trap 'rm -rf "$work"' EXIT

prefix=$work/prefix
library=$prefix/$libdir/libOrvidCore.so
check "the build installs" cmake --install "$build" --prefix "$prefix"
check "exactly the files that belong there" \
  diff <(expected_files "$source" "$libdir" "$version") <(files_in "$prefix")

exported() { nm -D --defined-only -C "$library" | cut -d ' ' -f 3-; }
others() { exported | grep -vE '^(orvid|brivo)::'; }
check "the library shows its interface" grep -q '^orvid::DeviceBrowser::connect(' <(exported)
check "the library shows nothing else" diff <(:) <(others)

of_the_build_tree() { grep -rlIF -e "$build" -e "$source" "$prefix"; }
check "no text file speaks of the build tree" diff <(:) <(of_the_build_tree)
check "pkg-config names the version" \
  [ "$(PKG_CONFIG_PATH=$prefix/$libdir/pkgconfig pkg-config --modversion orvidcore)" = "$version" ]

"$source/tests/install/main_job.sh" "$source" "$prefix" "$libdir" "$compiler" org.orvid.Photos || failed=1
exit $failed
