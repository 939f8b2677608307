"""What the figures were measured on and with."""

import os
import platform
import re
import subprocess
from pathlib import Path

_PACKAGES = [("C library with its iconv", "libc6"), ("ICU", "libicu-dev"),
             ("expat", "libexpat1-dev"), ("NRPE server", "nagios-nrpe-server"),
             ("check_nrpe", "nagios-nrpe-plugin"), ("Zabbix agent", "zabbix-agent"),
             ("OpenSSH server", "openssh-server"), ("OpenSSH client", "openssh-client"),
             ("rsync", "rsync"), ("coreutils", "coreutils"), ("Google Benchmark", "libbenchmark-dev")]


_NAME = r'^PRETTY_NAME="?([^"\n]*)'


def _field(path, pattern):
    match = re.search(pattern, Path(path).read_text(), re.MULTILINE)
    return match.group(1).strip() if match else "unknown"


def _output(*command):
    run = subprocess.run(command, capture_output=True, text=True, check=False)
    return run.stdout.strip() if run.returncode == 0 else ""


def _busyness(load):
    if load is None:
        return "not recorded"
    text = f"load average {load:.2f} before the run"
    if load > 0.5 * os.cpu_count():
        text += ("; **the machine did other work meanwhile, which counts in everything that is "
                 "measured by the clock**")
    return text


def describe(load):
    """Lines of a list in Markdown. `load` is the load average at the beginning, or None."""
    memory = int(_field("/proc/meminfo", r"^MemTotal:\s*(\d+)")) / (1 << 20)
    return "\n".join([
        f"- processor: {_field('/proc/cpuinfo', r'^model name.*: (.*)$')}, "
        f"{os.cpu_count()} cores",
        f"- memory: {memory:.0f} GiB",
        f"- kernel: {platform.system()} {platform.release()}",
        f"- distribution: {_field('/etc/os-release', _NAME)}",
        f"- compiler: {_output('c++', '--version').splitlines()[0]}",
        f"- other work: {_busyness(load)}",
    ])


def versions():
    """Rows of a table: what it is, package and version."""
    return [[title, package,
             _output("dpkg-query", "-W", "-f", "${Version}", package) or "not installed, left out"]
            for title, package in _PACKAGES]
