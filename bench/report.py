#!/usr/bin/env python3
"""Writes docs/benchmarks.md from the rounds of tin_bench.

Usage: report.py ROUND.json ... > docs/benchmarks.md

Each figure is the median of the rounds. Fails if a benchmark failed, for example because our
index and our scan disagree.
"""

import json
import math
import platform
import statistics
import subprocess
import sys

# Why a goal is missed, by its key in get_goals(). A goal that is short and has no sentence here is
# printed as unexplained.
CAUSES = {
    "random": "Not proved, since there are no hardware counters here: a height seems to wait for "
              "memory. It follows the nodes down, then reads a leaf's list, its triangles and "
              "their vertices. Each read gives the address of the next",
    "line-short": "Not proved, as above: on the larger terrains almost all that a short segment "
                  "reads is out of the cache. A leaf reads each of up to five triangles, while "
                  "Boost's node holds their boxes side by side",
    "line-long": "As for short segments. The higher the line, the more a 3-D index leaves out",
    "scan": "While the triangles fit the cache, the time is that of testing each box: a load and "
            "six operations for each triangle. Beyond the cache it is the time of the memory",
    "raster": "The walk gives column, row and height of every cell, with two divisions in double "
              "for each cell by the inside rule. The plain walk trusts the ends of a row, "
              "divides once for each row and writes to the raster directly",
    "load": "The loop makes nothing. Opening reads as the loop does, and keeps what it reads. The "
            "load then welds the corners and makes vertices and triangles",
    "load-again": "The loop makes nothing. A second load reads as the loop does, since the file may "
                  "have changed, and then welds. GDAL's columns would read a GeoPackage in half "
                  "the time, but GDAL 3.6 fills them on threads that open the file anew, and a "
                  "damaged page makes it try without end",
    "growth": "At 100k all that a build or a height visits is in the cache, at 4M almost nothing "
              "is. At equal density of the positions, in the row `fine`, a height grows less",
}

