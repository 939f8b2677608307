#!/usr/bin/env python3
"""Installs a product of the depot on a host, shows what its installer writes, and how it ended.

usage: install_product.py SOCKET PRODUCT VERSION COMMAND

COMMAND is the command line of the installer; |DEPLOYDIR| in it stands for the product's folder of
the depot and |TOVRINHOME| for the home:

    install_product.py /run/zavhost/zavhost.sock ux 1.0 \\
        "/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|"

The exit status is 0 if the product is installed, 1 if the host says why not, and 2 if it was not
asked.
"""

import pathlib
import sys
import uuid

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parent.parent))

from zavhost import Host, HostError  # noqa: E402

ATTEMPTS = 3


def accepted(host, product, version, command):
    """The task. Its TRANSID and `once` make a repetition harmless when an answer is lost."""
    transid = f"install-{uuid.uuid4().hex[:16]}"
    for attempt in range(1, ATTEMPTS + 1):
        try:
            return host.post_tasks(
                command="INSTALL",
                product=product,
                version=version,
                context=command,
                transid=transid,
                once=True,
            )
        except ConnectionError:
            if attempt == ATTEMPTS:
                raise


def install(host, product, version, command):
    task = accepted(host, product, version, command)
    for event in host.get_task_output(task["id"], follow=1):
        if event.name == "message":
            print(event.data["text"], end="", flush=True)
    task = host.get_task(task["id"], wait=600)
    print(f"{product} {version}: {task['state']}")
    if task["state"] != "done":
        print(task.get("reason", "see zavctl task show " + task["id"]), file=sys.stderr)
        return 1
    condition = {"column": "PRODUCT", "op": "=", "value": product}
    for row in host.post_query("KINAGT", where=[condition])["rows"]:
        print(f"installed: {row['PRODUCT']} {row['VERSION']}")
    return 0


def main():
    if len(sys.argv) != 5:
        print(__doc__, file=sys.stderr)
        return 2
    path, product, version, command = sys.argv[1:]
    try:
        return install(Host(path), product, version, command)
    except HostError as error:
        print(error, error.hint or "", sep="\n", file=sys.stderr)
        return 1
    except OSError as error:
        print(f"{path}: {error}", file=sys.stderr)
        return 2


if __name__ == "__main__":
    sys.exit(main())
