"""The table of ratios: what is compared with what, the goals, and whether they are met."""

from dataclasses import dataclass
from typing import Optional

from curves import CURVES, MOST_PER_DOUBLING


# Why the growth of these curves comes close to the goal or misses it, as far as that was looked into.
_CLOCK = ("this is measured by the clock and over several processes, so whatever else the machine does "
          "counts. ")
GROWTH_REASONS = {
    "append by line": "nothing is done more often than the work asks for, but it is little more than "
                      "copying, and what is copied outgrows one level of the processor's caches "
                      "between the last points. ",
    "output of a command": _CLOCK + "Beyond 1 MiB the collected text is new memory from the kernel, "
                           "whose pages cost about a third of the time.",
    "size of a pushed file": _CLOCK,
}


JOURNAL_REASONS = {
    "submitters": "those that arrive while a transaction is being written share the next one, and the host "
                  "has 32 threads for requests. On a busy machine fewer of them come in time. ",
}


HEARING = ("it is some 25 microseconds, of which about 5 are the texts of a dozen trace lines, which nobody puts "
           "together unheard, and 5 the wait for the end. The rest shows nowhere in a profile: code that runs once "
           "for each command and finds nothing of its own in the caches. ")
GUARDS = ("hearing costs each of the command's processes some 25 microseconds, and a list of orphans is read before "
          "each. ")
SMALL_FILES = ("a file is read, sent through a socket and written, where `cp` has the kernel copy it; and for each the "
               "host finds the folder beneath the depot and removes what was there before. ")
LARGE_FILE = ("the bytes go through a socket, where `cp` has the kernel copy them; the ratio moves by half with what "
              "the disk's cache still holds. ")
READING = "what is left beyond the parser is the making of UTF-16 text and of the list itself. "
TOKENS = "each token is an object with a buffer of its own. "


@dataclass
class Row:
    what: str
    against: str
    values: list  # numbers; None where a figure is missing
    goal: Optional[float] = None  # each value is at most this
    strict: bool = False  # below it
    goal_text: str = ""
    reason: str = ""  # why the goal may be missed, and what was tried

    def met(self):
        present = [value for value in self.values if value is not None]
        if not present or self.goal is None:
            return None
        return all(value < self.goal if self.strict else value <= self.goal for value in present)

    def cells(self):
        if all(value is None for value in self.values):
            shown = "left out"
        else:
            shown = " / ".join("–" if v is None else _number(v) for v in self.values)
        goal = self.goal_text
        if self.goal is not None and not goal:
            goal = ("below " if self.strict else "at most ") + _number(self.goal)
        met = {None: "", True: "yes", False: "**no**"}[self.met()]
        return [self.what, self.against, shown, goal, met]


def _number(value):
    if value == int(value) and value < 100:
        return str(int(value))
    if value < 0.1:
        return f"{value:.3f}"
    return f"{value:.2f}"


