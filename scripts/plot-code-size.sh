#!/usr/bin/env bash
# Plots what scripts/code-size.sh measured: the text size after the pipeline over the text size the
# compiler reaches alone, for the generated programs (sorted, one line per compiler and level) and for
# the benchmark shapes against their size, and the steps per second after over before for the shapes.
#
#   scripts/code-size.sh --seeds 200 --shapes 1000 10000 100000 --out code-size.json
#   scripts/plot-code-size.sh code-size.json [docs/code-size.png]
#
# Installs Debian's gnuplot-nox when gnuplot is missing.
set -euo pipefail

json=${1:?usage: plot-code-size.sh CODE_SIZE_JSON [PNG]}
png=${2:-"$(dirname "$0")/../docs/code-size.png"}

bash "$(dirname "$0")/need-gnuplot.sh"

data=$(mktemp -d)
trap 'rm -rf "$data"' EXIT

# generated.dat: a row per rank from 0 to 1, a column per compiler and level; shapes_text.dat and
# shapes_speed.dat: a row per size, a column per shape, compiler and level. The first row names the
# columns.
python3 - "$json" "$data" <<'PY'
import json, sys
result, out = json.load(open(sys.argv[1])), sys.argv[2]
keys = [f"{c} {l}" for c in result["compilers"] for l in result["levels"]]

def ratio(record, key, field):
    stages = record["results"].get(key)
    if not stages or not stages["before"].get(field) or stages["after"].get(field) is None:
        return None
    return stages["after"][field] / stages["before"][field]

def write(path, names, rows):
    with open(path, "w") as f:
        f.write(" ".join(f'"{name}"' for name in names) + "\n")
        for row in rows:
            f.write(" ".join("NaN" if x is None else str(x) for x in row) + "\n")

generated = [r for r in result["programs"] if r["kind"] == "generated"]
columns = [sorted(x for x in (ratio(r, key, "text") for r in generated) if x is not None) for key in keys]
count = max([len(c) for c in columns] + [0])
write(f"{out}/generated.dat", ["rank"] + keys,
      [[i / max(count - 1, 1)] + [c[i] if i < len(c) else None for c in columns] for i in range(count)])
shapes = [r for r in result["programs"] if r["kind"] == "shape"]
series = [(shape, key) for shape in ("large", "small") for key in keys]
for field, name in (("text", "shapes_text"), ("steps_per_s", "shapes_speed")):
    rows = []
    for size in sorted({r["statements"] for r in shapes}):
        row = [size]
        for shape, key in series:
            found = [r for r in shapes if r["statements"] == size and r["name"].startswith(shape)]
            row.append(ratio(found[0], key, field) if found else None)
        rows.append(row)
    write(f"{out}/{name}.dat", ["statements"] + [f"{shape}, {key}" for shape, key in series], rows)
open(f"{out}/columns", "w").write(f"{len(keys)} {len(series)}\n")
open(f"{out}/title", "w").write(f"{result.get('cpu', '')}; " + "; ".join(result["compilers"].values()))
PY

read -r keys series < "$data/columns"
gnuplot <<GP
set terminal pngcairo size 1500,520 font ",10" noenhanced
set output "$png"
set multiplot layout 1,3 title "$(cat "$data/title")"
set grid
set key bottom right
colours = "#1f77b4 #ff7f0e #2ca02c #d62728 #9467bd #8c564b #e377c2 #7f7f7f"
do for [i=1:words(colours)] { set linetype i lc rgb word(colours, i) pt i lw 2 }
set yrange [0:1.3]

set title "generated programs: text size after / before, sorted"
set xlabel "share of the programs"
set ylabel "text after / text the compiler reaches alone"
plot for [i=2:$keys+1] "$data/generated.dat" using 1:i with lines lt i-1 title columnheader(i), \
     1 with lines lc rgb "#000000" dt 2 title "as the compiler alone", \
     0.85 with lines lc rgb "#888888" dt 3 title "goal for the median"

set logscale x
set xlabel "statements"
set title "benchmark shapes: text size after / before"
plot for [i=2:$series+1] "$data/shapes_text.dat" using 1:i with linespoints lt i-1 title columnheader(i), \
     0.70 with lines lc rgb "#888888" dt 3 title "goal at 10^5 (gcc -O2)"

set title "benchmark shapes: steps per second after / before"
set ylabel "steps per second after / before"
set yrange [0:*]
plot for [i=2:$series+1] "$data/shapes_speed.dat" using 1:i with linespoints lt i-1 title columnheader(i), \
     1 with lines lc rgb "#000000" dt 2 notitle
unset multiplot
GP
echo "wrote $png"
