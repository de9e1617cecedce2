#!/usr/bin/env bash
# SPDX-License-Identifier: MIT
# Runs the main job with what is installed: the service serves a card, the command line lists it, shows a picture and
# saves it, and programs that are built on the client library do the same. Usage:
#
#   main_job.sh SOURCE PREFIX LIBDIR COMPILER IDENTIFIER
#
# LIBDIR is relative to the prefix; IDENTIFIER is what the service is to know brivoctl by.
set -uo pipefail
source=$1 prefix=$2 libdir=$3 compiler=$4 identifier=$5
# shellcheck source=tests/install/checks.sh
. "$source/tests/install/checks.sh"
service=
cleanup() {
  if [ -n "$service" ]; then kill "$service" && wait "$service"; fi
  rm -rf "$work"
}
trap cleanup EXIT

export HOME=$work/home BRIVOD_RUNTIME_DIR=$work/run BRIVOD_VOLUME_FOLDERS=$work/volumes BRIVOD_VOLUME_ROOTS=$work/mounts
export XDG_DATA_HOME=$work/data XDG_CONFIG_HOME=$work/config
unset XDG_RUNTIME_DIR DBUS_SESSION_BUS_ADDRESS  # the session's name is for the user's own service
export PATH=$prefix/bin:$PATH
if [ "$prefix" != /usr ]; then
  export XDG_DATA_DIRS=$prefix/share LD_LIBRARY_PATH=$prefix/$libdir PKG_CONFIG_PATH=$prefix/$libdir/pkgconfig
fi
mkdir -p "$work"/{home,volumes,saved}
card=$work/volumes/CARD picture=DCIM/100BRIVO/IMG_0001.JPG
check "there is a card" "$source/scripts/sample-card" "$card"

# ------------------------------------------------------------------------------------- service and command line
brivod 2>"$work/log" &
service=$!
# shellcheck disable=SC2016  # for the inner shell
check "the installed service serves the card" timeout 60 bash -c 'until brivoctl devices | grep CARD; do :; done'
check "the service knows brivoctl" grep -qF "\"identifier\": \"$identifier\"" <(brivoctl access whoami --json)
[ "$identifier" = org.orvid.Photos ] || check "brivoctl gets a grant" brivoctl access grant "$identifier"
check "brivoctl lists the card" grep -q "  $picture\$" <(brivoctl ls CARD)
check "brivoctl saves a picture" brivoctl get "$picture" -d "$work/saved"
check "the saved picture is the card's" cmp "$work/saved/IMG_0001.JPG" "$card/$picture"
check "brivoctl saves a thumbnail" brivoctl thumb "$picture" -o "$work/thumb.jpg"
check "the imaging process decodes one that is not on the card" brivoctl thumb "$picture" --size 400 -o "$work/large.jpg"
is_larger() { [ "$(stat -c %s "$work/large.jpg")" -gt "$(stat -c %s "$work/thumb.jpg")" ]; }
check "the decoded thumbnail is the larger one" is_larger

# --------------------------------------------------------------------------------------- programs of other people
found_by_cmake() {
  cmake -G Ninja -S "$source/examples/cpp" -B "$work/cmake" -DCMAKE_PREFIX_PATH="$prefix" -DCMAKE_CXX_COMPILER="$compiler" &&
    cmake --build "$work/cmake"
}
found_by_pkg_config() {
  local flags
  flags=$(pkg-config --cflags --libs orvidcore) || return
  # shellcheck disable=SC2086  # flags are words
  "$compiler" "$source/examples/cpp/list_cards.cpp" -o "$work/list_cards" $flags
}
check "a project finds the library with find_package" found_by_cmake
check "a compiler finds the library with pkg-config" found_by_pkg_config

lists_and_saves() (
  mkdir "$work/client" && cd "$work/client" && brivoctl access grant "$1" && timeout 60 "$1" >../listed
  code=$?
  cat ../listed
  [ "$code" = 0 ] && grep -qx CARD ../listed && grep -q "^  $picture  " ../listed &&
    cmp IMG_0001.JPG "$card/$picture" && rm -r "$work/client"
)
check "the program built with find_package lists and saves" lists_and_saves "$work/cmake/list_cards"
check "the program built with pkg-config lists and saves" lists_and_saves "$work/list_cards"

kill "$service" && wait "$service"
check "the service ends well" [ $? = 0 ]
service=
[ "$failed" = 0 ] || tail -n 20 "$work/log" >&2
exit $failed