# Title, key, unit of a figure (factor on nanoseconds an item, text), workload in words.
SUBJECTS = [
    ("Build", "build", (1, "ns a triangle"),
     "An index over a terrain in memory. Each library builds from its own form: our triangles, "
     "CGAL's triangles, Embree's shared buffers, and a vector of boxes for Boost. The time to "
     "release the index is not counted. Terrains are fractal. Their nodes are 10 m apart with 3 "
     "m of jitter, with two triangles in a cell, in row order or shuffled. `jacksboro` is real "
     "(17,619 triangles). `same` is so many copies of one triangle. In `crowded` vertices crowd "
     "towards a corner of the box by powers of two."),
    ("Memory of an index", "memory", (0, "bytes a triangle"),
     "Resident memory that a build adds, at its peak and afterwards, beyond what it is built "
     "from. Each build runs in a process of its own."),
    ("Degenerate surfaces", "degenerate", (1e-6, "ms"),
     "Our index over a million triangles (100k if `quick`). Each figure is one call. `same` and "
     "`crowded` are as above. `vertical` has upright triangles on a diagonal. `tower` has "
     "growing triangles over one point. `slivers` are 10,000 km long, side by side. In `far` "
     "each triangle spans the range of `float`. The height is that in the middle of the "
     "surface's box. The crossing is that of the box's diagonal."),
    ("Heights along scanlines", "height/scanline", (1, "ns a height"),
     "The greatest height at a million positions, row by row over the whole extent, one call for "
     "each position. CGAL lists the triangles that a plumb line meets. Boost lists those whose "
     "box holds the position. From both lists the highest is taken. Embree casts a ray down, "
     "with its robust flag. In its first column the first hit is the highest. In its second "
     "column a filter lists all hits."),
    ("Heights along fine scanlines", "height/fine", (1, "ns a height"),
     "The same at a million positions 2.24 m apart. On each terrain there are ten positions in a "
     "triangle, so they cross only a part of the larger terrains."),
    ("Heights at random positions", "height/random", (1, "ns a height"),
     "The same at a million positions in random order."),
    ("Highest crossing of short segments", "line/2%", (1e-3, "µs a segment"),
     "20,000 lines of sight. Each is 2 % of the extent long. It starts 1 m above the ground. It "
     "ends 1 m, plus up to 5 % of its length, above the ground. Our index and Boost's know only "
     "the plan, and visit every triangle below the segment. Those of CGAL and Embree are "
     "three-dimensional, and visit the triangles whose box the segment passes through. Embree "
     "takes the first hit from the higher end."),
    ("Highest crossing of long segments", "line/50%", (1e-3, "µs a segment"),
     "The same for 2,000 segments of 50 % of the extent."),
    ("Lines by a crossing tree, short", "crossing/2%", (1e-3, "µs a segment"),
     "The segments of the two tables above by a `CrossingTree`, one by one and as a batch on one "
     "thread, beside the surface with its tree and Embree's robust scene, where a filter keeps the "
     "highest of all hits; Embree takes them one by one, in packets of eight, and as a stream."),
    ("Lines by a crossing tree, long", "crossing/50%", (1e-3, "µs a segment"), "The same."),
    ("Heights without an index", "scan", (1e-3, "µs a height"),
     "One height by a scan of all triangles, beside reading one word of each cache line of the "
     "array of triangles."),
    ("Welding", "weld", (1, "ns a corner"),
     "Three corners for each triangle, in map coordinates, 24 bytes each. For every corner it "
     "finds the first one within 1e-9 on each axis. meshoptimizer finds the first one with the "
     "same bits. In `twins` one corner in a thousand is moved by the smallest step of a double. "
     "`ours, corners to surface` adds what follows in a load: vertices, triangles and their "
     "boxes."),
    ("Rings, star-shaped", "ring/star", (1e-3, "µs a ring"),
     "Rings of 4 to 500 corners around a centre. Each is tested for being simple and cut into "
     "triangles. GEOS uses isSimple and PolygonTriangulator on a polygon made beforehand. CGAL "
     "uses constrained Delaunay. Ours starts from the vertices of a shape."),
    ("Rings, wiggly", "ring/wiggly", (1e-3, "µs a ring"),
     "The same for bands that go up and down at each step."),
    ("Large rings", "ring/large", (1e-6, "ms a ring"),
     "One ring of 100,000 corners, the coast of 131,072. The teeth of the comb are 1 to 1000 m "
     "high and 2 m wide, those of the sawtooth up to 1 m high."),
    ("Whole surface to a raster", "raster", (1e-6, "ms a raster"),
     "2000 x 2000 cells over the whole terrain, with the greatest height in each, from triangles "
     "in grid coordinates. Embree casts a ray for each cell; its index is built beforehand. The "
     "row walks are plain loops in `double` over the triangles. One tests and weights each cell "
     "of a row. The other takes the cells for inside and steps along the plane. GDAL "
     "triangulates the vertices anew."),
    ("Loading, GeoPackage", "load/GPKG", (1e-9, "s"),
     "Triangles as polygons with heights, each file in a process of its own. The time is the "
     "processor time of opening a reader and its first load, beside one loop over all features "
     "that reads each corner and keeps nothing. The second load of the same reader reads the "
     "file again."),
    ("Loading, FlatGeobuf", "load/FlatGeobuf", (1e-9, "s"), "The same."),
    ("Loading, Shapefile", "load/ESRI Shapefile", (1e-9, "s"), "The same."),
    ("Windows, GeoPackage", "window/GPKG", (1e-9, "s"),
     "The processor time of `Load` alone, for a window of a hundredth of the area and for the "
     "whole layer, each in a process of its own."),
    ("Windows, FlatGeobuf", "window/FlatGeobuf", (1e-9, "s"), "The same."),
    ("Windows, Shapefile", "window/ESRI Shapefile", (1e-9, "s"), "The same."),
]


