#!/usr/bin/env python3
"""What the optimiser gains over the C compiler alone, measured (run through scripts/code-size.sh).

For each program (the examples, generated programs, benchmark shapes) the tool emits C before the
pipeline (--passes= --emit=c) and after it (--emit=c); each compiler compiles both at each level, and
the script records the text size and instruction count of the object, the compiler's CPU time, and
the steps per second of ssaopt_step() under a driver that feeds seeded inputs. It prints a line per
program and a summary, and writes everything as JSON.
"""

import argparse
import datetime
import json
import math
import os
import platform
import re
import shlex
import shutil
import statistics
import subprocess
import sys
import tempfile
import time
from concurrent.futures import ThreadPoolExecutor

HERE = os.path.dirname(os.path.abspath(__file__))
ROOT = os.path.dirname(HERE)

# The driver around an emitted unit: each input hook draws from a stream of its own (seeded by the
# hook's name, so that the original and the optimised program read the same values) values that its
# variable holds, as the interpreter's seeded streams do; the trace hooks do nothing; and main runs
# ssaopt_step() in growing batches until the CPU time given has passed or "#main" has ended or
# faulted. It prints the steps run, the CPU seconds they took and how it ended.
DRIVER = r"""#include <stdint.h>
#include <stdio.h>
#include <stdlib.h>
#include <time.h>

int ssaopt_step(void);

static int ssa_faulted;

struct ssa_domain {
  uint64_t state;
  int grid;  /* values low + k * lsb + offset for whole k, else any number in [low, high] */
  double low, high, lsb, offset;
};

/* splitmix64. Of every four values one is a border of the domain or next to 0, one is small, and two
   spread over the whole domain. */
static double ssa_next(struct ssa_domain *d) {
  uint64_t z = (d->state += 0x9E3779B97F4A7C15u);
  double low = d->low, high = d->high, x;
  z = (z ^ (z >> 30)) * 0xBF58476D1CE4E5B9u;
  z = (z ^ (z >> 27)) * 0x94D049BB133111EBu;
  z ^= z >> 31;
  if ((z & 3u) == 0) {
    x = (z >> 2) & 1u ? low : high;
  } else {
    if ((z & 3u) == 1) {
      low = low > -8.0 ? low : -8.0;
      high = high < 8.0 ? high : 8.0;
      if (low > high) low = d->low, high = d->high;
    }
    x = d->grid ? low + (double)((z >> 2) % (uint64_t)(high - low + 1.0))
                : low + (double)(z >> 11) * 0x1p-53 * (high - low);
  }
  return d->grid ? x * d->lsb + d->offset : x;
}

void ssa_extern_begin(const char *function) { (void)function; }
void ssa_extern_end(void) {}
void ssa_output_begin(void) {}
void ssa_output_end(void) {}
void ssa_value(const char *variable, double value) { (void)variable; (void)value; }
void ssa_array_begin(const char *variable) { (void)variable; }
void ssa_element(double value) { (void)value; }
void ssa_array_end(void) {}
void ssa_fault(const char *message) { (void)message; ssa_faulted = 1; }

int main(int argc, char **argv) {
  double seconds = argc > 1 ? atof(argv[1]) : 0.2, elapsed = 0.0;
  unsigned long steps = 0, batch = 1, i;
  const char *ending = "running";
  clock_t start = clock();
  while (elapsed < seconds) {
    for (i = 0; i < batch; ++i) {
      if (!ssaopt_step()) { ending = "ended"; break; }
      if (ssa_faulted) { ending = "faulted"; break; }
      ++steps;
    }
    elapsed = (double)(clock() - start) / CLOCKS_PER_SEC;
    if (i < batch) break;
    if (batch < 65536) batch *= 2;
  }
  printf("%lu %.9f %s\n", steps, elapsed, ending);
  return 0;
}
"""

TYPES = {"bool": (0, 1), "int8": (-128, 127), "uint8": (0, 255), "int16": (-32768, 32767),
         "uint16": (0, 65535), "int32": (-2**31, 2**31 - 1), "uint32": (0, 2**32 - 1)}
DECLARATION = re.compile(r"^var\s+(\w+)\s+(\w+)(\[\d+\])?([^=;]*)")
SCALE = re.compile(r"scale\(\s*([^,)]+)\s*(?:,\s*([^)]+))?\)")
SATURATE = re.compile(r"saturate\(\s*([^.]*?)\s*\.\.\s*([^)]*?)\s*\)")
FLOAT_MAGNITUDE = 1e6


