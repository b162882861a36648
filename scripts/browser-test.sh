#!/usr/bin/env bash
# The console in a real browser (Debian's chromium, chromium-driver and python3-selenium) on a
# seeded simulated appliance; the screenshot lands in build-browser/browser-test/.
set -euo pipefail
cd "$(dirname "$0")/.."
scripts/install-deps.sh chromium chromium-driver python3-selenium
cmake -S . -B build-browser -DCMAKE_BUILD_TYPE=Release -DFILEINDEX_BUILD_TESTS=OFF >/dev/null
cmake --build build-browser -j "$(nproc)" --target fileindex-web qira-sim fileindexd-ref fileindexctl qiranotifyd-sim >/dev/null
tools="$PWD/build-browser/tools"
output="$PWD/build-browser/browser-test"
mkdir -p "$output"
export QIRA_ROOT
QIRA_ROOT=$(mktemp -d /tmp/fileindex-browser-XXXXXX)
pids=()
cleanup() {
  for pid in "${pids[@]}"; do kill "$pid" 2>/dev/null || true; done
  wait 2>/dev/null || true
  rm -rf "$QIRA_ROOT"
}
trap cleanup EXIT
"$tools/qira-sim" init
music="$QIRA_ROOT/volume1/music"
mkdir -p "$music/#recycle/old" "$music/added" "$music/other" "$QIRA_ROOT/volume1/photo/2024"
"$tools/qira-sim" share add music "$music"
"$tools/qira-sim" share add photo "$QIRA_ROOT/volume1/photo"
conf="{"
for i in $(seq -w 0 14); do
  mkdir -p "$music/f$i"
  conf+="\"/music/f$i\": {\"path\": \"/music/f$i\", \"name\": \"Folder $i\", \"document\": true, \"audio\": false, \"video\": false, \"photo\": false},"
done
conf+="\"/photo/2024\": {\"path\": \"/photo/2024\", \"name\": \"Photos\", \"document\": false, \"audio\": false, \"video\": false, \"photo\": true}"
echo "${conf}}" >"$QIRA_ROOT/usr/qira/etc/fileindex/folder.conf"
"$PWD/build-browser/platform/qiranotifyd-sim" >"$output/notifier.log" 2>&1 & pids+=($!)
# Five records a pass, so that a drain lasts long enough to watch progress move.
"$tools/fileindexd-ref" --pace 5 >"$output/daemon.log" 2>&1 & pids+=($!)
export FILEINDEXD_PID=$!
"$tools/fileindex-web" --listen 127.0.0.1:0 >"$output/web.log" 2>&1 & pids+=($!)
for _ in $(seq 100); do grep -q "listening on" "$output/web.log" && break; sleep 0.05; done
url=$(grep -o 'http://127.0.0.1:[0-9]*/' "$output/web.log")
/usr/bin/python3 tests/browser/console_test.py "$url" "$QIRA_ROOT/usr/qira/etc/fileindex/web.token" "$output" "$tools"
echo "browser-test: screenshots in $output (console.png, console-400.png, banner-<state>-<width>.png)"
