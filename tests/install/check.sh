#!/usr/bin/env bash
# SPDX-License-Identifier: MIT
# Installs a build in a fresh folder, builds the C++ example against it in the two documented ways, and runs what came
# out against the installed service. Usage:
#
#   check.sh BUILD SOURCE COMPILER LIBDIR VERSION     (LIBDIR is relative to the prefix)
set -uo pipefail
build=$1 source=$2 compiler=$3 libdir=$4 version=$5

work=$(realpath "$(mktemp -d)")
service=
failed=0
cleanup() {
  if [ -n "$service" ]; then kill "$service" && wait "$service"; fi
  rm -rf "$work"
}
trap cleanup EXIT

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

# ---------------------------------------------------------------------------------------------------- what is installed
prefix=$work/prefix
library=$prefix/$libdir/libOrvidCore.so
check "the build installs" cmake --install "$build" --prefix "$prefix"

installed() { (cd "$prefix" && find . ! -type d | sed -e 's|^\./||' -e 's|Targets-[a-z]*\.cmake|Targets-CONFIG.cmake|'); }
expected() {
  printf '%s\n' bin/brivoctl bin/brivod \
    include/orvidcore/{device,device_browser,object,orvidcore,result}.h \
    include/orvidcore/platform/base/{data,result,shared_buffer,url,value}.h \
    "$libdir"/cmake/OrvidCore/OrvidCore{Config,ConfigVersion,Targets,Targets-CONFIG}.cmake \
    "$libdir"/libOrvidCore.so{,.0,".$version"} "$libdir/pkgconfig/orvidcore.pc" \
    libexec/brivod/brivod-imaging \
    share/OrvidCore/DeviceMatchingInfo.plist share/applications/org.orvid.Photos.desktop \
    share/locale/{de,ja}/LC_MESSAGES/OrvidCore.mo
}
check "exactly the files that belong there" diff <(expected | sort) <(installed | sort)

exported() { nm -D --defined-only -C "$library" | cut -d ' ' -f 3-; }
others() { exported | grep -vE '^(orvid|brivo)::'; }
check "the library shows its interface" grep -q '^orvid::DeviceBrowser::connect(' <(exported)
check "the library shows nothing else" diff <(:) <(others)

of_the_build_tree() { grep -rlIF -e "$build" -e "$source" "$prefix"; }
check "no text file speaks of the build tree" diff <(:) <(of_the_build_tree)

# ------------------------------------------------------------------------------------------------- built against it
found_by_cmake() {
  cmake -G Ninja -S "$source/examples/cpp" -B "$work/cmake" -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_COMPILER="$compiler" &&
    cmake --build "$work/cmake"
}
found_by_pkg_config() {
  local flags
  flags=$(PKG_CONFIG_PATH=$prefix/$libdir/pkgconfig pkg-config --cflags --libs orvidcore) || return
  # shellcheck disable=SC2086  # flags are words
  "$compiler" "$source/examples/cpp/list_cards.cpp" -o "$work/list_cards" $flags
}
check "a project finds it with find_package" found_by_cmake
check "a compiler finds it with pkg-config" found_by_pkg_config
check "pkg-config names the version" [ "$(PKG_CONFIG_PATH=$prefix/$libdir/pkgconfig pkg-config --modversion orvidcore)" = "$version" ]

# -------------------------------------------------------------------------------------------------------------- run
export BRIVOD_RUNTIME_DIR=$work/run BRIVOD_VOLUME_FOLDERS=$work/volumes BRIVOD_VOLUME_ROOTS=$work/mounts
export XDG_DATA_HOME=$work/data XDG_CONFIG_HOME=$work/config XDG_DATA_DIRS=$prefix/share
export LD_LIBRARY_PATH=$prefix/$libdir
mkdir -p "$work/volumes/CARD/DCIM/100ABCDE" "$work/data"
printf 'first picture' >"$work/volumes/CARD/DCIM/100ABCDE/IMG_0001.JPG"
"$prefix/bin/brivod" 2>"$work/log" &
service=$!
brivoctl=$prefix/bin/brivoctl
export brivoctl
# shellcheck disable=SC2016  # for the inner shell
check "the installed service serves the card" timeout 60 bash -c 'until "$brivoctl" devices | grep CARD; do :; done'
check "the installed brivoctl is the built-in application" grep -q '^org.orvid.Photos ' <("$brivoctl" access whoami)
check "the installed brivoctl needs no grant" "$brivoctl" ls

lists_and_saves() (
  mkdir "$work/saved" && cd "$work/saved" && "$brivoctl" access grant "$1" && timeout 60 "$1" >../listed
  code=$?
  cat ../listed
  [ "$code" = 0 ] && grep -qx CARD ../listed && grep -qx '  DCIM/100ABCDE/IMG_0001.JPG  13' ../listed &&
    cmp IMG_0001.JPG "$work/volumes/CARD/DCIM/100ABCDE/IMG_0001.JPG" && rm -r "$work/saved"
)
check "the program built with find_package lists and saves" lists_and_saves "$work/cmake/list_cards"
check "the program built with pkg-config lists and saves" lists_and_saves "$work/list_cards"

kill "$service" && wait "$service"
check "the service ends well" [ $? = 0 ]
service=
exit $failed