def input_domains(program):
    """The values each volatile variable holds, by name, as (grid, low, high, lsb, offset): where the
    interpreter draws its inputs from, so that the compiled program is fed what it expects."""
    domains = {}
    for line in program.splitlines():
        match = DECLARATION.match(line.strip())
        if not match or "volatile" not in match.group(4):
            continue
        kind, name, attributes = match.group(1), match.group(2), match.group(4)
        scale, saturate = SCALE.search(attributes), SATURATE.search(attributes)
        lower = float(saturate.group(1)) if saturate and saturate.group(1) else None
        upper = float(saturate.group(2)) if saturate and saturate.group(2) else None
        if kind not in TYPES:
            low = lower if lower is not None else -FLOAT_MAGNITUDE
            high = upper if upper is not None else FLOAT_MAGNITUDE
            domains[name] = (0, low, max(low, high), 1.0, 0.0)
            continue
        low, high = TYPES[kind]
        lsb, offset = (float(scale.group(1)), float(scale.group(2) or 0)) if scale else (1.0, 0.0)
        if scale or (lower is not None and upper is not None and low <= lower and upper <= high):
            if lower is not None:
                low = max(low, math.ceil((lower - offset) / lsb))
            if upper is not None:
                high = min(high, math.floor((upper - offset) / lsb))
        domains[name] = (1, low, max(low, high), lsb, offset)
    return domains


HOOK = re.compile(r"^double (ssa_input_\w+)\(void\);$", re.M)
INSTRUCTION = re.compile(r"^\s+[0-9a-f]+:\t", re.M)
PIPELINE_TIME = re.compile(r"^time total\s+([0-9.]+) ms$", re.M)


SKIPPED = 77  # what ctest takes for a skipped test


class Failure(Exception):
    pass


def run(command, cwd, timeout, stdin=None):
    """Runs `command`; returns its standard output and the CPU seconds it and its children took."""
    with tempfile.TemporaryFile() as out, tempfile.TemporaryFile() as err:
        process = subprocess.Popen(command, cwd=cwd, stdin=stdin or subprocess.DEVNULL, stdout=out,
                                   stderr=err)
        deadline = time.monotonic() + timeout
        while True:
            pid, status, usage = os.wait4(process.pid, os.WNOHANG)
            if pid:
                break
            if time.monotonic() > deadline:
                process.kill()
                os.wait4(process.pid, 0)
                raise Failure(f"timed out after {timeout} s: {shlex.join(command)}")
            time.sleep(0.002)
        process.returncode = os.waitstatus_to_exitcode(status)
        out.seek(0)
        err.seek(0)
        text, errors = out.read().decode(errors="replace"), err.read().decode(errors="replace")
    if process.returncode != 0:
        raise Failure(f"{shlex.join(command)} failed ({process.returncode}):\n{errors[-2000:]}")
    return text, errors, usage.ru_utime + usage.ru_stime


def text_size(objfile, cwd):
    """The bytes of the object's code: every section whose name starts with .text."""
    listing, _, _ = run(["size", "-A", objfile], cwd, 60)
    total = 0
    for line in listing.splitlines():
        fields = line.split()
        if len(fields) >= 2 and fields[0].startswith(".text") and fields[1].isdigit():
            total += int(fields[1])
    return total


def instruction_count(objfile, cwd):
    listing, _, _ = run(["objdump", "-d", "--no-show-raw-insn", objfile], cwd, 600)
    return len(INSTRUCTION.findall(listing))


