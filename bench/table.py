#!/usr/bin/env python3
"""Turns the JSON output of tarn-bench into the tables of bench/README.md.

Usage: table.py RESULTS.json README.md

Every repetition of every benchmark is a separate entry in the JSON (the run
interleaves them at random); this script takes the median and the minimum over
the repetitions, of CPU time (the machine is shared, so wall time mostly
measures the neighbours), and of the helper's own measurement for `load`.
"""
import json
import os
import platform
import re
import statistics
import sys

BEGIN = "<!-- bench-table:begin -->"
END = "<!-- bench-table:end -->"

UNIT_NS = {"ns": 1.0, "us": 1e3, "ms": 1e6, "s": 1e9}

# workload, target ratio against protobuf on the heap, against protobuf on an arena
ROWS = [
    ("build_tree/1", None, None),
    ("build_tree/64", None, None),
    ("build_tree/4096", 0.45, 0.75),
    ("deep_copy/1", None, None),
    ("deep_copy/64", None, None),
    ("deep_copy/4096", 0.40, 0.70),
    ("size/1", None, None),
    ("size/64", None, None),
    ("size/4096", None, None),
    ("record_get_set", 0.40, None),
    ("enum_lookup/by_tag", 0.5, None),
    ("enum_lookup/by_value", 0.5, None),
    ("location_copy", 0.55, 0.80),
]
NODE_ALLOCATION_TARGET = ("deep_copy/4096", 2.5)
LOAD_TARGET_NS = 1e6


def base_name(name):
    name = re.sub(r"/iterations:\d+", "", name)
    name = re.sub(r"/repeats:\d+", "", name)
    return name.replace("/manual_time", "")


def collect(results):
    runs = {}
    for entry in results["benchmarks"]:
        if entry.get("run_type") != "iteration" or entry.get("error_occurred"):
            continue
        name = base_name(entry.get("run_name", entry["name"]))
        manual = "manual_time" in entry["name"]
        scale = UNIT_NS[entry.get("time_unit", "ns")]
        seconds = entry["real_time"] if manual else entry["cpu_time"]
        run = runs.setdefault(name, {"times": [], "allocs": [], "per_node": []})
        run["times"].append(seconds * scale)
        if "allocs_per_op" in entry:
            run["allocs"].append(entry["allocs_per_op"])
        if "allocs_per_node" in entry:
            run["per_node"].append(entry["allocs_per_node"])
    stats = {}
    for name, run in runs.items():
        stats[name] = {
            "median": statistics.median(run["times"]),
            "min": min(run["times"]),
            "n": len(run["times"]),
            "allocs": statistics.median(run["allocs"]) if run["allocs"] else None,
            "per_node": statistics.median(run["per_node"]) if run["per_node"] else None,
        }
    return stats


def fmt_time(ns):
    if ns is None:
        return "—"
    if ns >= 1e6:
        return f"{ns / 1e6:.2f} ms"
    if ns >= 1e3:
        return f"{ns / 1e3:.1f} µs"
    return f"{ns:.1f} ns"


def fmt_allocs(stat):
    if stat is None or stat["allocs"] is None:
        return "—"
    text = f"{stat['allocs']:.4g}"
    if stat["per_node"] is not None:
        text += f" ({stat['per_node']:.3g}/node)"
    return text


def cpu_model():
    try:
        with open("/proc/cpuinfo") as info:
            for line in info:
                if line.startswith("model name"):
                    return line.split(":", 1)[1].strip()
    except OSError:
        pass
    return platform.processor() or "unknown"


def verdict(ratio, target):
    if ratio is None or target is None:
        return ""
    return "met" if ratio <= target else "**missed**"


