#!/usr/bin/env python3
"""Compares answers of a centre with the description of its interface.

usage: described_answers.py FILE

FILE has the description and the answers that were recorded. Every operation must have succeeded
once, and every member that is described must have been there once.
"""

import json
import pathlib
import sys

HERE = pathlib.Path(__file__).resolve().parent
sys.path.insert(0, str(HERE.parents[2] / "e2e" / "host" / "openapi"))
from answers import Description, Walk  # noqa: E402
from walk import check_description, titled  # noqa: E402

# Of refusals by guards, which only hosts have.
NOT_SEEN = {("Error", "guard"), ("Error", "hint")}


class Recorded(Walk):
    def __init__(self, document):
        self.description = Description(document)
        self.statuses = set()
        self.members = set()
        self.names = {
            (path, method): name
            for name, (path, method, _) in self.description.operations.items()
        }

    def look_at(self, answer):
        name = self.names[answer["path"], answer["method"].lower()]
        where = f"{answer['method']} {answer['target']}"
        if "event" not in answer:
            text = answer["text"].encode()
            self.judge(name, answer["status"], answer["fields"], text, where)
            return
        operation = self.description.operations[name][2]
        shapes = operation["responses"]["200"]["content"]["text/event-stream"]["x-events"]
        self.compare(answer["data"], shapes[answer["event"]], f"{where}: {answer['event']}")
        self.statuses |= {(name, "200"), (name, answer["event"])}


def expect_everything_seen(recorded):
    described = set()
    for name, (_, _, operation) in recorded.description.operations.items():
        for status, answer in operation["responses"].items():
            if "$ref" in answer:
                continue
            described.add((name, status))
            for content in answer["content"].values():
                described |= {(name, event) for event in content.get("x-events", {})}
    missing = described - recorded.statuses
    assert not missing, f"not provoked: {sorted(missing)}"
    members = set()
    for schema in titled(recorded.description.schemas):
        members |= {(schema["title"], name) for name in schema["properties"]}
    missing = members - recorded.members - NOT_SEEN
    assert not missing, f"never seen: {sorted(missing)}"


def main():
    with open(sys.argv[1], encoding="utf-8") as source:
        given = json.load(source)
    recorded = Recorded(given["description"])
    check_description(recorded)
    for answer in given["answers"]:
        recorded.look_at(answer)
    expect_everything_seen(recorded)
    print(f"{len(recorded.statuses)} answers of {len(recorded.names)} operations")


if __name__ == "__main__":
    main()
