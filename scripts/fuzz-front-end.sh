#!/usr/bin/env bash
# Builds the front end's libFuzzer target with clang (in build-fuzz) and runs it for SECONDS seconds
# (default 60) on a corpus seeded with the examples, the programs of the file tests
# (tests/filetests), inputs kept from earlier runs (tests/fuzzing/corpus), and generated programs. Findings are written to
# build-fuzz/findings; the script fails when there is one.
set -euo pipefail
cd "$(dirname "$0")/.."
seconds="${1:-60}"

CC=clang CXX=clang++ cmake -S . -B build-fuzz -G Ninja -DCMAKE_BUILD_TYPE=RelWithDebInfo \
  -DSSAOPT_BUILD_FUZZERS=ON -DSSAOPT_BUILD_TESTS=OFF -DSSAOPT_BUILD_EXAMPLES=OFF \
  -DSSAOPT_BUILD_BENCHMARKS=OFF >/dev/null
cmake --build build-fuzz --target ssaopt_front_end_fuzzer ssaopt_tool

corpus=build-fuzz/corpus
findings=build-fuzz/findings
mkdir -p "$corpus" "$findings"
cp examples/*.ssa tests/fuzzing/corpus/*.ssa "$corpus/"
for test in tests/filetests/*/*.ssa; do cp "$test" "$corpus/filetest-$(basename "$(dirname "$test")")-$(basename "$test")"; done
for seed in $(seq 1 20); do
  build-fuzz/tools/ssaopt generate --seed "$seed" > "$corpus/generated-$seed.ssa"
done

ASAN_OPTIONS=detect_leaks=1 build-fuzz/tests/fuzzing/ssaopt_front_end_fuzzer "$corpus" \
  -max_total_time="$seconds" -timeout=10 -rss_limit_mb=2048 -max_len=8192 \
  -artifact_prefix="$findings/" -print_final_stats=1
