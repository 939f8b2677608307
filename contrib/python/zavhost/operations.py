"""The requests of the host's interface, one method each.

Made by generate.py from docs/openapi.json.
"""

from collections.abc import Iterator
from typing import Any, Literal, NotRequired, TypedDict

from .transport import Event, Transport, segment


class Column(TypedDict):
    """A column of a table."""
    #: its name, in capitals
    name: str
    #: where it begins in a row, in bytes
    offset: int
    #: its length in bytes
    length: int
    #: 3: a signed integer of 32 bits; 9: characters
    type: int


class Table(TypedDict):
    """A table."""
    #: the application that it belongs to
    application: str
    #: its name
    name: str
    #: its columns, in their order
    columns: list[Column]


class Tables(TypedDict):
    """The tables of the plug-in."""
    #: one after the other
    tables: list[Table]


class Condition(TypedDict):
    """What a row must satisfy."""
    #: the name of a column
    column: str
    #: like has a pattern, in which * stands for any characters
    op: Literal["=", "!=", "<", "<=", ">", ">=", "like"]
    #: of an integer column a number, or its digits as a string
    value: str | int


class FullText(TypedDict):
    """A text that a column may have cut."""
    #: the row, from 0
    row: int
    #: the column
    column: str
    #: the text
    text: str
    #: false: even this is a part, or holds bytes that are no characters
    complete: bool


class CommandWarning(TypedDict):
    """A warning, and the command that gave rise to it."""
    #: why there may be less than there should be
    text: str
    #: the command line
    command: str
    #: the process, if there was one
    pid: NotRequired[int]
    #: when it began
    started: str
    #: when it ended; null while it runs
    ended: str | None
    #: the exit status, if it had one
    exit: NotRequired[int]
    #: the signal that ended it, if one did
    signal: NotRequired[int]
    #: why it could not be executed
    error: NotRequired[str]
    #: true: its time was over
    timed_out: NotRequired[bool]
    #: the end of its output; not for readers
    stdout: NotRequired[str]
    #: the end of its errors; not for readers
    stderr: NotRequired[str]


class QueryAnswer(TypedDict):
    """What a table answered."""
    #: the rows
    rows: list[dict[str, str | int]]
    #: texts that columns may have cut
    full: NotRequired[list[FullText]]
    #: why there may be less than there should be
    warnings: NotRequired[list[CommandWarning]]


#: The state of a task.
TaskState = Literal[
    "queued",
    "running",
    "done",
    "failed",
    "refused",
    "cancelled",
    "expired",
    "interrupted",
]


class Command(TypedDict):
    """What one command of a task did."""
    #: the command line
    command: str
    #: the process, if there was one
    pid: NotRequired[int]
    #: when it began
    started: str
    #: when it ended; null while it runs
    ended: str | None
    #: the exit status, if it had one
    exit: NotRequired[int]
    #: the signal that ended it, if one did
    signal: NotRequired[int]
    #: why it could not be executed
    error: NotRequired[str]
    #: true: its time was over
    timed_out: NotRequired[bool]
    #: the end of its output; not for readers
    stdout: NotRequired[str]
    #: the end of its errors; not for readers
    stderr: NotRequired[str]


class Details(TypedDict):
    """What the task's commands did."""
    #: the commands, in their order
    commands: list[Command]
    #: as beside the state
    reason: NotRequired[str]


