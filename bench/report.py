#!/usr/bin/env python3
"""Writes docs/benchmarks.md from the rounds of tin_bench.

Usage: report.py ROUND.json ... > docs/benchmarks.md     the rounds of tin_bench and of arrays.py

Each figure is the median of the rounds. Fails if a benchmark failed, for example because our
index and our scan disagree.
"""

import math
import os
import platform
import subprocess
import sys

from goals import get_goals
from results import Results, get_count
from subjects import SUBJECTS


PAGE = os.path.join(os.path.dirname(__file__), "..", "docs", "benchmarks.md")
TILES = "## Tiles on Dask"


def get_tiles():
    """The section of the tiles as it stands: `scripts/bench tiles` prints its tables."""
    with open(PAGE, encoding="utf-8") as page:
        return TILES + page.read().partition(TILES)[2].rstrip()


def format_figure(value):
    if value is None:
        return ""
    digits = max(0, 2 - math.floor(math.log10(value))) if value > 0 else 0
    return f"{value:,.{min(digits, 4)}f}"


def format_table(header, rows):
    lines = ["| " + " | ".join(header) + " |", "|" + "---|" * len(header)]
    lines += ["| " + " | ".join(row) + " |" for row in rows]
    return "\n".join(lines)


def format_cell(results, subject, row, who, factor):
    time = results.get_time(subject, row, who)
    if time is None:
        return ""
    ratio = results.get_ratio(subject, row, who)
    if who == "ours" or not ratio:
        return format_figure(time * factor)
    return f"{format_figure(time * factor)} ({ratio:.{2 if ratio >= 0.1 else 3}f})"


def get_lead(results, subject):
    """Tells by how much the three-dimensional indices lead on lines."""
    parts = []
    for who in ("CGAL", "Embree, first hit"):
        leads = [1 / ratio for row in results.get_rows(subject)
                 for ratio in [results.get_ratio(subject, row, who)] if ratio]
        if leads and max(leads) > 1:
            parts.append(f"{who}: {min(leads):.1f} to {max(leads):.1f} times as quick as ours")
    return ["Where a three-dimensional index leads: " + "; ".join(parts) + "."] if parts else []


def get_notes(results, subject):
    """Tells where a competitor's answers differ from ours."""
    notes = []
    for who in results.get_columns(subject):
        named = [describe_difference(results, subject, row, who)
                 for row in results.get_rows(subject) if results.get(subject, row, who, "differ")]
        if named:
            notes.append(f"- {who}: {'; '.join(named)}")
    return ["Other answers than ours:\n\n" + "\n".join(notes)] if notes else []


def describe_difference(results, subject, row, who):
    count = int(results.get(subject, row, who, "differ"))
    found = int(results.get(subject, row, who, "differ_found") or 0)
    most = results.get(subject, row, who, "differ_most") or 0
    words = []
    if found:
        words.append(f"{found:,} found by one of the two only")
    if count > found and most:
        words.append(f"{count - found:,} heights apart by up to {most:.2g} m")
    return f"{row} {', '.join(words) or f'{count:,}'}"


def format_memory(results):
    rows = []
    for row in results.get_rows("memory"):
        for who in results.get_columns("memory"):
            count = results.get("memory", row, who, "triangles")
            rows.append([row, who.split(",")[0]] + [format_figure(results.get("memory", row, who, name) / count)
                                      for name in ("held", "peak")])
    return format_table(["Terrain", "Index", "kept", "peak"], rows)


def format_load(results, subject):
    rows = []
    for row in results.get_rows(subject):
        for who in results.get_columns(subject):
            loop = results.get(subject, row, "bare OGR loop", "again")
            again, reading = (results.get(subject, row, who, name)
                              for name in ("again", "reading"))
            rows.append([row, who, format_cell(results, subject, row, who, 1e-9 * get_count(row)),
                         format_figure(results.get(subject, row, who, "open")),
                         format_figure(results.get(subject, row, who, "load")),
                         f"{format_figure(again)} ({again / loop:.2f} loops)",
                         f"{format_figure(reading)} ({reading / loop:.2f} loops)",
                         format_figure(results.get(subject, row, who, "peak") / 1e6)])
    return format_table(["Triangles", "", "opening and first load, s (ratio)", "opening, s",
                         "first load, s", "second load, s", "of it reading, s", "peak memory, MB"],
                        rows)