class Table:
    """Builds the rows from a run's figures."""

    def __init__(self, figures):
        self._figures = figures

    def _ratio(self, own, other, times=1.0):
        if own not in self._figures or other not in self._figures:
            return None
        return self._figures[own] * times / self._figures[other]

    def _commands(self):
        for run, title in (("small", "running a one-line script"),
                           ("1GiB", "running it with 1 GiB of touched heap")):
            limits = (1.25, 2) if run == "small" else (None, None)
            for counter, quantile, limit in (("ratio", "median", limits[0]),
                                             ("p99_ratio", "99th percentile", limits[1])):
                yield Row(f"{title}, {quantile}", "`posix_spawn` and three pipes",
                          [self._figures.get(f"spawn/{run}:{counter}")], limit)
            yield Row(f"{title}, median", "`fork`, `execve` and three pipes",
                      [self._figures.get(f"fork/{run}:ratio")])
        yield Row("running it with 1 GiB of touched heap, median", "running it with a small heap",
                  [self._ratio("spawn/1GiB:run", "spawn/small:run")], 1.2)

        for output, title, limit in (("line", "a one-line script", 1.02),
                                     ("64KiB", "a script that prints 64 KiB", None),
                                     ("4MiB", "a script that prints 4 MiB", None)):
            yield Row(f"{title} that the host hears, median", "the same unheard",
                      [self._figures.get(f"heard/{output}:ratio")], limit, reason=HEARING)

    def _requests(self):
        children = self._figures.get("request/children", 0)
        share = 1 / children if children else 1
        peers = [("zabbix", "Zabbix agent, `system.run`"), ("nrpe", "NRPE, raw client without TLS"),
                 ("check_nrpe", "NRPE, `check_nrpe`"), ("ssh_master", "`ssh`, master connection"),
                 ("ssh", "`ssh`")]
        for peer, title in peers:
            yield Row("GETCONFIG per child process, connection new / kept", title,
                      [self._ratio(f"request/host/getconfig/{way}", f"request/{peer}", share)
                       for way in ("anew", "kept")], 1, strict=True)
        for query, title in (("inventory", "query of KINAGT (two child processes)"),
                             ("refused", "request that is refused")):
            for peer, peer_title in peers[:2]:
                yield Row(f"{title}, connection new / kept", peer_title,
                          [self._ratio(f"request/host/{query}/{way}", f"request/{peer}")
                           for way in ("anew", "kept")])

        for query, title in (("getconfig", "GETCONFIG"), ("inventory", "query of KINAGT"),
                             ("refused", "request that the plug-in refuses")):
            yield Row(f"{title}, connection new / kept", "the same without guards",
                      [self._ratio(f"request/guarded/{query}/{way}", f"request/unguarded/{query}/{way}")
                       for way in ("anew", "kept")], 1.05, reason=GUARDS)

    def _conversions(self):
        kinds = [("utf8_ascii", "ASCII", "UTF-8"), ("utf8_mixed", "mixed text", "UTF-8"),
                 ("utf8_scripts", "text of many scripts", "UTF-8"),
                 ("latin1_ascii", "ASCII", "ISO-8859-1"),
                 ("latin1_mixed", "mixed text", "ISO-8859-1")]
        for way, title in (("iconv", "bare `iconv`, descriptor kept"),
                           ("icu", "ICU's converter, kept")):
            for direction in ("from", "to"):
                for kind, text, codeset in kinds:
                    ascii_only = kind.endswith("ascii")
                    goal = 1 if ascii_only == (way == "iconv") else None
                    yield Row(f"`String` {direction} {codeset}, {text}, 32 B / 256 B / 64 KiB",
                              title,
                              [self._ratio(f"{direction}/{kind}/{size}/string",
                                           f"{direction}/{kind}/{size}/{way}")
                               for size in (32, 256, 65536)], goal, strict=ascii_only)

    def _texts(self):
        for operation, title in (("find_unit", "`find` of a character"),
                                 ("find_text", "`find` of a text"), ("replace", "`replace`"),
                                 ("trim", "`trim` of a copy")):
            yield Row(f"{title}, 32 / 256 / 65,536 characters", "`std::u16string`",
                      [self._ratio(f"{operation}/string/{size}", f"{operation}/standard/{size}")
                       for size in (32, 256, 65536)])
        for sizes, title, goal in (((32, 256), "32 / 256", None),
                                   ((1024, 65536), "1,024 / 65,536", 1.3)):
            yield Row(f"`StringTokenizer`, {title} characters", "`std::u16string`",
                      [self._ratio(f"split/string/{size}", f"split/standard/{size}")
                       for size in sizes], goal, reason=TOKENS)

    def _files(self):
        for sizes, title, goal in ((("agents/10", "agents/1000"), "10 / 1,000 agents", 1.3),
                                   (("1024", "1048576"), "1 KiB / 1 MiB", None)):
            yield Row(f"run-as database read, {title}", "bare expat that builds a tree",
                      [self._ratio(f"runas/{size}", f"expat/{size}") for size in sizes], goal,
                      reason=READING)

    def _transfers(self):
        def row(what, peer, title, goal=None, goal_text=""):
            return Row("push of one file of 1 GiB" if what == "large" else
                       "push of a folder of 10,000 files of 4 KiB", title,
                       [self._figures.get(f"transfer/{what}/ratio/{peer}")], goal,
                       goal_text=goal_text,
                       reason=LARGE_FILE if what == "large" else SMALL_FILES)

        yield row("large", "sync", "`rsync` to a daemon", 0.75)
        yield row("large", "copy", "`cp`", 1.5)
        yield row("large", "secure", "`scp`")
        yield row("many", "secure", "`scp -r`", 1 / 6, "at most 0.17")
        yield row("many", "sync", "`rsync` to a daemon", 1)
        yield row("many", "copy", "`cp -r`", 1.5)
        for what, title in (("large", "one file of 1 GiB"),
                            ("many", "a folder of 10,000 files of 4 KiB")):
            yield Row(f"push of {title}, verified", "the push alone",
                      [self._ratio(f"transfer/{what}/verified", f"transfer/{what}/push")])
        yield Row("push of one file of 1 GiB: growth of the host's memory", "32 MiB",
                  [None if "transfer/growth" not in self._figures else
                   self._figures["transfer/growth"] / 32], 1, strict=True)

    def _processes(self):
        for peer, title, goal in (("true", "`/bin/true`", 2.5),
                                  ("curl", "`curl` with the same question", None),
                                  ("zabbix_get", "`zabbix_get`, a ping", None),
                                  ("check_nrpe_plain", "`check_nrpe`, its version, without TLS", None),
                                  ("check_nrpe", "`check_nrpe`, its version", None)):
            yield Row("`zavctl status`, a process from start to end", title,
                      [self._ratio("process/zavctl", f"process/{peer}")], goal)

    def _growth(self):
        for curve in CURVES:
            yield Row(f"growth: {curve.title}, worst doubling", "half the work",
                      [curve.worst_doubling(self._figures)], MOST_PER_DOUBLING,
                      reason=GROWTH_REASONS.get(curve.title, ""))

    def _journal(self):
        for count, title, limit in (
                ("accept", "POST of a task to its 202", 1.2),
                ("outcome", "POST of a task to its outcome", 3.5),
                ("queue", "a task in a long queue, in all", 2.3),
                ("submitters", "200 tasks posted at once, each to its 202", 0.1),
                ("getconfig", "GETCONFIG", 0)):
            yield Row(f"{title}: syncs of the disk", "without a journal, subtracted",
                      [self._figures.get(f"journal/{count}")], limit,
                      reason=JOURNAL_REASONS.get(count, ""))
        for peer, title in (("tsp", "task-spooler, `tsp -nf true`"), ("at", "`at now`"),
                            ("systemd_run", "`systemd-run --wait true`")):
            yield Row("`zavctl start`, from its start to the task's outcome", title,
                      [self._ratio("journal/time/zavctl", f"journal/time/{peer}")])

    def _rest(self):
        seconds = self._figures.get("rest/seconds", 0)
        yield Row(f"host at rest: wake-ups in {seconds:.0f} s", "none",
                  [self._figures.get("rest/wakeups")], 0, goal_text="0")
        yield Row("host at rest: resident memory", "12 MiB",
                  [None if "rest/resident_kib" not in self._figures else
                   self._figures["rest/resident_kib"] / (12 * 1024)], 1, strict=True)

    def rows(self):
        for part in (self._commands, self._requests, self._processes, self._conversions,
                     self._texts, self._files, self._transfers, self._journal, self._growth,
                     self._rest):
            yield from part()


HEAD = ["What", "Against", "Ratio", "Goal", "Met"]


def markdown(head, rows):
    """A table in Markdown whose columns are aligned, so that it can be read as it is, too."""
    rows = [head, *rows]
    widths = [max(len(row[i]) for row in rows) for i in range(len(head))]
    lines = ["| " + " | ".join(cell.ljust(w) for cell, w in zip(row, widths)) + " |"
             for row in rows]
    lines.insert(1, "|" + "|".join("-" * (width + 2) for width in widths) + "|")
    return "\n".join(lines)
