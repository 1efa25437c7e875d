#!/usr/bin/env bash
# SPDX-License-Identifier: LGPL-2.1-or-later
# Makes the Debian packages and checks them with lintian; they are in build-packages/ then.
#   scripts/packages.sh [--test]   --test: installs them in a new Debian system in a folder as well,
#                                  uses them there as a new user would, and removes them (as root)
source "$(dirname "$0")/lib.sh"

case "${1:-}" in '' | --test) ;; *) echo "usage: packages.sh [--test]" >&2; exit 2 ;; esac
[ -z "${1:-}" ] || [ "$(id -u)" -eq 0 ] || die "--test makes a Debian system, which takes root"

folder=$root/build-packages
need_packages "${build_packages[@]}" "${docs_packages[@]}" dpkg-dev file lintian
build "$folder" -DCMAKE_INSTALL_PREFIX=/usr -DCMAKE_SKIP_INSTALL_RPATH=ON \
    -DKESBLUETOOTH_BUILD_TESTS=OFF -DKESBLUETOOTH_BUILD_DOCS=ON
rm -f "$folder"/*.deb
# The files bear the time of the changelog: the same build gives the same packages.
SOURCE_DATE_EPOCH=$(dpkg-parsechangelog -l "$root/packaging/debian/changelog" -S Timestamp)
export SOURCE_DATE_EPOCH
(cd "$folder" && cpack -G DEB) >"$folder/cpack.log" 2>&1 || { cat "$folder/cpack.log" >&2; die "cpack failed"; }
(cd "$folder" && ls ./*.deb)
# Only an upload to Debian itself closes the bug that asked for the package.
lintian --allow-root --fail-on error,warning --suppress-tags initial-upload-closes-no-bugs \
    "$folder"/*.deb || die "lintian objects to the packages, see above"
[ "${1:-}" = --test ] || exit 0

need_packages debootstrap
system=$folder/system
rm -rf --one-file-system "$system"

echo "Making a Debian system in ${system#"$root"/} ..."
apt-get update -qq
mirror=$(apt-get indextargets --format '$(REPO_URI)' 'Created-By: Packages' 'Codename: bookworm' | head -n 1)
[ -n "$mirror" ] || die "apt knows no source of Debian 12"
debootstrap --variant=minbase --include=ca-certificates bookworm "$system" "$mirror" >"$folder/debootstrap.log" 2>&1 ||
    { tail -n 20 "$folder/debootstrap.log" >&2; die "debootstrap failed"; }
rm -f "$system/etc/apt/sources.list"
for settings in sources.list sources.list.d apt.conf.d auth.conf.d keyrings; do
    [ ! -e "/etc/apt/$settings" ] || cp -r "/etc/apt/$settings" "$system/etc/apt/"
done
mkdir "$system/packages"
cp "$folder"/*.deb "$root/tests/packages/user.sh" "$root/tests/examples/run.sh" \
    "$root/README.md" "$system/packages/"

# A root folder has to be a mount for namespaces to be made in it.
unshare --mount --pid --fork bash -euc '
    system=$1
    mount --make-rprivate /
    mount --bind "$system" "$system"
    mount --rbind /dev "$system/dev"
    mount -t proc proc "$system/proc"
    mount --rbind /sys "$system/sys"
    mount -t tmpfs tmpfs "$system/tmp"
    exec chroot "$system" /usr/bin/env -i HOME=/root LANG=C.UTF-8 \
        PATH=/usr/local/sbin:/usr/local/bin:/usr/sbin:/usr/bin:/sbin:/bin /packages/user.sh
' bash "$system" </dev/null
rm -rf --one-file-system "$system"
echo "The packages install, work and go again"
