#!/usr/bin/env python3
"""Writes the page about performance and its pictures from the figures of a run.

usage: bench/report/report.py RESULTS DOCS

RESULTS is a folder with what the benchmarks wrote; DOCS gets performance.md and
performance/*.svg. The table of ratios is printed, too.
"""

import datetime
import sys
from pathlib import Path

import curves
import machine
import measures
import ratios


def growth_section(figures, docs):
    pictures = docs / "performance"
    pictures.mkdir(exist_ok=True)
    parts = []
    for figure in curves.FIGURES:
        if not curves.draw(figure, figures, pictures):
            continue
        head, rows = curves.table_of(figure, figures)
        parts += [f"### {figure.title}", "",
                  f"![{figure.title}](performance/{figure.name}.svg)", "",
                  ratios.markdown(head, rows), ""]
    return "\n".join(parts).rstrip()


def missed_section(missed):
    """What was not reached, with the reason if it is known."""
    if not missed:
        return ""
    lines = ["### Goals that were not met", ""]
    for row in missed:
        lines.append(f"- **{row.what}** against {row.against}: "
                     f"{row.reason.strip() or 'not looked into yet.'}")
    return "\n".join(lines)


def main():
    if len(sys.argv) != 3:
        raise SystemExit(__doc__)
    figures = measures.read(sys.argv[1])
    docs = Path(sys.argv[2])
    rows = list(ratios.Table(figures).rows())
    table = ratios.markdown(ratios.HEAD, [row.cells() for row in rows])
    goals = [row for row in rows if row.goal is not None]
    missed = [row for row in goals if row.met() is False]
    unmeasured = sum(row.met() is None for row in goals)
    summary = f"Of {len(goals)} goals {len(goals) - len(missed) - unmeasured} are met."
    if unmeasured:
        summary += f" {unmeasured} could not be measured: what they need was not to be had."
    page = (Path(__file__).parent / "performance.md.in").read_text()
    for mark, text in {
            "DATE": datetime.datetime.now(datetime.timezone.utc).strftime("%Y-%m-%d"),
            "MACHINE": machine.describe(figures),
            "VERSIONS": ratios.markdown(["What", "Package", "Version"], machine.versions()),
            "SUMMARY": summary,
            "RATIOS": table,
            "MISSED": missed_section(missed),
            "GROWTH": growth_section(figures, docs),
            "CHILDREN": f"{figures.get('request/children', 0):.0f}",
    }.items():
        page = page.replace(f"@{mark}@", text)
    (docs / "performance.md").write_text(page)
    print(table)
    print(summary)


if __name__ == "__main__":
    main()