class Measurement:
    def __init__(self, options):
        self.options = options
        self.compilers = {name: shlex.split(name) for name in options.compilers}

    # ---- Programs -------------------------------------------------------------------------------

    def programs(self):
        """(name, kind, statements or None, how to write its text)"""
        found = []
        if self.options.examples:
            for path in sorted(os.listdir(os.path.join(ROOT, "examples"))):
                if path.endswith(".ssa"):
                    found.append((path[:-4], "example", None, ("file", os.path.join(ROOT, "examples", path))))
        for seed in range(self.options.first_seed, self.options.first_seed + self.options.seeds):
            command = [self.options.tool, "generate", "--seed", str(seed)]
            if self.options.size:
                command += ["--size", str(self.options.size)]
            found.append((f"seed {seed}", "generated", None, ("command", command)))
        for statements in self.options.shapes:
            for shape in ("large", "small"):
                command = [self.options.make_program, str(statements), shape]
                found.append((f"{shape} {statements}", "shape", statements, ("command", command)))
        return found

    def write_program(self, source, path, cwd):
        how, what = source
        if how == "file":
            shutil.copyfile(what, path)
        else:
            text, _, _ = run(what, cwd, 600)
            with open(path, "w") as f:
                f.write(text)

    # ---- One program ----------------------------------------------------------------------------

    def measure(self, program, directory):
        name, kind, statements, source = program
        os.makedirs(directory)
        self.write_program(source, os.path.join(directory, "program.ssa"), directory)
        tool = self.options.tool
        run([tool, "--passes=", "--emit=c", "program.ssa", "-o", "before.c"], directory, 3600)
        _, report, tool_seconds = run([tool, "--time-passes", "--emit=c", "program.ssa", "-o", "after.c"], directory,
                                      3600)
        pipeline = PIPELINE_TIME.search(report)
        hooks = set()
        for stage in ("before", "after"):
            with open(os.path.join(directory, stage + ".c")) as f:
                hooks.update(HOOK.findall(f.read()))
        with open(os.path.join(directory, "program.ssa")) as f:
            domains = input_domains(f.read())
        with open(os.path.join(directory, "driver.c"), "w") as f:
            f.write(DRIVER)
            for i, hook in enumerate(sorted(hooks)):
                grid, low, high, lsb, offset = domains.get(hook[len("ssa_input_"):], (1, 0, 1, 1.0, 0.0))
                f.write(f"static struct ssa_domain {hook}_domain = {{{i + 1}u * 0x2545F4914F6CDD1Du, {grid}, "
                        f"{float(low)!r}, {float(high)!r}, {lsb!r}, {offset!r}}};\n")
                f.write(f"double {hook}(void) {{ return ssa_next(&{hook}_domain); }}\n")
        # The pipeline's own time is wall-clock time; the tool's CPU time (reading, the pipeline and
        # writing C) bounds the pipeline's CPU time from above on a machine shared with other work.
        record = {"name": name, "kind": kind, "statements": statements,
                  "pipeline_ms": float(pipeline.group(1)) if pipeline else None,
                  "tool_cpu_s": round(tool_seconds, 4), "results": {}}
        for compiler, command in self.compilers.items():
            tag = re.sub(r"\W+", "_", compiler)
            run(command + ["-std=c99", "-O2", "-c", "driver.c", "-o", f"driver_{tag}.o"], directory, 600)
            for level in self.options.levels:
                key = f"{compiler} {level}"
                record["results"][key] = {
                    stage: self.compile_and_run(command, level, stage, f"{tag}{level}", f"driver_{tag}.o", directory)
                    for stage in ("before", "after")}
        if not self.options.keep:
            shutil.rmtree(directory)
        return record

    def compile_and_run(self, command, level, stage, tag, driver, directory):
        objfile, binary = f"{stage}_{tag}.o", f"{stage}_{tag}"
        _, _, seconds = run(command + ["-std=c99", level, "-c", stage + ".c", "-o", objfile], directory,
                            self.options.compile_timeout)
        result = {"text": text_size(objfile, directory), "instructions": instruction_count(objfile, directory),
                  "compile_s": round(seconds, 4)}
        if self.options.seconds > 0:
            run(command + [objfile, driver, "-o", binary], directory, 600)
            out, _, _ = run([os.path.join(directory, binary), str(self.options.seconds)], directory,
                            60 + 10 * self.options.seconds)
            steps, elapsed, ending = out.split()
            result.update(steps=int(steps), run_s=float(elapsed), ending=ending,
                          steps_per_s=round(int(steps) / float(elapsed), 1) if float(elapsed) > 0 else None)
        return result


# ---- Summary --------------------------------------------------------------------------------------

def ratio(record, key, field):
    result = record["results"].get(key)
    if not result or not result["before"].get(field) or result["after"].get(field) is None:
        return None
    return result["after"][field] / result["before"][field]


