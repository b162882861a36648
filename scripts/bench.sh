#!/usr/bin/env bash
# Builds the benchmarks (Release) and runs them; arguments go to Google Benchmark. With
# FILEINDEX_BENCH_SCALE below 1 the data shrink (CI runs each benchmark once that way).
set -euo pipefail
cd "$(dirname "$0")/.."
# recollindex with the helpers its default filters call for PDFs, office documents, songs and photos.
scripts/install-deps.sh libbenchmark-dev recollcmd poppler-utils python3-lxml python3-mutagen libimage-exiftool-perl
cmake -S . -B build-bench -DCMAKE_BUILD_TYPE=Release -DFILEINDEX_BUILD_BENCH=ON -DFILEINDEX_BUILD_TESTS=OFF >/dev/null
cmake --build build-bench -j "$(nproc)" >/dev/null
build-bench/bench/fileindex_bench "$@"
build-bench/bench/fileindex_live_bench "$@"
build-bench/bench/fileindex_web_bench "$@"
