#!/usr/bin/env python3
"""Prints one table per kernel from Google Benchmark JSON files.

Benchmarks are named KERNEL/IMPLEMENTATION/SIZE (extra /parts are ignored);
the implementation "zvutil" is this library, every other one is a peer. Each
cell shows the throughput and, for peers, the ratio ours/peer; benchmarks that
report no byte count show the wall-clock time per iteration instead, with the
ratio of times ours/peer (lower is faster). With repetitions, the median counts.
"""
import argparse
import json
import re
from collections import defaultdict

OURS = "zvutil"


def human_bytes(n):
    for unit, size in (("GiB", 1 << 30), ("MiB", 1 << 20), ("KiB", 1 << 10)):
        if n >= size and n % size == 0:
            return f"{n // size} {unit}"
    return f"{n} B"


def human_rate(bytes_per_second):
    for unit, size in (("GB/s", 1e9), ("MB/s", 1e6)):
        if bytes_per_second >= size:
            return f"{bytes_per_second / size:.2f} {unit}"
    return f"{bytes_per_second / 1e3:.1f} kB/s"


def human_time(seconds):
    for unit, size in (("s", 1.0), ("ms", 1e-3), ("us", 1e-6)):
        if seconds >= size:
            return f"{seconds / size:.3g} {unit}"
    return f"{seconds / 1e-9:.3g} ns"


TIME_UNITS = {"ns": 1e-9, "us": 1e-6, "ms": 1e-3, "s": 1.0}


def main():
    parser = argparse.ArgumentParser()
    parser.add_argument("--title", default="")
    parser.add_argument("--note", default="")
    parser.add_argument("files", nargs="+")
    args = parser.parse_args()

    # kernel -> size -> implementation -> bytes per second, or (seconds,)
    table = defaultdict(lambda: defaultdict(dict))
    medians = set()
    order = defaultdict(dict)  # kernel -> implementation -> registration order
    for path in args.files:
        with open(path) as f:
            try:
                data = json.load(f)
            except json.JSONDecodeError:
                continue  # a program whose benchmarks the filter left out
        for bench in data.get("benchmarks", []):
            median = bench.get("run_type") == "aggregate"
            if median and bench.get("aggregate_name") != "median":
                continue
            parts = bench.get("run_name", bench["name"]).split("/")
            if len(parts) < 3 or not re.fullmatch(r"\d+", parts[2]):
                continue
            kernel, impl, size = parts[0], parts[1], int(parts[2])
            if (kernel, impl, size) in medians:
                continue
            if median:
                medians.add((kernel, impl, size))
            if "bytes_per_second" in bench:
                table[kernel][size][impl] = bench["bytes_per_second"]
            else:
                unit = TIME_UNITS[bench.get("time_unit", "ns")]
                table[kernel][size][impl] = (bench["real_time"] * unit,)
            rank = bench.get("family_index", len(order[kernel]))
            order[kernel][impl] = min(rank, order[kernel].get(impl, rank))

    print(f"== {args.title}" + (f" ({args.note})" if args.note else ""))
    for kernel in table:
        peers = sorted(order[kernel], key=order[kernel].get)
        impls = [OURS] + [i for i in peers if i != OURS]
        timed = any(isinstance(v, tuple) for c in table[kernel].values() for v in c.values())
        ratio = "time ours/" if timed else "ours/"
        header = ["size"] + [i if i == OURS else f"{i} ({ratio}{i})" for i in impls]
        rows = []
        for size in sorted(table[kernel]):
            cells = table[kernel][size]
            ours = cells.get(OURS)
            row = [human_bytes(size)]
            for impl in impls:
                rate = cells.get(impl)
                if rate is None:
                    row.append("-")
                elif timed:
                    cell = human_time(rate[0])
                    row.append(cell if impl == OURS or ours is None
                               else f"{cell} ({ours[0] / rate[0]:.2f}x)")
                elif impl == OURS or ours is None:
                    row.append(human_rate(rate))
                else:
                    row.append(f"{human_rate(rate)} ({ours / rate:.2f}x)")
            rows.append(row)
        widths = [max(len(r[c]) for r in rows + [header]) for c in range(len(header))]
        print(f"\n{kernel}")
        for r in [header] + rows:
            print("  " + "  ".join(cell.ljust(w) for cell, w in zip(r, widths)).rstrip())
    print()


if __name__ == "__main__":
    main()