class Results:
    """The rounds: for each benchmark, its figures by name."""

    def __init__(self, paths):
        self.figures = {}
        self.failures = []
        for path in paths:
            with open(path, encoding="utf-8") as file:
                round_ = json.load(file)
            self.context = round_["context"]
            for run in round_["benchmarks"]:
                self.add(run)

    def add(self, run):
        parts = [p for p in run["name"].split("/")
                 if not p.startswith("iterations:") and p not in ("process_time", "manual_time")]
        key = ("/".join(parts[:-2]), parts[-2], parts[-1])
        if run.get("error_occurred"):
            self.failures.append("/".join(parts) + ": " + run["error_message"])
            return
        figures = self.figures.setdefault(key, {})
        for name in ("items_per_second", "differ", "differ_found",
                     "differ_most", "open", "load", "again", "peak", "held", "triangles",
                     "crossings"):
            if name in run:
                figures.setdefault(name, []).append(run[name])

    def get(self, subject, row, who, name):
        """The median of a figure, or None."""
        values = self.figures.get((subject, row, who), {}).get(name)
        return statistics.median(values) if values else None

    def get_time(self, subject, row, who="ours"):
        """Nanoseconds an item, or None."""
        rate = self.get(subject, row, who, "items_per_second")
        return 1e9 / rate if rate else None

    def get_ratio(self, subject, row, who):
        """The other's time by ours, or None."""
        ours = self.get_time(subject, row)
        other = self.get_time(subject, row, who)
        return other / ours if ours and other else None

    def get_rows(self, subject):
        return list(dict.fromkeys(k[1] for k in self.figures if k[0] == subject))

    def get_columns(self, subject):
        return list(dict.fromkeys(k[2] for k in self.figures if k[0] == subject))

    def get_spread(self):
        """Median over all benchmarks of the greatest by the least of its rounds."""
        spreads = [max(v) / min(v) for f in self.figures.values()
                   for v in [f.get("items_per_second", [])] if len(v) > 1]
        return statistics.median(spreads) if spreads else None


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
            again = results.get(subject, row, who, "again")
            share = again / results.get(subject, row, "bare OGR loop", "again")
            rows.append([row, who, format_cell(results, subject, row, who, 1e-9 * get_count(row)),
                         format_figure(results.get(subject, row, who, "open")),
                         format_figure(results.get(subject, row, who, "load")),
                         f"{format_figure(again)} ({share:.2f} loops)",
                         format_figure(results.get(subject, row, who, "peak") / 1e6)])
    return format_table(["Triangles", "", "opening and first load, s (ratio)", "opening, s",
                         "first load, s", "second load, s", "peak memory, MB"], rows)


def get_count(row):
    """Triangles of a terrain by its name."""
    name = row.split("-")[0]
    number = float(name[:-1]) * {"k": 1e3, "M": 1e6}[name[-1]]
    return 2 * round(math.sqrt(number / 2)) ** 2


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


class Goal:
    """One row of the goals: pairs of what was compared and its value, each with a bound."""

    def __init__(self, key, text):
        self.key = key
        self.text = text
        self.values = []

    def at_least(self, label, value, bound):
        self.values.append((label, value, bound, value is not None and value >= bound, "≥"))
        return self

    def at_most(self, label, value, bound):
        self.values.append((label, value, bound, value is not None and value <= bound, "≤"))
        return self

    def format(self):
        known = [v for v in self.values if v[1] is not None]
        found = "; ".join(f"{label} {value:.2f}" for label, value, _, _, _ in known)
        if not known:
            return [self.text, "", "not measured"]
        short = [f"{label} {value:.2f}, not {sign} {bound:g}"
                 for label, value, bound, is_met, sign in known if not is_met]
        if not short:
            return [self.text, found, "met"]
        cause = CAUSES.get(self.key, "Cause not yet known.")
        return [self.text, found, f"**short**: {'; '.join(short)}. {cause}"]


def invert(value):
    return 1 / value if value else None


