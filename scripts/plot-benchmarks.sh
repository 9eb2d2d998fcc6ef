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

bash "$(dirname "$0")/need-gnuplot.sh"

data=$(mktemp -d)
trap 'rm -rf "$data"' EXIT

# One file per shape: a row per size with "build", then the pipeline's steps, then "pipeline"; the
# shapes in the order the benchmark ran them, the title, and one y range for all panels, from the
# least to the greatest figure with a little room, so that no panel shows a decade without data.
python3 - "$json" "$data" <<'PY'
import json, sys
document, out = json.load(open(sys.argv[1])), sys.argv[2]
rows, steps = {}, []
for run in document["benchmarks"]:
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
# The steps in the order they run where the benchmark names it.
order = document["context"].get("pipeline_steps", "").split()
steps.sort(key=lambda step: order.index(step) if step in order else len(order))
columns = ["build"] + steps + ["pipeline"]
figures = [v for sizes in rows.values() for row in sizes.values() for v in row.values() if v > 0]
context = document["context"]
title = "ns per statement (thread CPU time), %s build, %s, %d cores at %.0f MHz, load %.1f, %s" % (
    context.get("ssaopt_build_type", "unknown"), context.get("processor", "unknown processor"),
    context["num_cpus"], context["mhz_per_cpu"], context.get("load_avg", [0])[0], context["date"][:10])
open(f"{out}/columns", "w").write(" ".join(columns))
open(f"{out}/shapes", "w").write(" ".join(rows))
open(f"{out}/title", "w").write(title)
open(f"{out}/yrange", "w").write("%g:%g" % (min(figures) / 1.3, max(figures) * 1.3))
panels = {
    "large": "large: #main and four stages of about 200,000 statements at 10^6",
    "small": "small: thousands of procedures of about 24 statements",
    "shared": "shared: procedures reading and writing many shared variables",
    "chart": "chart: state machines, one arm per 100 statements",
}
for shape, sizes in rows.items():
    open(f"{out}/{shape}.title", "w").write(panels.get(shape, shape))
    with open(f"{out}/{shape}.dat", "w") as f:
        for size in sorted(sizes):
            f.write(" ".join([str(size)] + [str(sizes[size].get(c, "NaN")) for c in columns]) + "\n")
PY

columns=$(cat "$data/columns")
gnuplot <<GP
set terminal pngcairo size 1600,1000 font ",10" noenhanced
set output "$png"
set multiplot layout 2,2 title "$(cat "$data/title")"
set logscale xy
set format x "10^%T"
set autoscale xfix
set yrange [$(cat "$data/yrange")]
set xlabel "statements"
set ylabel "ns per statement"
set grid
set key outside right
columns = "$columns"
# Distinguishable colours for the steps (the default palette repeats after eight); building the graph
# is dashed grey and the whole pipeline black and thickest, the line the goals are about.
colours = "#1f77b4 #ff7f0e #2ca02c #d62728 #9467bd #8c564b #e377c2 #17becf #bcbd22 #aec7e8 #ffbb78 #98df8a"
do for [i=1:words(colours)] { set linetype i lc rgb word(colours, i) pt i }
set linetype 100 lc rgb "#7f7f7f" dt 2 pt 6
set linetype 101 lc rgb "#000000" pt 7
style(name, i) = name eq "build" ? 100 : name eq "pipeline" ? 101 : i - 1
width(name) = name eq "pipeline" ? 4 : name eq "build" ? 2 : 1.2
do for [shape in "$(cat "$data/shapes")"] {
  set title system(sprintf("cat '$data/%s.title'", shape))
  plot for [i=1:words(columns)] sprintf("$data/%s.dat", shape) using 1:(column(i+1)) \
       with linespoints lt style(word(columns, i), i) lw width(word(columns, i)) title word(columns, i)
}
unset multiplot
GP
echo "wrote $png"
