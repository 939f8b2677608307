"""Prometheus with a host's metrics and the alert rules, until an alert fires.

usage: watch_host.py SOCKET RULES ALERT DIRECTORY

Prometheus scrapes over TCP, so a proxy on the loopback address passes its requests on to the host's
SOCKET. Prints "scraped" once Prometheus has got the host's metrics and knows no such alert, and then
the alert's labels as one line of JSON as soon as it fires. Gives up after a minute. What Prometheus
keeps and says is in DIRECTORY.
"""

import json
import os
import random
import signal
import socket
import subprocess
import sys
import threading
import time
import urllib.request

SOCKET, RULES, ALERT, DIRECTORY = sys.argv[1:]
LIMIT = 60
CONFIGURATION = """
global: {{scrape_interval: 1s, scrape_timeout: 1s, evaluation_interval: 1s}}
rule_files: ["{rules}"]
scrape_configs:
  - job_name: zavhost
    metrics_path: /v1/metrics
    static_configs: [{{targets: ["127.0.0.1:{port}"]}}]
"""


def pass_on(source, target):
    while data := source.recv(65536):
        target.sendall(data)
    target.shutdown(socket.SHUT_WR)


def serve(client):
    with client, socket.socket(socket.AF_UNIX) as host:
        try:
            host.connect(SOCKET)
            threading.Thread(target=pass_on, args=(client, host), daemon=True).start()
            pass_on(host, client)
        except OSError:
            pass  # the next scrape comes with a connection of its own


def accept_all(listener):
    while True:
        client, _ = listener.accept()
        threading.Thread(target=serve, args=(client,), daemon=True).start()


def free_port():
    """Below those that the system gives to outgoing connections, which could take it first."""
    while True:
        port = random.randint(12000, 31999)
        with socket.socket() as probe:
            try:
                probe.bind(("127.0.0.1", port))
                return port
            except OSError:
                pass  # somebody has it


class Prometheus:
    def __init__(self, scraped_port):
        self.port = free_port()
        configuration = os.path.join(DIRECTORY, "prometheus.yml")
        with open(configuration, "w", encoding="utf-8") as out:
            out.write(CONFIGURATION.format(rules=RULES, port=scraped_port))
        with open(os.path.join(DIRECTORY, "prometheus.log"), "wb") as log:
            self.process = subprocess.Popen(
                [
                    "prometheus",
                    f"--config.file={configuration}",
                    f"--storage.tsdb.path={DIRECTORY}/data",
                    f"--web.listen-address=127.0.0.1:{self.port}",
                ],
                stdout=log,
                stderr=log,
            )

    def ask(self, path):
        """The data of an answer; nothing while it does not answer."""
        if self.process.poll() is not None:
            sys.exit(f"prometheus has ended with status {self.process.returncode}")
        try:
            with urllib.request.urlopen(f"http://127.0.0.1:{self.port}/api/v1/{path}", timeout=5) as answer:
                return json.load(answer)["data"]
        except OSError:
            return None

    def has_scraped(self):
        data = self.ask("query?query=zavhost_build_info")
        return data is not None and len(data["result"]) > 0

    def firing(self):
        data = self.ask("alerts") or {"alerts": []}
        return [
            one["labels"]
            for one in data["alerts"]
            if one["labels"]["alertname"] == ALERT and one["state"] == "firing"
        ]

    def end(self):
        self.process.terminate()
        try:
            self.process.wait(10)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()


def until(condition, what):
    end = time.monotonic() + LIMIT
    while not (found := condition()):
        if time.monotonic() > end:
            sys.exit(f"{what}: not within {LIMIT} s")
        time.sleep(0.1)
    return found


def main():
    signal.signal(signal.SIGTERM, lambda *_: sys.exit(1))
    proxy = socket.create_server(("127.0.0.1", 0))
    threading.Thread(target=accept_all, args=(proxy,), daemon=True).start()
    prometheus = Prometheus(proxy.getsockname()[1])
    try:
        until(prometheus.has_scraped, "metrics of the host")
        if prometheus.firing():
            sys.exit(f"{ALERT} fires already")
        print("scraped", flush=True)
        print(json.dumps(until(prometheus.firing, ALERT)[0]), flush=True)
    finally:
        prometheus.end()


main()
