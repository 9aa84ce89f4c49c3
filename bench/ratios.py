#!/usr/bin/env python3
"""Prints Google Benchmark JSON results as a table of library/baseline pairs.

Benchmarks are named "<case>/<implementation>"; the library's implementation
is "stbplat". The ratio is the library's rate over the baseline's (above 1:
the library is faster). Benchmarks that report the counters "calls" and
"calls_needed" (system calls made, and the number the algorithm needs) are
listed in a second table.
"""
import json
import sys

LIBRARY = "stbplat"


def human_rate(value, unit):
    for scale, prefix in ((1e9, "G"), (1e6, "M"), (1e3, "k"), (1, "")):
        if value >= scale:
            return f"{value / scale:8.2f} {prefix}{unit}"
    return f"{value:8.2f} {unit}"


def rate_of(run):
    if "bytes_per_second" in run:
        return run["bytes_per_second"], "B/s"
    if "items_per_second" in run:
        return run["items_per_second"], "op/s"
    return None, None


def main(path):
    with open(path) as f:
        text = f.read()
    if not text.strip():
        print(f"ratios: no benchmark results in {path}", file=sys.stderr)
        return 1
    report = json.loads(text)
    cases = {}
    order = []
    counts = []
    runs = report["benchmarks"]
    # With repetitions, the median of each benchmark stands for it.
    if any(r.get("aggregate_name") == "median" for r in runs):
        runs = [r for r in runs if r.get("aggregate_name") == "median"]
    else:
        runs = [r for r in runs if r.get("run_type", "iteration") == "iteration"]
    for run in runs:
        if run.get("error_occurred"):
            print(f"ratios: {run['name']}: {run.get('error_message', 'failed')}",
                  file=sys.stderr)
            continue
        name = run.get("run_name", run["name"])
        case, _, impl = name.rpartition("/")
        if "calls" in run and "calls_needed" in run:
            counts.append((case, run["calls"], run["calls_needed"]))
        if case not in cases:
            cases[case] = {}
            order.append(case)
        cases[case][impl] = run

    ctx = report.get("context", {})
    print(f"# {ctx.get('host_name', '?')}, {ctx.get('num_cpus', '?')} CPUs at "
          f"{ctx.get('mhz_per_cpu', '?')} MHz, {ctx.get('library_build_type', '?')} "
          f"benchmark library, {ctx.get('date', '')}")
    header = f"{'case':<24} {'stbplat':>14}   {'baseline':<9} {'rate':>14}   {'ratio':>6}"
    print(header)
    print("-" * len(header))
    for case in order:
        impls = cases[case]
        lib = impls.get(LIBRARY)
        others = [i for i in impls if i != LIBRARY]
        if lib is None or not others:
            continue
        lib_rate, unit = rate_of(lib)
        for other in others:
            base_rate, base_unit = rate_of(impls[other])
            if lib_rate is None or base_rate is None or base_unit != unit or base_rate == 0:
                continue
            print(f"{case:<24} {human_rate(lib_rate, unit):>14}   {other:<9} "
                  f"{human_rate(base_rate, unit):>14}   {lib_rate / base_rate:6.3g}")
    if counts:
        print()
        header = f"{'case':<24} {'calls made':>12} {'calls needed':>13} {'ratio':>6}"
        print(header)
        print("-" * len(header))
        for case, calls, needed in counts:
            ratio = calls / needed if needed else float("nan")
            print(f"{case:<24} {calls:12.0f} {needed:13.0f} {ratio:6.3g}")
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1] if len(sys.argv) > 1 else "build/bench/results.json"))
