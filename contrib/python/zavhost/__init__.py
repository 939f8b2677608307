"""A client for zavhost, the host that manages monitoring agents.

Needs Python 3.11 and nothing else.

    from zavhost import Host
    host = Host("/run/zavhost/zavhost.sock")
    print(host.get_health()["version"])

Each request of the host's interface is a method of Host; docs/api.md describes them. An error of
the host is raised as HostError.
"""

from .operations import Operations
from .transport import Event, HostError, Transport, UntrustedHost

__all__ = ["Event", "Host", "HostError", "Transport", "UntrustedHost"]


class Host(Operations):
    """A host, by its socket. Threads may share one: each request has a connection of its own.

    The process that serves the socket must run as root, as the caller or as `host_user`, a name or
    a number; else a request raises UntrustedHost before anything is sent. `timeout` is for how many
    seconds a request waits for its answer, or a stream for its next event.
    """

    def __init__(
        self, socket: str, *, timeout: float = 660, host_user: str | int | None = None
    ) -> None:
        super().__init__(Transport(socket, timeout, host_user))
