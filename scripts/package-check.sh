#!/usr/bin/env bash
# Builds the Debian packages, installs them into a throw-away root with dpkg, verifies their
# systemd units there, runs fileindexctl --version and the README's quick start with the
# installed binaries, then purges the packages and checks that nothing of them is left.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh systemd
scripts/package.sh
work=$(mktemp -d /tmp/fileindex-packages-XXXXXX)
trap 'rm -rf "$work" /tmp/appliance' EXIT
root="$work/root"
mkdir -p "$root/var/lib/dpkg/info" "$root/var/lib/dpkg/updates"
touch "$root/var/lib/dpkg/status" "$root/var/lib/dpkg/available"
# The root holds only these packages: the system's own libraries stay the host's.
in_root() {
  dpkg --root="$root" --log=/dev/null --force-depends --force-script-chrootless --force-not-root "$@" \
    >"$work/dpkg.log" 2>&1 || { cat "$work/dpkg.log"; echo "package-check: dpkg $* failed"; exit 1; }
}
in_root -i build-deb/*.deb

echo "package-check: units"
(cd "$root" && systemd-analyze verify --man=no --recursive-errors=no --root="$root" lib/systemd/system/*.service)

echo "package-check: the installed tools"
export PATH="$root/usr/bin:$PATH" LD_LIBRARY_PATH="$root/usr/lib/$(dpkg-architecture -qDEB_HOST_MULTIARCH)"
[ "$(command -v fileindexctl)" = "$root/usr/bin/fileindexctl" ]
fileindexctl --version
rm -rf /tmp/appliance
scripts/quick-start.sh README.md >"$work/quick-start.sh"
echo 'kill $(jobs -p) 2>/dev/null || true' >>"$work/quick-start.sh"
(cd "$work" && bash "$work/quick-start.sh") >"$work/quick-start.log" 2>&1 ||
  { cat "$work/quick-start.log"; echo "package-check: the quick start failed"; exit 1; }

echo "package-check: removal"
in_root --purge fileindex-sim fileindex-tools libfileindex-dev libfileindex1
left=$(cd "$root" && find . -mindepth 1 ! -path './var' ! -path './var/lib' ! -path './var/lib/dpkg' ! -path './var/lib/dpkg/*')
[ -z "$left" ] || { echo "package-check: left behind after purge:"; echo "$left"; exit 1; }
echo "package-check: the packages build, install, run and purge cleanly"
