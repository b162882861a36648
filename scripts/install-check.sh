#!/usr/bin/env bash
# Installs into a temporary prefix and uses the install as a newcomer would: the documented
# quick starts run as written with the prefix's bin on PATH, two consumers build against the
# prefix (find_package and pkg-config) and run on the simulated appliance, the library exports
# only its interface, and the manual pages and completion are there.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh
work=$(mktemp -d /tmp/fileindex-install-XXXXXX)
daemon=""
cleanup() {
  [ -n "$daemon" ] && kill "$daemon" 2>/dev/null || true
  rm -rf "$work" /tmp/appliance
}
trap cleanup EXIT
prefix="$work/prefix"
cmake -S . -B build-install -DCMAKE_BUILD_TYPE=Release -DFILEINDEX_BUILD_TESTS=OFF >/dev/null
cmake --build build-install -j "$(nproc)" >/dev/null
cmake --install build-install --prefix "$prefix" >/dev/null
export PATH="$prefix/bin:$PATH"

for doc in README.md docs/simulated-appliance.md; do
  echo "install-check: quick start of $doc"
  rm -rf /tmp/appliance
  scripts/quick-start.sh "$doc" >"$work/quick-start.sh"
  echo 'kill $(jobs -p) 2>/dev/null || true' >>"$work/quick-start.sh"
  (cd "$work" && bash "$work/quick-start.sh") >"$work/quick-start.log" 2>&1 ||
    { cat "$work/quick-start.log"; echo "install-check: the quick start of $doc failed"; exit 1; }
  if [ "$doc" = README.md ] && ! grep -q "QLIBServiceStart failed: err=\[0x1234" "$work/quick-start.log"; then
    cat "$work/quick-start.log"; echo "install-check: the failing step did not say why"; exit 1
  fi
done

echo "install-check: consumers"
cmake -S tests/consumers -B "$work/consumer-cmake" -DCMAKE_PREFIX_PATH="$prefix" >/dev/null
cmake --build "$work/consumer-cmake" >/dev/null
# shellcheck disable=SC2046
# The .pc file adds no run path: a consumer of a prefix outside the loader's path sets its own.
g++ -std=c++17 tests/consumers/consumer.cc -o "$work/consumer-pkgconfig" \
  $(PKG_CONFIG_PATH="$prefix/lib/pkgconfig" pkg-config --cflags --libs fileindex) -Wl,-rpath,"$prefix/lib"
grep -q -- '-Wl' "$prefix"/lib/pkgconfig/fileindex.pc && { echo "install-check: fileindex.pc injects linker flags"; exit 1; }
grep -q '^prefix=${pcfiledir}/../..$' "$prefix"/lib/pkgconfig/fileindex.pc ||
  { echo "install-check: fileindex.pc does not find its prefix from where it lies"; exit 1; }
export QIRA_ROOT="$work/appliance"
mkdir -p "$QIRA_ROOT/volume1/music"
qira-sim init
qira-sim share add music "$QIRA_ROOT/volume1/music"
fileindexd-ref & daemon=$!
for _ in $(seq 100); do [ -S "$QIRA_ROOT/var/run/fileindexd.sock" ] && break; sleep 0.05; done
fileindexctl folder add /music --audio
for consumer in "$work/consumer-cmake/consumer" "$work/consumer-pkgconfig"; do
  "$consumer" music | grep -q "^indexed 1$" || { echo "install-check: $consumer failed"; exit 1; }
done

echo "install-check: exported symbols, manual pages, completion"
scripts/check-exports.sh "$prefix"/lib*/libfileindex.so.1
for page in fileindexctl fileindex-web qira-sim fileindexd-ref qiranotifyd-sim fileindex-extractor; do
  warnings=$(groff -man -z -ww "$prefix/share/man/man1/$page.1" 2>&1)
  [ -z "$warnings" ] || { echo "install-check: the manual page of $page has faults: $warnings"; exit 1; }
  for section in NAME SYNOPSIS DESCRIPTION "EXIT STATUS" ENVIRONMENT; do
    grep -q "^\.SH $section" "$prefix/share/man/man1/$page.1" || { echo "install-check: $page.1 has no $section"; exit 1; }
  done
done
for file in \
  share/bash-completion/completions/fileindexctl share/doc/fileindex/LICENSE include/qira_sim/appliance.h; do
  [ -f "$prefix/$file" ] || { echo "install-check: $file is not installed"; exit 1; }
done
grep -q "$prefix" "$prefix"/lib*/cmake/fileindex/*.cmake &&
  { echo "install-check: the CMake package records the install prefix"; exit 1; }
echo "install-check: passed"
