#!/usr/bin/env python3
"""Prints one table per kernel from Google Benchmark JSON files.

Benchmarks are named KERNEL/IMPLEMENTATION/SIZE (extra /parts are ignored);
the implementation "zvutil" is this library, every other one is a peer. Each
cell shows the throughput and, for peers, the ratio ours/peer.
"""
import argparse
import json
import re
from collections import defaultdict

OURS = "zvutil"


def human_bytes(n):
    for unit, size in (("MiB", 1 << 20), ("KiB", 1 << 10)):
        if n >= size and n % size == 0:
            return f"{n // size} {unit}"
    return f"{n} B"


def human_rate(bytes_per_second):
    for unit, size in (("GB/s", 1e9), ("MB/s", 1e6)):
        if bytes_per_second >= size:
            return f"{bytes_per_second / size:.2f} {unit}"
    return f"{bytes_per_second / 1e3:.1f} kB/s"


def main():
    parser = argparse.ArgumentParser()
    parser.add_argument("--title", default="")
    parser.add_argument("--note", default="")
    parser.add_argument("files", nargs="+")
    args = parser.parse_args()

    # kernel -> size -> implementation -> bytes per second
    table = defaultdict(lambda: defaultdict(dict))
    order = defaultdict(list)
    for path in args.files:
        with open(path) as f:
            try:
                data = json.load(f)
            except json.JSONDecodeError:
                continue  # a program whose benchmarks the filter left out
        for bench in data.get("benchmarks", []):
            if bench.get("run_type") == "aggregate" or "bytes_per_second" not in bench:
                continue
            parts = bench["name"].split("/")
            if len(parts) < 3 or not re.fullmatch(r"\d+", parts[2]):
                continue
            kernel, impl, size = parts[0], parts[1], int(parts[2])
            table[kernel][size][impl] = bench["bytes_per_second"]
            if impl not in order[kernel]:
                order[kernel].append(impl)

    print(f"== {args.title}" + (f" ({args.note})" if args.note else ""))
    for kernel in table:
        impls = [OURS] + [i for i in order[kernel] if i != OURS]
        header = ["size"] + [i if i == OURS else f"{i} (ours/{i})" for i in impls]
        rows = []
        for size in sorted(table[kernel]):
            cells = table[kernel][size]
            ours = cells.get(OURS)
            row = [human_bytes(size)]
            for impl in impls:
                rate = cells.get(impl)
                if rate is None:
                    row.append("-")
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
