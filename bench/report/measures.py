"""The figures of a run, read from the files that the benchmarks wrote."""

import json
import re
from pathlib import Path

_SECONDS = {"ns": 1e-9, "us": 1e-6, "ms": 1e-3, "s": 1.0}


def _benchmark_figures(path):
    """Figures of a Google Benchmark file: the median of the repetitions as NAME, the least of them as
    NAME:least, both in seconds, and medians of counters as NAME:COUNTER, as the program gave them.

    Processor time counts, unless the benchmark says that its work is waited for.
    """
    least = {}
    for entry in json.loads(path.read_text())["benchmarks"]:
        if entry.get("error_occurred"):
            raise SystemExit(f"{entry['name']}: {entry.get('error_message')}")
        full_name = entry["run_name"]
        name = re.sub(r"/(iterations:\d+|real_time)", "", full_name)
        kind = "real_time" if full_name.endswith("/real_time") else "cpu_time"
        seconds = entry[kind] * _SECONDS[entry["time_unit"]]
        if entry["run_type"] == "iteration":
            least[name] = min(seconds, least.get(name, seconds))
        elif entry.get("aggregate_name") == "median":
            yield name, seconds
            for counter, value in entry.items():
                if isinstance(value, float) and counter not in ("real_time", "cpu_time"):
                    yield f"{name}:{counter}", value
    for name, seconds in least.items():
        yield f"{name}:least", seconds


def read(folder):
    """All figures below `folder` by name: *.json of Google Benchmark, *.tsv with NAME and number."""
    figures = {}
    for path in sorted(Path(folder).glob("*.json")):
        figures.update(_benchmark_figures(path))
    for path in sorted(Path(folder).glob("*.tsv")):
        for line in path.read_text().splitlines():
            name, value = line.split("\t")
            figures[name] = float(value)
    return figures
