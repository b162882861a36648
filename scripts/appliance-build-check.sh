#!/usr/bin/env bash
# Builds the library in the appliance mode against stub platform libraries made here, so that
# the option cannot rot: it must configure, compile, link with no undefined symbol, export only
# its interface and depend on no simulation.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh
work=$(mktemp -d /tmp/fileindex-appliance-XXXXXX)
trap 'rm -rf "$work"' EXIT
mkdir -p "$work/sdk/lib"
g++ -std=c++17 -shared -fPIC -Iplatform/include $(pkg-config --cflags jsoncpp) scripts/appliance-stubs/stubs.cc -o "$work/sdk/lib/libqiracore.so" -ljsoncpp
cp "$work/sdk/lib/libqiracore.so" "$work/sdk/lib/libqirashare.so"
cp "$work/sdk/lib/libqiracore.so" "$work/sdk/lib/libqiranotifyd.so"
cmake -S . -B "$work/build" -DCMAKE_BUILD_TYPE=Release -DFILEINDEX_APPLIANCE_PLATFORM=ON \
  -DCMAKE_PREFIX_PATH="$work/sdk" >/dev/null
cmake --build "$work/build" -j "$(nproc)" --target fileindex fileindexctl >/dev/null
library="$work/build/libfileindex.so.1"
if readelf -d "$library" | grep -q qira_platform_sim; then
  echo "appliance-build-check: the appliance build depends on the simulation"; exit 1
fi
scripts/check-exports.sh "$library"
echo "appliance-build-check: passed"
