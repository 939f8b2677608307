"""What the figures were measured on and with."""

import os
import platform
import re
import shutil
import subprocess
from pathlib import Path

_PACKAGES = [("C library with its iconv", "libc6"), ("ICU", "libicu-dev"),
             ("expat", "libexpat1-dev"), ("NRPE server", "nagios-nrpe-server"),
             ("check_nrpe", "nagios-nrpe-plugin"), ("Zabbix agent", "zabbix-agent"),
             ("curl", "curl"),
             ("OpenSSH server", "openssh-server"), ("OpenSSH client", "openssh-client"),
             ("rsync", "rsync"), ("coreutils", "coreutils"), ("Google Benchmark", "libbenchmark-dev")]
_UNPACKED = "build/peers/usr/bin"  # where bench/install_peers.sh puts what it does not install

_NAME = r'^PRETTY_NAME="?([^"\n]*)'


def _field(path, pattern):
    match = re.search(pattern, Path(path).read_text(), re.MULTILINE)
    return match.group(1).strip() if match else "unknown"


def _output(*command):
    run = subprocess.run(command, capture_output=True, text=True, check=False)
    return run.stdout.strip() if run.returncode == 0 else ""


def _busyness(figures):
    load = figures.get("machine/load")
    text = "not recorded" if load is None else f"load average {load:.2f} before the run"
    starts = sum(value for name, value in figures.items() if re.match("quiet/.*/starts$", name))
    disturbed = sum(value for name, value in figures.items() if re.match("quiet/.*/disturbed$", name))
    if starts > 0 and disturbed == 0:
        text += (f"; all {starts:.0f} measurements began when the processors had been idle for half a "
                 "second")
    elif starts > 0:
        text += (f"; **{disturbed:.0f} of {starts:.0f} measurements began while other programs ran, "
                 "which counts in everything that is measured by the clock**")
    return text


def describe(figures):
    """Lines of a list in Markdown about the machine of the run with these figures."""
    memory = int(_field("/proc/meminfo", r"^MemTotal:\s*(\d+)")) / (1 << 20)
    return "\n".join([
        f"- processor: {_field('/proc/cpuinfo', r'^model name.*: (.*)$')}, "
        f"{os.cpu_count()} cores",
        f"- memory: {memory:.0f} GiB",
        f"- kernel: {platform.system()} {platform.release()}",
        f"- distribution: {_field('/etc/os-release', _NAME)}",
        f"- compiler: {_output('c++', '--version').splitlines()[0]}",
        f"- other work: {_busyness(figures)}",
    ])


def versions():
    """Rows of a table: what it is, package and version."""
    rows = [[title, package,
             _output("dpkg-query", "-W", "-f", "${Version}", package) or "not installed, left out"]
            for title, package in _PACKAGES]
    return rows + [["zabbix_get", "zabbix-proxy-sqlite3",
                    _zabbix_get_version() or "not unpacked, left out"]]


def _zabbix_get_version():
    """The program says it itself, since its package is only unpacked."""
    path = shutil.which("zabbix_get", path=os.environ["PATH"] + os.pathsep + _UNPACKED)
    return _output(path, "-V").partition(")")[2].strip().partition("\n")[0] if path else ""