def quantile(values, q):
    ordered = sorted(values)
    return ordered[min(len(ordered) - 1, int(q * (len(ordered) - 1) + 0.5))]


def summarise(records, keys):
    summary = []
    for kind in ("example", "generated", "shape"):
        chosen = [r for r in records if r["kind"] == kind]
        for key in keys:
            ratios = [x for x in (ratio(r, key, "text") for r in chosen) if x is not None]
            if not ratios:
                continue
            speed = [x for x in (ratio(r, key, "steps_per_s") for r in chosen
                                 if r["results"][key]["before"].get("ending") == "running"
                                 and r["results"][key]["after"].get("ending") == "running") if x is not None]
            summary.append({
                "kind": kind, "compiler": key, "programs": len(ratios),
                "text_median": round(statistics.median(ratios), 4),
                "text_p10": round(quantile(ratios, 0.1), 4), "text_p90": round(quantile(ratios, 0.9), 4),
                "text_min": round(min(ratios), 4), "text_max": round(max(ratios), 4),
                "smaller": sum(x < 1 for x in ratios), "equal": sum(x == 1 for x in ratios),
                "larger": sum(x > 1 for x in ratios), "larger_than_1_02": sum(x > 1.02 for x in ratios),
                "instructions_median": round(statistics.median(
                    [x for x in (ratio(r, key, "instructions") for r in chosen) if x is not None]), 4),
                "compile_time_median": round(statistics.median(
                    [x for x in (ratio(r, key, "compile_s") for r in chosen) if x is not None]), 4),
                "steps_per_s_median": round(statistics.median(speed), 4) if speed else None,
                "steps_per_s_min": round(min(speed), 4) if speed else None,
            })
    return summary


def goals(records, keys):
    """The goals of the measurement, each with the figure reached."""
    lines = []
    for key in keys:
        if not key.endswith(" -O2"):
            continue
        ratios = [x for x in (ratio(r, key, "text") for r in records if r["kind"] == "generated") if x is not None]
        if ratios:
            median, worst = statistics.median(ratios), max(ratios)
            lines.append((f"{key}: generated programs, median text after/before <= 0.85 and none > 1.02",
                          median <= 0.85 and worst <= 1.02, f"median {median:.3f}, largest {worst:.3f}"))
        for r in records:
            if r["kind"] == "shape" and r["statements"] == 100000 and key.split()[0] in ("gcc", "cc"):
                x = ratio(r, key, "text")
                lines.append((f"{key}: {r['name']}, text after/before <= 0.70", x is not None and x <= 0.70,
                              f"{x:.3f}" if x is not None else "n/a"))
            if r["kind"] == "shape" and r["statements"] == 10000 and key.split()[0] in ("gcc", "cc"):
                share = r["tool_cpu_s"] / r["results"][key]["before"]["compile_s"]
                lines.append((f"{key}: {r['name']}, pipeline time (at most the tool's CPU time) < 2 % of "
                              "compiling the original", share < 0.02, f"{100 * share:.2f} %"))
            if r["kind"] == "shape":
                x = ratio(r, key, "steps_per_s")
                if x is not None:
                    lines.append((f"{key}: {r['name']}, steps per second after >= before", x >= 1, f"{x:.3f}"))
    return lines


