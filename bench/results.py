"""The figures of the rounds of tin_bench and of arrays.py."""

import json
import math
import statistics


class Results:
    """The rounds: for each benchmark, its figures by name."""

    def __init__(self, paths):
        self.figures = {}
        self.failures = []
        self.rounds = 0
        for path in paths:
            with open(path, encoding="utf-8") as file:
                round_ = json.load(file)
            if "plan" in round_["context"]:
                self.context = round_["context"]
                self.rounds += not self.context.get("threads")
            for run in round_["benchmarks"]:
                self.add(run)

    def add(self, run):
        parts = [p for p in run["name"].split("/")
                 if not p.startswith("iterations:") and p not in ("process_time", "manual_time", "real_time")]
        key = ("/".join(parts[:-2]), parts[-2], parts[-1])
        if run.get("error_occurred"):
            self.failures.append("/".join(parts) + ": " + run["error_message"])
            return
        figures = self.figures.setdefault(key, {})
        for name in ("items_per_second", "differ", "differ_found",
                     "differ_most", "open", "load", "again", "reading", "peak", "held", "triangles",
                     "crossings", "bytes", "cpu_time"):
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

    def get_best(self, subject, row, names):
        """The least time of those named, or None."""
        times = [t for t in (self.get_time(subject, row, who) for who in names) if t]
        return min(times) if times else None

    def get_rows(self, subject):
        return list(dict.fromkeys(k[1] for k in self.figures if k[0] == subject))

    def get_columns(self, subject):
        return list(dict.fromkeys(k[2] for k in self.figures if k[0] == subject))

    def get_spread(self):
        """Median over all benchmarks of the greatest by the least of its rounds."""
        spreads = [max(v) / min(v) for f in self.figures.values()
                   for v in [f.get("items_per_second", [])] if len(v) > 1]
        return statistics.median(spreads) if spreads else None


def get_count(row):
    """Triangles of a terrain by its name."""
    name = row.split("-")[0]
    number = float(name[:-1]) * {"k": 1e3, "M": 1e6}[name[-1]]
    return 2 * round(math.sqrt(number / 2)) ** 2