def format_subject(results, title, subject, factor, unit, words):
    if not results.get_rows(subject):
        return ""
    parts = [f"## {title}", words]
    if subject == "memory":
        parts.append(f"In {unit}.\n\n" + format_memory(results))
    elif subject.startswith("load"):
        parts.append(format_load(results, subject))
    else:
        columns = results.get_columns(subject)
        table = [[row] + [format_cell(results, subject, row, who, factor) for who in columns]
                 for row in results.get_rows(subject)]
        columns_named = [who.split(",")[0] if subject == "build" else who for who in columns]
        first = {"ring/large": "Ring", "ring/star": "Corners", "ring/wiggly": "Corners"}.get(
            subject, "Terrain")
        parts.append(f"In {unit}.\n\n" + format_table([first] + columns_named, table))
    if subject.startswith("line"):
        parts += get_lead(results, subject)
    parts += get_notes(results, subject)
    return "\n\n".join(parts)


def format_growth(results):
    """Our time an item from size to size, beside the competitors'."""
    rows = []
    for title, subject, _, _ in SUBJECTS:
        sizes = [s for s in ("10k", "100k", "1M", "4M") if results.get_time(subject, s)]
        if len(sizes) < 2 or subject in ("scan", "raster", "line/2%", "line/50%"):
            continue
        for who in results.get_columns(subject):
            times = [results.get_time(subject, s, who) for s in sizes]
            if all(times):
                rows.append([title, who] + [f"{t / times[0]:.2f}" for t in times])
    if not rows:
        return ""
    sizes = ["10k", "100k", "1M", "4M"][:len(rows[0]) - 2]
    return ("## Growth\n\nThe time of an item divided by that at 10k.\n\n"
            + format_table(["Work", ""] + sizes, rows))


def read_line(path, start):
    with open(path, encoding="utf-8") as file:
        for line in file:
            if line.startswith(start):
                return line.split("=" if "=" in line else ":", 1)[1].strip().strip('"')
    return "?"


def format_machine(results):
    context = results.context
    commit = subprocess.run(["git", "describe", "--always", "--dirty"], capture_output=True,
                            text=True, check=False).stdout.strip()
    memory = int(read_line("/proc/meminfo", "MemTotal").split()[0]) / 1048576
    caches = ", ".join(f"L{c['level']} {c['size'] // 1024} KiB" for c in context["caches"]
                       if c["type"] != "Instruction")
    peers = [f"{name} {context[name]}" for name in
             ("CGAL", "Embree", "Boost", "GEOS", "meshoptimizer", "GDAL") if name in context]
    rows = [
        ["Date", context["date"][:10]],
        ["Machine", f"{read_line('/proc/cpuinfo', 'model name')}, {context['num_cpus']} cores, "
                    f"{caches}, {memory:.0f} GiB of memory"],
        ["System", f"{read_line('/etc/os-release', 'PRETTY_NAME')}, Linux {platform.release()}"],
        ["Compiler", f"gcc {context['compiler']}, release preset, for any x86-64"],
        ["Library", commit],
        ["Others", ", ".join(peers)],
        ["Run", f"{context['plan']}, {results.rounds} rounds, load average at the last "
                f"{context['load_avg'][0]:.1f}"],
    ]
    spread = results.get_spread()
    if spread:
        rows.append(["Spread", f"the slowest round of a benchmark takes {spread:.2f} x the "
                               "quickest (median)"])
    return format_table(["", ""], rows)


def main(paths):
    results = Results(paths)
    if results.failures:
        sys.exit("Failed:\n" + "\n".join(sorted(set(results.failures))))
    parts = [
        "# Benchmarks",
        "`scripts/bench` makes this page. It installs the competitors from Debian, builds "
        "everything and runs it. Times are processor times of one thread on one core, and the "
        "median of the rounds. The ratio in brackets is the other's time divided by ours; above "
        "1 ours is quicker. Each run compares every competitor's answers with ours, and ours "
        "with a scan of all triangles.",
        format_machine(results),
        "## Goals",
        format_table(["Goal", "Found", "Verdict"], [g.format() for g in get_goals(results)]),
    ]
    parts += [format_subject(results, title, key, factor, unit, words)
              for title, key, (factor, unit), words in SUBJECTS]
    parts += [format_growth(results), get_tiles()]
    print("\n\n".join(part for part in parts if part))


if __name__ == "__main__":
    main(sys.argv[1:])
