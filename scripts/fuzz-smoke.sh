#!/usr/bin/env bash
# Builds the libFuzzer targets with clang and runs each for a short while (seconds per target as
# the first argument, default 20) on a scratch copy of its seed corpus.
set -euo pipefail
cd "$(dirname "$0")/.."
seconds=${1:-20}
scripts/install-deps.sh clang
CC=clang CXX=clang++ cmake -S . -B build-fuzz -DCMAKE_BUILD_TYPE=RelWithDebInfo -DFILEINDEX_BUILD_FUZZ=ON \
  -DFILEINDEX_BUILD_TESTS=OFF >/dev/null
cmake --build build-fuzz -j "$(nproc)" >/dev/null
work=$(mktemp -d /tmp/fileindex-fuzz-run-XXXXXX)
trap 'rm -rf "$work"' EXIT
export TMPDIR="$work"  # the targets' scratch roots go here, removed with it
for target in folder_conf status_conf queue_scan requests queue_line folder_conf_reading queue_incremental record_applier extractor_channel; do
  mkdir -p "$work/$target"
  cp fuzz/corpus/"$target"/* "$work/$target/"
  echo "fuzz_$target: ${seconds}s"
  build-fuzz/fuzz/fuzz_"$target" "$work/$target" -max_total_time="$seconds" -max_len=4096 \
    -artifact_prefix="$work/$target-" 2>&1 | grep -E "^Done|ERROR|SUMMARY" || true
  if compgen -G "$work/$target-crash-*" >/dev/null || compgen -G "$work/$target-leak-*" >/dev/null ||
    compgen -G "$work/$target-timeout-*" >/dev/null || compgen -G "$work/$target-oom-*" >/dev/null; then
    echo "fuzz_$target found a failure:"
    for artifact in "$work/$target"-*-*; do echo "== $artifact"; od -c "$artifact" | head -20; done
    exit 1
  fi
done
