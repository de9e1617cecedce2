#!/usr/bin/env bash
# SPDX-License-Identifier: MIT
# Makes the Debian packages of a build, looks at them, and runs the main job with what is in them, unpacked into an empty
# folder. Usage:
#
#   packages.sh BUILD SOURCE COMPILER LIBDIR VERSION FOLDER     (the packages stay in FOLDER; LIBDIR is below /usr)
set -uo pipefail
build=$1 source=$2 compiler=$3 libdir=$4 version=$5 folder=$6
# shellcheck source=tests/install/checks.sh
. "$source/tests/install/checks.sh"
trap 'rm -rf "$work"' EXIT

# The debug information of a whole build takes minutes to compress. A file that nobody else may read shows whether a mode
# comes from the umask.
make_packages() (
  rm -rf "$folder" && umask 077 && cd "$build" &&
    cpack -G DEB -B "$work/cpack" -D CPACK_OUTPUT_FILE_PREFIX="$folder" -D CPACK_STRIP_FILES=ON \
      -D CPACK_DEBIAN_COMPRESSION_TYPE=gzip -D CPACK_DEBIAN_DAEMON_DEBUGINFO_PACKAGE=OFF \
      -D CPACK_DEBIAN_LIBRARY_DEBUGINFO_PACKAGE=OFF -D CPACK_DEBIAN_COMMANDLINE_DEBUGINFO_PACKAGE=OFF
)
check "the packages are made" make_packages
architecture=$(dpkg --print-architecture)
packages=(brivoctl brivod liborvidcore-dev liborvidcore0)
check "there is one for each component" \
  diff <(printf "%s_${version}_$architecture.deb\n" "${packages[@]}") <(files_in "$folder")

root=$work/root
mkdir "$root"
deb() { echo "$folder/$1_${version}_$architecture.deb"; }
field() { dpkg-deb --field "$(deb "$1")" "$2"; }
for package in "${packages[@]}"; do
  check "$package unpacks" dpkg-deb --extract "$(deb "$package")" "$work/$package"
  check "$package has exactly the files that belong there" \
    diff <(expected_files "$source" "$libdir" "$version" "$package") <(files_in "$work/$package/usr")
  modes() { dpkg-deb --contents "$(deb "$package")" | cut -d ' ' -f 1,2 | sort -u; }
  check "$package is root's, readable to all and writable to root alone" \
    diff <(:) <(modes | grep -vxE '(drwxr-xr-x|-rwxr-xr-x|-rw-r--r--|lrwxrwxrwx) root/root')
  check "$package begins its changelog with its version" \
    grep -q "^brivod ($version) " <(gzip -dc "$work/$package/usr/share/doc/$package/changelog.gz" | head -n 1)
  check "$package says who looks after it" grep -qx 'brivod maintainers <.*@.*>' <(field "$package" Maintainer)
  check "$package describes itself" [ "$(field "$package" Description | wc -l)" -gt 3 ]
  cp -a "$work/$package/." "$root"
done

# -------------------------------------------------------------------------------------------- what each package says
check "brivod depends on the libraries that it is linked to" grep -q 'libsystemd0 .*' <(field brivod Depends)
check "the development files want their library" [ "$(field liborvidcore-dev Depends)" = "liborvidcore0 (= $version)" ]
control() { dpkg-deb --info "$(deb "$1")" "$2"; }
check "programs that are linked to the library depend on it" \
  [ "$(control liborvidcore0 shlibs)" = "libOrvidCore 0 liborvidcore0 (>= $version)" ]
check "the library goes beside that of another architecture" [ "$(field liborvidcore0 Multi-Arch)" = same ]
check "the linker's cache is told of the library" [ "$(control liborvidcore0 triggers)" = "activate-noawait ldconfig" ]
check "the desktop file names the installed program" \
  grep -qx 'Exec=/usr/bin/brivoctl devices' "$root/usr/share/applications/org.orvid.Photos.desktop"

# --------------------------------------------------------------------------------------------- what is in their files
binaries=("$root"/usr/bin/* "$root/usr/libexec/brivod/brivod-imaging" "$root/usr/$libdir/libOrvidCore.so.$version")
unstripped() { file "${binaries[@]}" | grep -v ', stripped$'; }
check "there are no symbols for a debugger" diff <(:) <(unstripped)
with_a_path() { readelf -d "${binaries[@]}" | grep -E 'RPATH|RUNPATH'; }
check "libraries are looked for where the system has them" diff <(:) <(with_a_path)
of_this_machine() { grep -rlIF -e "$build" -e "$source" -e "$work" "$root"; }
check "no text file speaks of the build tree" diff <(:) <(of_this_machine)
check "the desktop file is valid" desktop-file-validate "$root/usr/share/applications/org.orvid.Photos.desktop"
check "the metadata for software centres is valid" \
  appstreamcli validate --no-net "$root/usr/share/metainfo/org.orvid.brivod.metainfo.xml"

[ "$failed" = 0 ] || exit 1
"$source/tests/install/main_job.sh" "$source" "$root/usr" "$libdir" "$compiler" "$root/usr/bin/brivoctl"