def row(record, key):
    result = record["results"][key]
    before, after = result["before"], result["after"]
    speed = ratio(record, key, "steps_per_s")
    return (f"{record['name']:<14} {key:<16} {before['text']:>9} {after['text']:>9} "
            f"{after['text'] / max(before['text'], 1):>6.3f} {before['instructions']:>8} {after['instructions']:>8} "
            f"{before['compile_s']:>8.2f} {after['compile_s']:>8.2f} "
            + (f"{speed:>7.3f}" if speed is not None else "    n/a"))


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--tool", default=os.path.join(ROOT, "build", "tools", "ssaopt"))
    parser.add_argument("--make-program", default=os.path.join(ROOT, "build", "bench", "ssaopt_make_program"))
    parser.add_argument("--compilers", nargs="+", default=["gcc", "clang"],
                        help="C compilers, each with any flags it should take (\"clang -m32\")")
    parser.add_argument("--levels", nargs="+", default=["O2", "Os"], help="optimisation levels, without the dash")
    parser.add_argument("--seeds", type=int, default=20, help="generated programs")
    parser.add_argument("--first-seed", type=int, default=1)
    parser.add_argument("--size", type=int, default=None, help="size of the generated programs")
    parser.add_argument("--shapes", type=int, nargs="*", default=[1000, 10000],
                        help="statements of the benchmark shapes (large and small each)")
    parser.add_argument("--no-examples", dest="examples", action="store_false")
    parser.add_argument("--seconds", type=float, default=0.2,
                        help="CPU seconds of ssaopt_step() per binary (0: do not run)")
    parser.add_argument("--jobs", type=int, default=1)
    parser.add_argument("--compile-timeout", type=int, default=7200)
    parser.add_argument("--out", default="code-size.json")
    parser.add_argument("--keep", action="store_true", help="keep the work directory")
    options = parser.parse_args()
    options.levels = ["-" + level.lstrip("-") for level in options.levels]
    options.compilers = [c for c in options.compilers if shlex.split(c) and shutil.which(shlex.split(c)[0])]
    if not options.compilers:
        print("code-size: none of the C compilers is installed; nothing measured")
        sys.exit(SKIPPED)
    missing = [tool for tool in ("size", "objdump") if not shutil.which(tool)]
    if missing:
        print(f"code-size: {' and '.join(missing)} (binutils) not installed; nothing measured")
        sys.exit(SKIPPED)
    if options.shapes and not os.access(options.make_program, os.X_OK):
        sys.exit(f"code-size: no {options.make_program} (configure with benchmarks, or --shapes without sizes)")

    measurement = Measurement(options)
    programs = measurement.programs()
    work = tempfile.mkdtemp(prefix="ssaopt-code-size-")
    keys = [f"{c} {l}" for c in options.compilers for l in options.levels]
    print(f"{'program':<14} {'compiler':<16} {'text':>9} {'opt':>9} {'ratio':>6} {'insns':>8} {'opt':>8} "
          f"{'cc s':>8} {'opt s':>8} {'speed':>7}", flush=True)
    records = []
    try:
        with ThreadPoolExecutor(max_workers=max(1, options.jobs)) as pool:
            futures = [pool.submit(measurement.measure, p, os.path.join(work, str(i))) for i, p in enumerate(programs)]
            for future in futures:
                record = future.result()
                records.append(record)
                for key in keys:
                    print(row(record, key), flush=True)
    except Failure as failure:
        sys.exit(f"code-size: {failure}\n(work directory {work})")
    if options.keep:
        print(f"kept the work directory {work}")
    else:
        shutil.rmtree(work)

    summary = summarise(records, keys)
    reached = goals(records, keys)
    print("\nsummary: text after / before")
    for s in summary:
        speed = f", steps/s median {s['steps_per_s_median']}, least {s['steps_per_s_min']}" \
            if s["steps_per_s_median"] is not None else ""
        print(f"  {s['kind']:<9} {s['compiler']:<16} {s['programs']:>4} programs: median {s['text_median']:.3f} "
              f"(10 % {s['text_p10']:.3f}, 90 % {s['text_p90']:.3f}, largest {s['text_max']:.3f}); "
              f"{s['smaller']} smaller, {s['equal']} equal, {s['larger']} larger, {s['larger_than_1_02']} > 1.02; "
              f"instructions {s['instructions_median']:.3f}, compile time {s['compile_time_median']:.3f}{speed}")
    if reached:
        print("\ngoals:")
        for text, ok, figure in reached:
            print(f"  {'reached' if ok else 'MISSED '} {text}: {figure}")
    versions = {}
    for name, command in measurement.compilers.items():
        out, _, _ = run(command + ["--version"], ROOT, 60)
        versions[name] = out.splitlines()[0] if out else ""
    result = {"date": datetime.date.today().isoformat(), "machine": platform.node(), "cpu": cpu_name(),
              "compilers": versions, "levels": options.levels, "programs": records, "summary": summary,
              "goals": [{"goal": t, "reached": ok, "figure": f} for t, ok, f in reached]}
    with open(options.out, "w") as f:
        json.dump(result, f, indent=1)
    print(f"\nwrote {options.out}")


def cpu_name():
    try:
        with open("/proc/cpuinfo") as f:
            for line in f:
                if line.startswith("model name"):
                    return line.split(":", 1)[1].strip()
    except OSError:
        pass
    return platform.processor()


if __name__ == "__main__":
    main()
