#!/usr/bin/env bash
# What the optimiser gains over the C compiler alone: for the examples, generated programs and the
# benchmark shapes, the C emitted before the pipeline and after it, compiled by each compiler at each
# level; text size, instructions, compile time and steps per second, per program and in summary, as a
# table and as JSON (scripts/code-size.sh --help lists the options):
#
#   cmake -S . -B build -G Ninja -DCMAKE_BUILD_TYPE=Release && cmake --build build
#   scripts/code-size.sh --seeds 200 --shapes 1000 10000 100000 --out code-size.json
#   scripts/plot-code-size.sh code-size.json docs/code-size.png
#
# Compilers that are not installed are left out; with none, it exits with 77 (a skipped test to ctest).
set -euo pipefail
exec python3 "$(dirname "$0")/code_size.py" "$@"
