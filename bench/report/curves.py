"""The growth curves: their points, tables and pictures."""

import math
import subprocess
from dataclasses import dataclass

MOST_PER_DOUBLING = 2.2
FIRST_THAT_COUNTS = 2  # what happens before the third point is the cost of starting


@dataclass
class Curve:
    title: str
    prefix: str  # of the names of its figures; what follows is the amount of work

    def points(self, figures):
        """Pairs of work and seconds in the order of the work.

        The least of the repetitions counts: what else the machine does only ever adds.
        """
        return sorted((int(name[len(self.prefix):]), figures.get(f"{name}:least", value))
                      for name, value in figures.items()
                      if name.startswith(self.prefix) and name[len(self.prefix):].isdigit())

    def doublings(self, figures):
        """For each point but the first: how often the cost grew for each doubling of the work."""
        points = self.points(figures)
        return [(cost / cost0) ** (1 / math.log2(work / work0))
                for (work0, cost0), (work, cost) in zip(points, points[1:])]

    def worst_doubling(self, figures):
        return max(self.doublings(figures)[FIRST_THAT_COUNTS - 1:], default=None)


@dataclass
class Figure:
    """Curves over the same work that share a table and a picture."""
    name: str  # of the picture's file
    title: str
    work: str
    bytes: bool  # the work is counted in bytes
    curves: list

    def label(self, work):
        if not self.bytes:
            return f"{work:,}"
        for unit, size in (("MiB", 1 << 20), ("KiB", 1 << 10)):
            if work >= size:
                return f"{work // size} {unit}"
        return f"{work} B"

    def relative(self, figures):
        """For each curve its points, the cost as a multiple of the third point's."""
        result = []
        for curve in self.curves:
            points = curve.points(figures)
            if len(points) > FIRST_THAT_COUNTS:
                unit = points[FIRST_THAT_COUNTS][1]
                result.append((curve, [(work, cost / unit) for work, cost in points]))
        return result


FIGURES = [
    Figure("output", "Output of a command that is run and collected", "output", True,
           [Curve("output of a command", "output/")]),
    Figure("queue", "Requests accepted into the queue and taken off again", "depth of the queue",
           False, [Curve("depth of the queue", "queue/")]),
    Figure("subscriptions", "One outcome published to live subscriptions", "subscriptions", False,
           [Curve("subscriptions that all take a row", "subscriptions/all/"),
            Curve("subscriptions of which one takes a row", "subscriptions/one/")]),
    Figure("push", "A file pushed into the depot", "size of the file", True,
           [Curve("size of a pushed file", "push/")]),
    Figure("texts", "Texts built and worked through", "characters", False,
           [Curve("append by character", "growth/append_units/"),
            Curve("append by line", "growth/append_texts/"),
            Curve("insertEscapes", "growth/insert_escapes/"),
            Curve("replace", "growth/replace/"),
            Curve("StringTokenizer", "growth/split/")]),
    Figure("keys", "A map filled and asked for every key", "keys", False,
           [Curve("keys in a map", "keys/")]),
    Figure("runas", "A run-as database read", "size of the file", True,
           [Curve("size of a run-as database", "runas/")]),
    Figure("lines", "Files read line by line", "lines", False,
           [Curve("lines of a property file", "properties/"),
            Curve("lines of an inventory", "inventory/")]),
]

CURVES = [curve for figure in FIGURES for curve in figure.curves]


def table_of(figure, figures):
    """Head and rows: the work, and for each curve its cost and the growth per doubling."""
    columns = figure.relative(figures)
    head = [figure.work]
    for curve, _ in columns:
        head += [curve.title if len(columns) > 1 else "cost", "per doubling"]
    rows = {}
    for curve, points in columns:
        doublings = [None, *curve.doublings(figures)]
        for (work, cost), growth in zip(points, doublings):
            row = rows.setdefault(work, [figure.label(work)])
            row += [f"{cost:.3g}" if cost < 1000 else f"{cost:.0f}",
                    "" if growth is None else f"{growth:.2f}"]
    return head, [rows[work] for work in sorted(rows)]


_PALETTE = ["#1f6fb4", "#d1495b", "#2e8b57", "#8a5fbf", "#c98a00"]


def _plot_script(figure, columns, path):
    works = [work for work, _ in columns[0][1]]
    step = max(1, (len(works) + 6) // 7)
    tics = ", ".join(f'"{figure.label(work)}" {work}' for work in works[::step])
    third = works[FIRST_THAT_COUNTS]
    plots = ['$proportion with lines dashtype 2 linecolor "#777777" title "in proportion to the work"']
    blocks = ["\n".join(["$proportion << END", *(f"{work} {work / third}" for work in works), "END"])]
    for index, (curve, points) in enumerate(columns):
        color = _PALETTE[index % len(_PALETTE)]
        plots.append(f'$curve{index} with linespoints linewidth 2 pointtype 7 pointsize 0.6 '
                     f'linecolor "{color}" title "{curve.title if len(columns) > 1 else "measured"}"')
        data = "\n".join(f"{work} {cost:.6g}" for work, cost in points)
        blocks.append(f"$curve{index} << END\n{data}\nEND")
    # Half a step of room on either side, so that no point lies on the frame.
    room = (works[-1] / works[0]) ** 0.03
    return "\n".join(blocks + [
        'set terminal svg size 720,440 font "sans-serif,13" background "white"',
        f'set output "{path}"',
        f'set title "{figure.title}"',
        "set logscale xy",
        f"set xrange [{works[0] / room}:{works[-1] * room}]",
        f"set xtics ({tics})",
        f'set xlabel "{figure.work}"',
        'set ylabel "cost, as a multiple of the third point\'s"',
        'set format y "%g"',
        'set grid xtics ytics linecolor "#dddddd"',
        "set border 3",
        "set tics nomirror",
        "set key top left",
        "plot " + ", ".join(plots),
    ]) + "\n"


def draw(figure, figures, folder):
    """Writes the picture NAME.svg into `folder`; false when there is nothing to draw."""
    columns = figure.relative(figures)
    if not columns:
        return False
    path = folder / f"{figure.name}.svg"
    subprocess.run(["gnuplot"], input=_plot_script(figure, columns, path), text=True, check=True)
    # Browsers show the title where the pointer is.
    path.write_text(path.read_text().replace("<title>Gnuplot<", f"<title>{figure.title}<", 1))
    return True