def get_goals(results):
    ratio = results.get_ratio

    def compare(goal, subject, rows, bounds):
        for row in rows:
            for who, bound in bounds:
                goal.at_least(f"{who} {row}", ratio(subject, row, who), bound)
        return goal

    embree, boost, from_100k = "Embree, first hit", "Boost R-tree", ("100k", "1M", "4M")
    goals = [
        compare(Goal("build", "Build at 100k and 1M: 1.3 x CGAL, 1.5 x Embree"), "build",
                ("100k", "1M"), (("CGAL", 1.3), (embree, 1.5))),
        compare(Goal("scanline", "Heights along scanlines from 100k: 3 x CGAL, 1.4 x Boost, level "
                     "with Embree (0.95)"), "height/scanline", from_100k,
                (("CGAL", 3.0), (boost, 1.4), (embree, 0.95))),
        compare(compare(Goal("random", "Heights at random: 2 x CGAL, level with Boost at 100k "
                             "(0.95)"), "height/random", from_100k, (("CGAL", 2.0),)),
                "height/random", ("100k",), ((boost, 0.95),)),
        compare(Goal("line-short", "Short segments: 1.25 x Boost"), "line/2%", from_100k,
                ((boost, 1.25),)),
        compare(Goal("line-long", "Long segments: 1.25 x Boost"), "line/50%", from_100k,
                ((boost, 1.25),)),
    ]
    scan = Goal("scan", "Heights without an index: at most 1.5 x touching each cache line")
    for row in results.get_rows("scan"):
        scan.at_most(row, invert(ratio("scan", row, "touching each cache line")), 1.5)
    goals += [
        scan,
        compare(Goal("weld", "Welding from 1M: 2 x meshoptimizer, 10 x the plain octree"), "weld",
                ("1M", "4M"), (("meshoptimizer", 2.0), ("plain octree", 10.0))),
    ]
    rings = Goal("ring", "Rings of 4 and 5 / 10 / 50 / 500 corners: 10 / 7 / 5 / 1.3 x GEOS")
    for corners, bound in (("4", 10), ("5", 10), ("10", 7), ("50", 5), ("500", 1.3)):
        for shape in ("star", "wiggly"):
            rings.at_least(f"{shape} {corners}", ratio("ring/" + shape, corners, "GEOS"), bound)
    large = Goal("ring-large", "Rings of 100,000 corners: at most 1 s")
    for row in results.get_rows("ring/large"):
        large.at_most(row, results.get_time("ring/large", row) / 1e9, 1.0)
    goals += [
        rings,
        large,
        compare(Goal("raster", "Raster at 100k: 5 x Embree's ray a cell, 1.8 x a plain row walk"),
                "raster", ("100k",), (("Embree, a ray a cell", 5.0), ("plain row walk", 1.8))),
    ]
    load = Goal("load", "Opening and first load: at most 1.3 x one bare OGR loop (FlatGeobuf, "
                "Shapefile), 1.0 x (GeoPackage)")
    again = Goal("load-again", "Second load: at most 1.3 x one bare OGR loop (FlatGeobuf, "
                 "Shapefile), 0.8 x (GeoPackage)")
    for driver, first, second in (("FlatGeobuf", 1.3, 1.3), ("GPKG", 1.0, 0.8),
                                  ("ESRI Shapefile", 1.3, 1.3)):
        key = "load/" + driver
        for row in results.get_rows(key):
            load.at_most(f"{driver} {row}", invert(ratio(key, row, "bare OGR loop")), first)
            times = [results.get(key, row, who, "again") for who in ("ours", "bare OGR loop")]
            again.at_most(f"{driver} {row}", times[0] / times[1] if all(times) else None, second)
    window = Goal("window", "A window of 1 %: at most 3 % of a whole load (GeoPackage, FlatGeobuf), "
                  "30 % (Shapefile)")
    for driver, bound in (("FlatGeobuf", 0.03), ("GPKG", 0.03), ("ESRI Shapefile", 0.3)):
        for row in results.get_rows("window/" + driver):
            window.at_most(f"{driver} {row}",
                           invert(ratio("window/" + driver, row, "whole layer")), bound)
    return goals + [load, again, window, get_growth_goal(results)]


def get_growth(results, subject, start, end, per_log):
    first, last = results.get_time(subject, start), results.get_time(subject, end)
    if not first or not last:
        return None
    logs = math.log(get_count(end)) / math.log(get_count(start)) if per_log else 1.0
    return last / first / logs


def get_growth_goal(results):
    """From 100k to 4M there are forty times the triangles. A quadratic build would take forty times
    as long for each triangle."""
    goal = Goal("growth", "Growth from 100k to 4M: a build as n log n (1.5 for caches), a height "
                "along scanlines at most 1.5 x; no quadratic path (4 a triangle)")
    goal.at_most("build by n log n", get_growth(results, "build", "100k", "4M", True), 1.5)
    goal.at_most("scanlines", get_growth(results, "height/scanline", "100k", "4M", False), 1.5)
    goal.at_most("fine scanlines", get_growth(results, "height/fine", "100k", "4M", False), 1.5)
    for kind in ("same", "crowded"):
        goal.at_most(f"build a triangle, {kind}",
                     get_growth(results, "build", "100k-" + kind, "4M-" + kind, False), 4)
    return goal


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


def format_machine(results, rounds):
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
        ["Run", f"{context['plan']}, {rounds} rounds, load average at the last "
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
        format_machine(results, len(paths)),
        "## Goals",
        format_table(["Goal", "Found", "Verdict"], [g.format() for g in get_goals(results)]),
    ]
    parts += [format_subject(results, title, key, factor, unit, words)
              for title, key, (factor, unit), words in SUBJECTS]
    parts.append(format_growth(results))
    print("\n\n".join(part for part in parts if part))


if __name__ == "__main__":
    main(sys.argv[1:])
