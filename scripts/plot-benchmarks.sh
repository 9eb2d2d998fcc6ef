#!/usr/bin/env bash
# Plots the time per statement of building the graph, of each step of the default pipeline and of the
# whole pipeline against program size, one panel per program shape, from the JSON that the benchmark
# writes:
#
#   build/bench/ssaopt_bench --benchmark_out=bench.json --benchmark_out_format=json
#   scripts/plot-benchmarks.sh bench.json [docs/performance.png]
#
# Installs Debian's gnuplot-nox when gnuplot is missing.
set -euo pipefail

json=${1:?usage: plot-benchmarks.sh BENCHMARK_JSON [PNG]}
png=${2:-"$(dirname "$0")/../docs/performance.png"}

if ! command -v gnuplot > /dev/null; then
  sudo_cmd=()
  [ "$(id -u)" -eq 0 ] || sudo_cmd=(sudo)
  "${sudo_cmd[@]}" apt-get update -qq
  DEBIAN_FRONTEND=noninteractive "${sudo_cmd[@]}" apt-get install -y -qq gnuplot-nox
fi

data=$(mktemp -d)
trap 'rm -rf "$data"' EXIT

# One file per shape: a row per size with "build", then the pipeline's steps, then "pipeline".
python3 - "$json" "$data" <<'PY'
import json, sys
runs, out = json.load(open(sys.argv[1]))["benchmarks"], sys.argv[2]
rows, steps = {}, []
for run in runs:
    kind, shape, size = run["name"].split("/")[:3]
    if kind not in ("build", "pipeline"):
        continue
    row = rows.setdefault(shape, {}).setdefault(int(size), {})
    row[kind] = run["ns_per_stmt"]
    for key, value in run.items():
        if key.endswith("_ns_per_stmt"):
            step = key[: -len("_ns_per_stmt")]
            row[step] = value
            if step not in steps:
                steps.append(step)
columns = ["build"] + steps + ["pipeline"]
open(f"{out}/columns", "w").write(" ".join(columns))
for shape, sizes in rows.items():
    with open(f"{out}/{shape}.dat", "w") as f:
        for size in sorted(sizes):
            f.write(" ".join([str(size)] + [str(sizes[size].get(c, "NaN")) for c in columns]) + "\n")
PY

columns=$(cat "$data/columns")
gnuplot <<GP
set terminal pngcairo size 1400,600 font ",10" noenhanced
set output "$png"
set multiplot layout 1,2
set logscale xy
set xlabel "statements"
set ylabel "ns per statement"
set grid
set key outside right
columns = "$columns"
# Twelve distinguishable colours: the default palette repeats after eight.
colours = "#1f77b4 #ff7f0e #2ca02c #d62728 #9467bd #8c564b #e377c2 #7f7f7f #bcbd22 #17becf #000000 #aec7e8"
do for [i=1:words(colours)] { set linetype i lc rgb word(colours, i) pt i }
do for [shape in "large small"] {
  set title sprintf("%s procedures", shape)
  plot for [i=1:words(columns)] sprintf("$data/%s.dat", shape) using 1:(column(i+1)) \
       with linespoints lt i lw (word(columns, i) eq "pipeline" ? 3 : 1) title word(columns, i)
}
unset multiplot
GP
echo "wrote $png"
