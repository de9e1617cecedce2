#!/usr/bin/env bash
# SPDX-License-Identifier: MIT
# Installs Debian packages with dpkg in a copy of this system, runs the main job there as an ordinary user, and removes
# them again. The copy is an overlay: what is written goes to memory and ends with the script. Usage:
#
#   installed.sh FOLDER SOURCE COMPILER LIBDIR     (FOLDER has the packages; exit code 77: it cannot be done here)
set -uo pipefail
folder=$1 source=$2 compiler=$3 libdir=$4
cannot() { echo "Skipped here: $1"; exit 77; }
[ "$(id -u)" = 0 ] || cannot "a copy of the system takes root"
if [ "${BRIVOD_PRIVATE_MOUNTS-}" != yes ]; then
  unshare --mount true 2>/dev/null || cannot "root may not make mount namespaces"
  BRIVOD_PRIVATE_MOUNTS=yes exec unshare --mount --propagation private "$0" "$@"
fi
# shellcheck source=tests/install/checks.sh
. "$source/tests/install/checks.sh"
trap 'umount -R -l "$work" 2>/dev/null; rmdir "$work"' EXIT

root=$work/root
mount -t tmpfs -o mode=755 tmpfs "$work" && mkdir "$root" "$work/written" "$work/scratch" || cannot "nothing can be mounted"
mount -t overlay -o "lowerdir=/,upperdir=$work/written,workdir=$work/scratch" overlay "$root" 2>/dev/null ||
  cannot "there are no overlays on this file system"
mount -t tmpfs -o mode=1777 tmpfs "$root/tmp"
mount --rbind /proc "$root/proc"
mount --rbind /dev "$root/dev"
mount --bind "$source" "$root/mnt" && mount -o remount,bind,ro "$root/mnt"
rm -f "$root"/etc/dpkg/dpkg.cfg.d/*  # small images tell dpkg to leave manual pages out
mkdir "$root/tmp/packages"
cp "$folder"/*.deb "$root/tmp/packages"
chmod -R a+rX "$root/tmp/packages"

inside() { chroot "$root" env DEBIAN_FRONTEND=noninteractive LC_ALL=C.UTF-8 "$@"; }
packages=(brivod brivoctl liborvidcore0 liborvidcore-dev)
# shellcheck disable=SC2016  # for the shell inside
check "dpkg installs the packages" inside sh -c 'dpkg --install /tmp/packages/*.deb'
check "their files are as they were packed" diff <(:) <(inside dpkg --verify "${packages[@]}")
check "the linker finds the library" grep -q libOrvidCore.so.0 <(inside ldconfig -p)
wanted=$root/etc/systemd/user/sockets.target.wants/brivod.socket
if [ -e "$source/packaging/systemd/brivod.socket" ]; then
  check "every session listens for clients of the service" \
    [ "$(readlink "$wanted")" = /usr/lib/systemd/user/brivod.socket ]
fi
[ "$failed" = 0 ] || exit 1

chroot "$root" setpriv --reuid=65534 --regid=65534 --clear-groups \
  /mnt/tests/install/main_job.sh /mnt /usr "$libdir" "$compiler" org.orvid.Photos || failed=1

check "dpkg removes the packages" inside dpkg --purge "${packages[@]}"
left() { find "$work/written" \( -iname '*orvid*' -o -iname '*brivo*' \) -not -type c; }
check "nothing is left of them" diff <(:) <(left)
exit $failed
