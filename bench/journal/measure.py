#!/usr/bin/env python3
"""Counts how often a host syncs its disk for a task, and times tasks beside other programs.

usage: measure.py count SOCKET SYNCS GATE TASKS
       measure.py time ROUNDS NAME=COMMAND-LINE...

"count" prints lines of NAME and number: syncs per task. SYNCS is the file of count_syncs; the product
"gate" is started only when the file GATE is there. "time" prints the medians in seconds of commands
that take turns.
"""

import http.client
import json
import os
import shlex
import socket
import statistics
import subprocess
import sys
import time

SUBMITTERS = 200
ROUNDS_AT_ONCE = 5  # all of them wait for the gate, at most 1,000


class Host:
    def __init__(self, path, syncs):
        self._path = path
        self._syncs = syncs

    def syncs(self):
        if not os.path.exists(self._syncs):
            return 0
        with open(self._syncs, "rb") as file:
            return int.from_bytes(file.read(8), sys.byteorder)

    def connect(self):
        connection = http.client.HTTPConnection("localhost")
        connection.sock = socket.socket(socket.AF_UNIX)
        connection.sock.connect(self._path)
        return connection

    def ask(self, method, target, body=None, connection=None):
        connection = connection or self.connect()
        connection.request(method, target, body and json.dumps(body))
        answer = connection.getresponse()
        document = json.loads(answer.read())
        if answer.status not in (200, 202):
            raise SystemExit(f"{target} was answered with {answer.status}: {document}")
        return document

    def start(self, product, connection=None):
        return self.ask("POST", "/v1/tasks",
                        {"command": "START", "product": product, "force": True}, connection)["id"]

    def await_end(self, task):
        state = self.ask("GET", f"/v1/tasks/{task}?wait=300")["state"]
        if state != "done":
            raise SystemExit(f"a task is {state}")

    def get_configuration(self):
        where = [{"column": column, "op": "=", "value": value}
                 for column, value in (("COMMAND", "GETCONFIG"), ("PRODUCT", "ax"))]
        self.ask("POST", "/v1/query", {"table": "KAGREQT", "where": where})


class Gate:
    """Holds up the queue: what is accepted meanwhile waits."""

    def __init__(self, host, path):
        self._host, self._path = host, path

    def __enter__(self):
        if os.path.exists(self._path):
            os.unlink(self._path)
        task = self._host.start("gate")
        while self._host.ask("GET", f"/v1/tasks/{task}")["state"] != "running":
            time.sleep(0.01)
        time.sleep(1.5)  # what the host writes down at its leisure is written
        return self

    def open(self):
        with open(self._path, "w", encoding="ascii"):
            pass

    def __exit__(self, *_):
        self.open()


def submit_at_once(host):
    """All ask before the first one reads its answer. Returns how many were accepted: the host may have
    no place for all of them at the same moment."""
    connections = [host.connect() for _ in range(SUBMITTERS)]
    body = json.dumps({"command": "START", "product": "ax", "force": True})
    for connection in connections:
        connection.request("POST", "/v1/tasks", body)
    states = [connection.getresponse().status for connection in connections]
    if any(status not in (202, 503) for status in states):
        raise SystemExit(f"tasks were answered with {set(states)}")
    return states.count(202)


def count(host, gate_file, number):
    before = host.syncs()
    for _ in range(number):
        host.await_end(host.start("ax"))
    yield "outcome", (host.syncs() - before) / number

    with Gate(host, gate_file) as gate:
        before = host.syncs()
        tasks = [host.start("ax") for _ in range(number)]
        accepted = (host.syncs() - before) / number
        yield "accept", accepted
        gate.open()
        host.await_end(tasks[-1])
        yield "queue", (host.syncs() - before) / number

    with Gate(host, gate_file):
        before = host.syncs()
        for _ in range(number):
            host.get_configuration()
            last = host.start("ax")
        yield "getconfig", max(0.0, (host.syncs() - before) / number - accepted)
    host.await_end(last)

    with Gate(host, gate_file):
        shares = []
        for _ in range(ROUNDS_AT_ONCE):
            before = host.syncs()
            accepted = submit_at_once(host)
            shares.append((host.syncs() - before) / accepted)
        yield "submitters", statistics.median(shares)


def timed(rounds, named):
    ways = dict(each.split("=", 1) for each in named)
    seconds = {name: [] for name in ways}
    for number in range(rounds):
        names = list(ways)
        for name in names[number % len(names):] + names[:number % len(names)]:
            begin = time.perf_counter()
            subprocess.run(shlex.split(ways[name]), check=True, stdout=subprocess.DEVNULL,
                           stderr=subprocess.DEVNULL)
            seconds[name].append(time.perf_counter() - begin)
    for name, values in seconds.items():
        yield name, statistics.median(values)


def main():
    if len(sys.argv) == 6 and sys.argv[1] == "count":
        figures = count(Host(sys.argv[2], sys.argv[3]), sys.argv[4], int(sys.argv[5]))
    elif len(sys.argv) > 3 and sys.argv[1] == "time":
        figures = timed(int(sys.argv[2]), sys.argv[3:])
    else:
        raise SystemExit(__doc__)
    for name, value in figures:
        print(f"{name}\t{value:.6f}", flush=True)


if __name__ == "__main__":
    main()