class Task(TypedDict):
    """Everything about a task."""
    #: no two tasks have the same
    id: str
    #: the requester's name for it
    transid: str
    #: the command
    command: str
    #: the product; may be empty
    product: str
    #: the product's version
    version: NotRequired[str]
    #: the managed system
    targetmsn: NotRequired[str]
    #: the command's option
    optional: NotRequired[str]
    #: its text
    context: NotRequired[str]
    #: the universal agent's metafile
    uaconfig: NotRequired[str]
    #: its scripts
    uascript: NotRequired[str]
    state: TaskState
    #: when it was accepted
    accepted: str
    #: when it began
    started: str | None
    #: when it was over
    ended: str | None
    #: the user who asked for it
    asker: str
    #: true: somebody has cancelled it, and it is not over yet
    cancelling: NotRequired[bool]
    #: when it must have begun
    expires: NotRequired[str]
    #: why it ended as it did, where no row says so
    reason: NotRequired[str]
    #: the guard that refused it
    guard: NotRequired[str]
    #: that guard's way out
    hint: NotRequired[str]
    #: the host's run that handed it over
    run: NotRequired[int]
    #: the name of the machine's start in which that was
    boot: NotRequired[str]
    #: true: sent although the product is not there
    force: NotRequired[bool]
    #: unclean ends of the host that cut it off
    interruptions: NotRequired[int]
    #: the row that answered the request
    reply: dict[str, str | int] | None
    #: its outcomes, rows of KAGDYST
    events: list[dict[str, str | int] | None]
    #: What the task's commands did.
    details: Details


class Gap(TypedDict):
    """Events that the host does not keep any more."""
    #: how many; null if that is not known
    missing: int | None


class Overflow(TypedDict):
    """The reader was too slow."""
    #: how much is missing here: rows, or bytes of output
    lost: int


class TaskSummary(TypedDict):
    """What a list says of a task."""
    #: no two tasks have the same
    id: str
    #: the requester's name for it
    transid: str
    #: the command
    command: str
    #: the product; may be empty
    product: str
    #: the product's version
    version: NotRequired[str]
    #: the managed system
    targetmsn: NotRequired[str]
    #: the command's option
    optional: NotRequired[str]
    #: its text
    context: NotRequired[str]
    #: the universal agent's metafile
    uaconfig: NotRequired[str]
    #: its scripts
    uascript: NotRequired[str]
    state: TaskState
    #: when it was accepted
    accepted: str
    #: when it began
    started: str | None
    #: when it was over
    ended: str | None
    #: the user who asked for it
    asker: str
    #: true: somebody has cancelled it, and it is not over yet
    cancelling: NotRequired[bool]
    #: when it must have begun
    expires: NotRequired[str]
    #: why it ended as it did, where no row says so
    reason: NotRequired[str]
    #: the guard that refused it
    guard: NotRequired[str]
    #: that guard's way out
    hint: NotRequired[str]


class TaskList(TypedDict):
    """Some of the tasks."""
    #: the tasks, newest first
    tasks: list[TaskSummary]
    #: the cursor for what follows; null if nothing does
    next: int | None


class OutputPiece(TypedDict):
    """A piece of what a command writes."""
    #: where it came
    stream: Literal["stdout", "stderr"]
    #: the piece
    text: str


class OutputEnd(TypedDict):
    """Nothing more comes."""
    #: the task's state, if it is over
    state: TaskState


class Check(TypedDict):
    """What one check of the home and the machine found."""
    #: the check's name
    check: str
    #: error: a guarded host refuses to start
    result: Literal["ok", "warning", "error"]
    #: what was found
    text: str
    #: what to do; empty if there is nothing to do
    remedy: str


class Instance(TypedDict):
    """An instance of an agent that could run."""
    #: the product's code
    product: str
    #: its name; empty: the default instance
    instance: str
    #: the managed system name by which commands know it
    target: str
    #: missing: it was started, not stopped on request, and does not run
    state: Literal["running", "missing", "stopped"]
    #: who runs it, or would; null: it is stopped
    user: str | None
    #: its process; null unless it runs
    pid: int | None


class Instances(TypedDict):
    """What the home says of its agents."""
    #: by product and instance
    instances: list[Instance]


class Hang(TypedDict):
    """Why a host only seems to be alive."""
    #: what hangs
    part: Literal["command", "journal"]
    #: a sentence
    text: str


class Health(TypedDict):
    """What a host says about itself."""
    #: the product's version
    version: str
    #: the width of the process in bits
    width: Literal[32, 64]
    #: the home directory
    home: str
    #: the name of the node that the host stands for
    origin_node: str
    #: how long the host has been running
    uptime_seconds: int
    #: how many streams of events are open
    subscriptions: int
    #: whether guards look at requests
    guarded: bool
    #: the identity of the journal
    journal: str
    #: whether nothing hangs; if false, a watchdog would end the host
    alive: bool
    #: why it is not alive; empty if it is
    reasons: list[Hang]


