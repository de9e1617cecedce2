#!/usr/bin/env bash
# SPDX-License-Identifier: MIT
# Makes a new Debian system, lets apt install the packages there with what they depend on, and runs the main job as an
# ordinary user. Takes minutes and a mirror, so that scripts/package --check runs it and the tests do not. Usage:
#
#   new_system.sh FOLDER SOURCE [ROOT]     (FOLDER has the packages; a ROOT that is given is copied instead of made)
set -uo pipefail
folder=$1 source=$2 given=${3-}
[ "$(id -u)" = 0 ] || { echo "new_system: run as root" >&2; exit 1; }
# shellcheck source=tests/install/checks.sh
. "$source/tests/install/checks.sh"
root=$(mktemp -d /var/tmp/brivod-system.XXXXXX)  # there is room
chmod 755 "$root"
trap 'rm -rf "$work" "$root"' EXIT

if [ -n "$given" ]; then
  check "there is a copy of a system" cp -a "$given/." "$root"
else
  check "there is a new system" debootstrap --variant=minbase bookworm "$root"
fi
[ "$failed" = 0 ] || exit 1
mkdir "$root/tmp/packages"
cp "$folder"/*.deb "$root/tmp/packages"
chmod -R a+rX "$root/tmp/packages"
cp /etc/resolv.conf "$root/etc/resolv.conf"

# Whatever is mounted is gone with its namespace, before anything is removed here.
mounted() {
  unshare --mount --propagation private bash -c '
    mount --bind "$2" "$1/mnt" && mount -o remount,bind,ro "$1/mnt" && mount -t proc proc "$1/proc" &&
      mount --rbind /dev "$1/dev" && exec chroot "$1" env DEBIAN_FRONTEND=noninteractive LC_ALL=C.UTF-8 "${@:3}"
  ' mounted "$root" "$source" "$@"
}
check "apt knows its packages" mounted apt-get update
check "apt installs the packages and what they depend on" \
  mounted sh -c 'apt-get install -y --no-install-recommends /tmp/packages/*.deb'
check "apt installs what programs are built with" \
  mounted apt-get install -y --no-install-recommends g++ cmake ninja-build pkg-config
[ "$failed" = 0 ] || exit 1

libdir=lib/$(mounted gcc -print-multiarch)
mounted setpriv --reuid=65534 --regid=65534 --clear-groups \
  /mnt/tests/install/main_job.sh /mnt /usr "$libdir" g++ org.orvid.Photos || failed=1
check "apt removes the packages" mounted apt-get purge -y brivod brivoctl liborvidcore0 liborvidcore-dev
left() { find "$root"/{etc,usr,var/lib} \( -iname '*orvid*' -o -iname '*brivo*' \); }
check "nothing is left of them" diff <(:) <(left)
exit $failed
