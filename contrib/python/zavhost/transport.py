"""HTTP on a Unix socket, errors of the host, and streams of events."""

import http.client
import json
import os
import pwd
import socket
import struct
from collections.abc import Iterator, Mapping
from typing import Any, NamedTuple
from urllib.parse import quote


class HostError(Exception):
    """The host did not do what it was asked for; the text says why."""

    def __init__(self, status: int, document: Mapping[str, Any], retry_after: int | None) -> None:
        super().__init__(document["error"])
        self.status = status
        self.guard: str | None = document.get("guard")  #: the guard that refused the request
        self.hint: str | None = document.get("hint")  #: the way out
        self.retry_after = retry_after  #: after how many seconds to ask again


class UntrustedHost(Exception):
    """Another user than root and the caller serves the socket."""


class Event(NamedTuple):
    """One event of a stream."""

    name: str  #: "message" if it has none
    data: Any
    id: str  #: where a later stream may continue; empty if the event has none


class _Connection(http.client.HTTPConnection):
    def __init__(self, path: str, timeout: float, trusted: frozenset[int]) -> None:
        super().__init__("localhost", timeout=timeout)
        self._path = path
        self._trusted = trusted

    def connect(self) -> None:
        connection = socket.socket(socket.AF_UNIX, socket.SOCK_STREAM)
        try:
            connection.settimeout(self.timeout)
            connection.connect(self._path)
            self._insist_on_trust(connection)
        except BaseException:
            connection.close()
            raise
        self.sock = connection

    def _insist_on_trust(self, connection: socket.socket) -> None:
        credentials = struct.Struct("3i")
        peer = connection.getsockopt(socket.SOL_SOCKET, socket.SO_PEERCRED, credentials.size)
        _, user, _ = credentials.unpack(peer)
        if user not in self._trusted:
            raise UntrustedHost(f"{self._path} is served by the user with the number {user}")


def _user_number(user: str | int) -> int:
    return user if isinstance(user, int) else pwd.getpwnam(user).pw_uid


def _encoded(value: Any) -> str:
    """Names of files are bytes: what is no UTF-8 stands in a str as os.fsdecode() gives it."""
    text = str(int(value)) if isinstance(value, bool) else str(value)
    return quote(text.encode("utf-8", "surrogateescape"), safe="")


def _target(path: str, parameters: Mapping[str, Any]) -> str:
    """Parameters that are None are left out; a list stands for several of one name."""
    pairs = []
    for name, value in parameters.items():
        values = value if isinstance(value, (list, tuple)) else [value]
        pairs += [f"{_encoded(name)}={_encoded(one)}" for one in values if one is not None]
    return path + ("?" + "&".join(pairs) if pairs else "")


def _raise_error(response: http.client.HTTPResponse, document: Any) -> None:
    """Some documents of a status above 400 are answers and no errors."""
    if response.status >= 400 and isinstance(document, dict) and "error" in document:
        after = response.getheader("Retry-After")
        raise HostError(response.status, document, int(after) if after else None)


def _parsed_events(lines: Iterator[bytes]) -> Iterator[Event]:
    """Lines without a field are comments, which only keep the connection alive."""
    fields = {"event": "message", "data": "", "id": ""}
    for raw in lines:
        line = raw.decode("utf-8").rstrip("\n")
        name, _, value = line.partition(": ")
        if name in fields:
            fields[name] = value
        elif not line and fields["data"]:
            yield Event(fields["event"], json.loads(fields["data"]), fields["id"])
            fields = {"event": "message", "data": "", "id": ""}


def segment(value: str) -> str:
    """The value as one segment of a path."""
    return _encoded(value)


class Transport:
    """Asks one host. Any thread."""

    def __init__(self, path: str, timeout: float, host_user: str | int | None) -> None:
        self._path = path
        self._timeout = timeout
        users = {0, os.geteuid()} | ({_user_number(host_user)} if host_user is not None else set())
        self._trusted = frozenset(users)

    def ask(
        self,
        method: str,
        path: str,
        parameters: Mapping[str, Any],
        body: Mapping[str, Any] | None = None,
    ) -> Any:
        """The document that answers; text if the answer is none. Members of the body that are None
        are left out."""
        connection, response = self._send(method, path, parameters, body)
        try:
            content = response.read()
        finally:
            connection.close()
        if response.getheader("Content-Type") != "application/json":
            return content.decode("utf-8")
        document = json.loads(content)
        _raise_error(response, document)
        return document

    def stream(self, method: str, path: str, parameters: Mapping[str, Any]) -> Iterator[Event]:
        """The events of the answer. The host has begun to keep them when this returns. Whoever does
        not read to the end closes the iterator, or leaves that to its end of life."""
        connection, response = self._send(method, path, parameters, None)
        if response.status >= 400:
            try:
                _raise_error(response, json.loads(response.read()))
            finally:
                connection.close()
        return self._events(connection, response)

    def _events(
        self, connection: http.client.HTTPConnection, response: http.client.HTTPResponse
    ) -> Iterator[Event]:
        try:
            yield from _parsed_events(iter(response.readline, b""))
        finally:
            response.close()
            connection.close()

    def _send(
        self,
        method: str,
        path: str,
        parameters: Mapping[str, Any],
        body: Mapping[str, Any] | None,
    ) -> tuple[http.client.HTTPConnection, http.client.HTTPResponse]:
        connection = _Connection(self._path, self._timeout, self._trusted)
        try:
            content = None
            if body is not None:
                content = json.dumps({k: v for k, v in body.items() if v is not None}).encode()
            connection.request(method, _target(path, parameters), content)
            return connection, connection.getresponse()
        except BaseException:
            connection.close()
            raise