class Reason(TypedDict):
    """Why a host does not carry out commands."""
    #: what is not ready
    part: Literal["plugin", "journal", "disk", "leftovers", "install"]
    #: a sentence
    text: str


class Ready(TypedDict):
    """Whether the host takes and carries out commands."""
    #: whether it does
    ready: bool
    #: why not; empty if it does
    reasons: list[Reason]


class Whoami(TypedDict):
    """Who a client is to the host, as the kernel knows it."""
    #: the user's name, or number if there is no name
    user: str
    #: the user
    uid: int
    #: the group
    gid: int
    #: the process that opened the connection
    pid: int
    #: what the client may do
    access: Literal["act", "read"]
    #: what gives it to him: root, the host's own user or a group
    reason: str


class Description(TypedDict):
    """An OpenAPI document."""
    #: the version of OpenAPI, 3.1.0
    openapi: str
    #: what is described, and its version
    info: dict[str, Any]
    #: where it is
    servers: list[dict[str, Any]]
    #: the requests by their paths
    paths: dict[str, Any]
    #: what several requests have in common
    components: dict[str, Any]


class DepotEntry(TypedDict):
    """An entry of a directory."""
    #: its name
    name: str
    #: the bytes of the name, percent-encoded, if it is not UTF-8
    escaped: NotRequired[str]
    #: what it is
    type: Literal["file", "directory", "link", "other"]
    #: its size; 0 for all but files
    bytes: int
    #: when it was changed
    modified: str


class DepotListing(TypedDict):
    """A directory of the depot, or one file."""
    #: what was asked for
    path: str
    #: the bytes of the name, percent-encoded, if it is not UTF-8
    escaped: NotRequired[str]
    #: what it is
    type: Literal["file", "directory", "link", "other"]
    #: in the order of their names; of a file its own
    entries: list[DepotEntry]
    #: false: there are more than 10,000 entries
    complete: bool


class DepotRemoval(TypedDict):
    """What has been removed."""
    #: the path
    removed: str
    #: the bytes of the name, percent-encoded, if it is not UTF-8
    escaped: NotRequired[str]


class DepotSum(TypedDict):
    """The checksum of a file, or why it has none."""
    #: the file
    path: str
    #: the bytes of the name, percent-encoded, if it is not UTF-8
    escaped: NotRequired[str]
    #: its size
    bytes: NotRequired[int]
    #: the checksum, 64 digits
    sha256: NotRequired[str]
    #: why there is none
    error: NotRequired[str]


class DepotSums(TypedDict):
    """Checksums of files."""
    #: in the order of the request
    files: list[DepotSum]


class DepotCheckedFile(TypedDict):
    """Whether the host would take one file."""
    #: its name to be
    path: str
    #: the bytes of the name, percent-encoded, if it is not UTF-8
    escaped: NotRequired[str]
    #: whether the host would take it
    taken: bool
    #: whether its line ends are converted
    converted: bool
    #: whether there is a file of that name
    replaces: bool
    #: why it would not be taken
    error: NotRequired[str]
    #: the guard that says so
    guard: NotRequired[str]
    #: the way out
    hint: NotRequired[str]


class DepotCheck(TypedDict):
    """Whether the host would take files."""
    #: whether guards look at transfers
    guarded: bool
    #: whether it would take all of them
    taken: bool
    #: the free space
    free_bytes: int
    #: what they would replace
    replaced_bytes: int
    #: in the order of the request
    files: list[DepotCheckedFile]
    #: why it would not be taken
    error: NotRequired[str]
    #: the guard that says so
    guard: NotRequired[str]
    #: the way out
    hint: NotRequired[str]