def render(results, stats):
    context = results.get("context", {})
    lines = []
    load = context.get("load_avg") or []
    lines.append(
        f"Measured {context.get('date', '?')} on `{platform.node()}`: {os.cpu_count()} CPUs "
        f"(`nproc`), {cpu_model()}, {context.get('mhz_per_cpu', '?')} MHz; our objects' memory from "
        f"{context.get('object_allocator', '?')}; load average at the start "
        f"{', '.join(f'{x:.2f}' for x in load) if load else '?'}. Google Benchmark reports its own library "
        f"as a {context.get('library_build_type', '?')} build (Debian's package), which affects only its loop. "
        f"Times are CPU time per operation, median and minimum of "
        f"{max((s['n'] for s in stats.values()), default=0)} interleaved repetitions; ratios are ours ÷ protobuf "
        f"on the heap and ours ÷ protobuf on an arena, of the medians and of the minimums; verdicts are on the "
        f"medians."
    )
    lines.append("")
    have_protobuf = any(name.startswith("protobuf_heap/") for name in stats)
    if not have_protobuf:
        lines.append("*Built without protobuf: only our half ran, so no ratios.*")
        lines.append("")
    lines.append("| workload | ours median | ours min | protobuf heap | protobuf arena | ÷ heap (median / min) "
                 "| target | ÷ arena (median / min) | target | allocs/op ours | allocs/op protobuf heap "
                 "| allocs/op protobuf arena |")
    lines.append("|---|---|---|---|---|---|---|---|---|---|---|---|")

    def ratios(ours, theirs, target):
        if not ours or not theirs:
            return "—", f"≤ {target}" if target is not None else ""
        median = ours["median"] / theirs["median"]
        text = f"{median:.2f} / {ours['min'] / theirs['min']:.2f}"
        if target is None:
            return text, ""
        return text, f"≤ {target}: {verdict(median, target)}"

    for workload, heap_target, arena_target in ROWS:
        ours = stats.get("tarn/" + workload)
        heap = stats.get("protobuf_heap/" + workload)
        arena = stats.get("protobuf_arena/" + workload)
        heap_ratio, heap_verdict = ratios(ours, heap, heap_target)
        arena_ratio, arena_verdict = ratios(ours, arena, arena_target) if arena else ("—", "")
        lines.append("| `{}` | {} | {} | {} | {} | {} | {} | {} | {} | {} | {} | {} |".format(
            workload,
            fmt_time(ours["median"] if ours else None),
            fmt_time(ours["min"] if ours else None),
            fmt_time(heap["median"] if heap else None),
            fmt_time(arena["median"] if arena else None),
            heap_ratio, heap_verdict, arena_ratio, arena_verdict,
            fmt_allocs(ours), fmt_allocs(heap), fmt_allocs(arena)))
    name, limit = NODE_ALLOCATION_TARGET
    ours = stats.get("tarn/" + name)
    if ours and ours["per_node"] is not None:
        lines.append("")
        lines.append(f"Allocations per copied node in `{name}`: {ours['per_node']:.3f} (target ≤ {limit:g}: "
                     f"{'met' if ours['per_node'] <= limit else '**missed**'}).")

    lines.append("")
    lines.append("| stub call | through the stub | direct virtual call | allocs/call (stub) | allowed by the target |")
    lines.append("|---|---|---|---|---|")
    for call, allowed in (("acquire_lock", "5: four scalar boxes and the argument vector"),
                          ("add_fault", "1: the argument vector (no scalar argument)")):
        stub = stats.get(f"tarn/stub_call/{call}")
        direct = stats.get(f"tarn/stub_call/{call}_direct")
        lines.append("| `{}` | {} | {} | {} | {} |".format(
            call, fmt_time(stub["median"] if stub else None), fmt_time(direct["median"] if direct else None),
            fmt_allocs(stub), allowed))

    lines.append("")
    lines.append("| load, in a fresh process | median | min | target |")
    lines.append("|---|---|---|---|")
    runtime = stats.get("tarn/load/runtime")
    types = stats.get("tarn/load/tarn_types")
    lines.append("| runtime alone (libkernite, liborbit) | {} | {} | |".format(
        fmt_time(runtime["median"] if runtime else None), fmt_time(runtime["min"] if runtime else None)))
    if types:
        lines.append("| libtarn-types with its dependencies (all sixteen loaders) | {} | {} | < {} ({}) |".format(
            fmt_time(types["median"]), fmt_time(types["min"]), fmt_time(LOAD_TARGET_NS),
            "met" if types["median"] < LOAD_TARGET_NS else "**missed**"))
    if runtime and types:
        lines.append("| difference: stand-ins, bindings and their loaders | {} | {} | |".format(
            fmt_time(types["median"] - runtime["median"]), fmt_time(types["min"] - runtime["min"])))
    return "\n".join(lines)


def main():
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    with open(sys.argv[1]) as f:
        results = json.load(f)
    table = render(results, collect(results))
    with open(sys.argv[2]) as f:
        readme = f.read()
    if BEGIN not in readme or END not in readme:
        sys.exit(f"{sys.argv[2]} has no {BEGIN} ... {END} section")
    head, rest = readme.split(BEGIN, 1)
    _, tail = rest.split(END, 1)
    with open(sys.argv[2], "w") as f:
        f.write(head + BEGIN + "\n" + table + "\n" + END + tail)
    print(table)


if __name__ == "__main__":
    main()