class Operations:
    """The requests of version 1.0.0, by the names of the operations."""

    def __init__(self, transport: Transport) -> None:
        self._transport = transport

    def get_tables(self) -> Tables:
        """The tables with their columns."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/tables", parameters)

    def post_query(
        self,
        table: str,
        *,
        where: list[Condition] | None = None,
        force: bool | None = None,
        journal: str | None = None,
    ) -> QueryAnswer:
        """Queries a table; on the request table, asks for a command.

        table: the name of the table
        where: conditions, all of which a row satisfies
        force: on the request table: true sends a command for a product that is not there
        journal: the journal that must be this host's
        """
        parameters: dict[str, Any] = {}
        body: dict[str, Any] = {}
        body["table"] = table
        body["where"] = where
        body["force"] = force
        body["journal"] = journal
        return self._transport.ask("POST", "/v1/query", parameters, body)

    def get_events(
        self,
        table: str,
        *,
        after: str | None = None,
        tasks: Literal[0, 1] | None = None,
        columns: dict[str, str] | None = None,
    ) -> Iterator[Event]:
        """Streams the rows of a table as they come.

        table: the name of the table
        after: of outcomes: the event after which to continue
        tasks: of outcomes: 1 sends the ends of tasks, too
        columns: any column of the table, with the value that it is to have
        The data of an event "message" is dict[str, str | int].
        The data of an event "task" is Task.
        The data of an event "gap" is Gap.
        The data of an event "overflow" is Overflow.
        """
        parameters: dict[str, Any] = {}
        parameters["table"] = table
        parameters["after"] = after
        parameters["tasks"] = tasks
        parameters.update(columns or {})
        return self._transport.stream("GET", "/v1/events", parameters)

    def post_tasks(
        self,
        *,
        command: str | None = None,
        product: str | None = None,
        version: str | None = None,
        targetmsn: str | None = None,
        optional: str | None = None,
        context: str | None = None,
        uaconfig: str | None = None,
        uascript: str | None = None,
        transid: str | None = None,
        once: bool | None = None,
        force: bool | None = None,
        expires: str | None = None,
        journal: str | None = None,
        refused: str | None = None,
        cancelled: str | None = None,
        expired: str | None = None,
        done: str | None = None,
    ) -> Task:
        """Accepts a command for its turn.

        command: the command; needed unless only recorded
        product: the product's code
        version: the product's version
        targetmsn: the managed system
        optional: the command's option
        context: its text
        uaconfig: the universal agent's metafile
        uascript: its scripts
        transid: the requester's name for it; else made up
        once: true: a repetition with the same transid gets the first one's task
        force: true sends a command for a product that is not there
        expires: it must have begun by then
        journal: the journal that must be this host's
        refused: why this never runs; recorded only
        cancelled: the same for one that was cancelled
        expired: the same for one that came too late
        done: what was done without the plug-in
        For those who may act.
        """
        parameters: dict[str, Any] = {}
        body: dict[str, Any] = {}
        body["command"] = command
        body["product"] = product
        body["version"] = version
        body["targetmsn"] = targetmsn
        body["optional"] = optional
        body["context"] = context
        body["uaconfig"] = uaconfig
        body["uascript"] = uascript
        body["transid"] = transid
        body["once"] = once
        body["force"] = force
        body["expires"] = expires
        body["journal"] = journal
        body["refused"] = refused
        body["cancelled"] = cancelled
        body["expired"] = expired
        body["done"] = done
        return self._transport.ask("POST", "/v1/tasks", parameters, body)

    def get_tasks(
        self,
        *,
        state: TaskState | None = None,
        product: str | None = None,
        command: str | None = None,
        since: str | None = None,
        after: int | None = None,
        limit: int | None = None,
        journal: str | None = None,
    ) -> TaskList:
        """Lists tasks, newest first.

        state: only those in this state
        product: only those for this product
        command: only those with this command
        since: only those accepted at this time or later
        after: only those behind this cursor
        limit: at most so many; 100 if not given
        journal: the journal that must be this host's
        """
        parameters: dict[str, Any] = {}
        parameters["state"] = state
        parameters["product"] = product
        parameters["command"] = command
        parameters["since"] = since
        parameters["after"] = after
        parameters["limit"] = limit
        parameters["journal"] = journal
        return self._transport.ask("GET", "/v1/tasks", parameters)

    def get_task(
        self,
        id: str,
        *,
        wait: int | None = None,
        journal: str | None = None,
    ) -> Task:
        """Tells everything about one task.

        id: the task's identifier, or a TRANSID
        wait: seconds to wait for the task's end
        journal: the journal that must be this host's
        """
        parameters: dict[str, Any] = {}
        parameters["wait"] = wait
        parameters["journal"] = journal
        return self._transport.ask("GET", f"/v1/tasks/{segment(id)}", parameters)

    def get_task_output(
        self,
        id: str,
        *,
        follow: Literal[0, 1] | None = None,
        after: str | None = None,
        journal: str | None = None,
    ) -> Iterator[Event]:
        """Streams what a task's commands write.

        id: the task's identifier, or a TRANSID
        follow: 1: goes on until the task is over
        after: the event after which to continue
        journal: the journal that must be this host's
        The data of an event "message" is OutputPiece.
        The data of an event "overflow" is Overflow.
        The data of an event "end" is OutputEnd.
        For those who may act.
        """
        parameters: dict[str, Any] = {}
        parameters["follow"] = follow
        parameters["after"] = after
        parameters["journal"] = journal
        return self._transport.stream("GET", f"/v1/tasks/{segment(id)}/output", parameters)

    def post_task_cancel(
        self,
        id: str,
        *,
        journal: str | None = None,
    ) -> Task:
        """Cancels a task.

        id: the task's identifier, or a TRANSID
        journal: the journal that must be this host's
        For those who may act.
        """
        parameters: dict[str, Any] = {}
        parameters["journal"] = journal
        return self._transport.ask("POST", f"/v1/tasks/{segment(id)}/cancel", parameters)

    def get_doctor(self) -> list[Check]:
        """Checks the home and the machine."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/doctor", parameters)

    def get_instances(self) -> Instances:
        """Which instances of agents run, and which should."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/instances", parameters)

    def get_health(self) -> Health:
        """What the host says about itself."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/health", parameters)

    def get_ready(self) -> Ready:
        """Whether the host takes and carries out commands, and why not."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/ready", parameters)

    def get_whoami(self) -> Whoami:
        """Who the client is to the host, and what he may do."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/whoami", parameters)

    def get_metrics(self) -> str:
        """What the host counts, for a monitoring system."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/metrics", parameters)

    def get_openapi(self) -> Description:
        """This interface, described for machines."""
        parameters: dict[str, Any] = {}
        return self._transport.ask("GET", "/v1/openapi.json", parameters)

    def get_depot(
        self,
        *,
        path: str | None = None,
    ) -> DepotListing:
        """What the depot holds.

        path: a directory or file; the depot if not given
        """
        parameters: dict[str, Any] = {}
        parameters["path"] = path
        return self._transport.ask("GET", "/v1/depot", parameters)

    def delete_depot(
        self,
        path: str,
        *,
        recursive: Literal[0, 1] | None = None,
    ) -> DepotRemoval:
        """Removes a file or a directory of the depot.

        path: what is to be removed
        recursive: 1: a directory with everything in it
        For those who may act.
        """
        parameters: dict[str, Any] = {}
        parameters["path"] = path
        parameters["recursive"] = recursive
        return self._transport.ask("DELETE", "/v1/depot", parameters)

    def get_depot_sum(
        self,
        path: list[str],
    ) -> DepotSums:
        """The SHA-256 of files of the depot.

        path: a file; may be given several times
        """
        parameters: dict[str, Any] = {}
        parameters["path"] = path
        return self._transport.ask("GET", "/v1/depot/sum", parameters)

    def get_depot_check(
        self,
        path: list[str],
        *,
        bytes: int | None = None,
    ) -> DepotCheck:
        """Whether the host would take files.

        path: the name to be; may be given several times
        bytes: the size of all of them together
        """
        parameters: dict[str, Any] = {}
        parameters["path"] = path
        parameters["bytes"] = bytes
        return self._transport.ask("GET", "/v1/depot/check", parameters)
