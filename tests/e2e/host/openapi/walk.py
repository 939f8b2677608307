#!/usr/bin/env python3
"""Calls every operation of a host with good and bad input, and compares what it answers with the
description that it gives of itself.

usage: walk.py SOCKET HOME GATE [READERS]

The agents of the home wait for the file GATE if their product is px. At most two tasks may wait in
the host. Members of the group READERS may read; without it nobody is asked about that.
"""

import grp
import json
import os
import pwd
import sys

import jsonschema
from answers import Walk

# What is described and cannot be brought about from outside, or only in half a minute.
NOT_PROVOKED = {
    ("postTaskCancel", "202"),
    ("postTasks", "404"),
    ("deleteDepot", "409"),
    ("getEvents", "overflow"),
    ("getTaskOutput", "overflow"),
}
# Members that only such answers have, or hosts that were killed, or requests.
NOT_SEEN = {
    ("Condition", "column"),
    ("Condition", "op"),
    ("Condition", "value"),
    ("Command", "error"),
    ("Command", "timed_out"),
    ("CommandWarning", "error"),
    ("CommandWarning", "signal"),
    ("CommandWarning", "timed_out"),
    ("DepotSum", "escaped"),
    ("DepotCheckedFile", "guard"),
    ("DepotCheckedFile", "escaped"),
    ("FullText", "row"),
    ("FullText", "column"),
    ("FullText", "text"),
    ("FullText", "complete"),
    ("QueryAnswer", "full"),
    ("Overflow", "lost"),
    ("Hang", "part"),
    ("Hang", "text"),
    ("Reason", "part"),
    ("Reason", "text"),
    ("Task", "cancelling"),
    ("TaskSummary", "cancelling"),
    ("Task", "interruptions"),
}
# Of every operation: where they come from is the server, which knows no operations.
OF_THE_SERVER = {"413", "500", "501", "503"}


def condition(column, value):
    return {"column": column, "op": "=", "value": value}


def check_description(walk):
    """What no answer shows."""
    for reference in walk.description.references():
        walk.description.resolve(reference)
    for schema in walk.description.schemas.values():
        jsonschema.Draft202012Validator.check_schema(schema)
    for path, _, operation in walk.description.operations.values():
        named = {one["name"] for one in operation.get("parameters", []) if one["in"] == "path"}
        assert named == {part[1:-1] for part in path.split("/") if part.startswith("{")}, path


def ask_for_what_there_is(walk):
    for name in ("getTables", "getHealth", "getReady", "getWhoami", "getOpenapi", "getDoctor"):
        walk.ask(name, 200)
    assert "# TYPE zavhost_tasks_total counter" in walk.ask("getMetrics", 200)


def list_instances(walk, home):
    program = f"{home}/bin/instances"
    walk.ask("getInstances", 404)
    with open(program, "w", encoding="ascii") as script:
        script.write("#!/bin/sh\nprintf 'ux\\t\\troot\\trunning\\t17\\num\\t\\t\\tstopped\\t\\n'\n")
    os.chmod(program, 0o755)
    assert len(walk.ask("getInstances", 200)["instances"]) == 2


def look_into_the_depot(walk):
    odd = b"ux/od\xffd"
    walk.ask("getDepot", 200)
    walk.ask("getDepot", 200, query=[("path", "ux/7.1/notes")])
    walk.ask("getDepot", 200, query=[("path", "ux")])
    walk.ask("getDepot", 200, query=[("path", odd)])
    walk.ask("getDepot", 404, query=[("path", "none")])
    walk.ask("getDepot", 400, query=[("path", "../home")])
    walk.ask("getDepotSum", 200, query=[("path", "ux/7.1/notes"), ("path", "none")])
    files = [("path", "ux/a.tar"), ("path", "../b"), ("path", "ux/7.1")]
    walk.ask("getDepotCheck", 200, query=files)
    walk.ask("getDepotCheck", 200, query=[("path", "ux/b"), ("bytes", 10**17)])
    walk.ask("deleteDepot", 404, query=[("path", "none")])
    walk.ask("deleteDepot", 400, query=[("path", "ux")])
    walk.ask("deleteDepot", 200, query=[("path", odd)])
    walk.ask("deleteDepot", 200, query=[("path", "ux/7.1"), ("recursive", 1)])


def query(walk, home):
    inventory = {"table": "KINAGT", "where": [condition("PRODUCT", "ux")]}
    assert len(walk.ask("postQuery", 200, body=inventory)["rows"]) == 1
    os.rename(f"{home}/list.txt", f"{home}/hidden.txt")
    walk.ask("postQuery", 200, body=inventory)
    os.rename(f"{home}/hidden.txt", f"{home}/list.txt")
    start = [condition("COMMAND", "START"), condition("TRANSID", "walk-query")]
    asked = {"table": "KAGREQT", "where": start + [condition("PRODUCT", "ux")]}
    assert walk.ask("postQuery", 200, body=asked)["rows"][0]["RETVAL"] == 0
    unknown = {"table": "KAGREQT", "where": start + [condition("PRODUCT", "zz")]}
    walk.ask("postQuery", 409, body=unknown)
    walk.ask("postQuery", 404, body={"table": "NONE"})
    walk.ask("postQuery", 400, body={"table": "KINAGT", "where": [{"column": "PRODUCT"}]})
    walk.ask("getTask", 200, {"id": "walk-query"}, [("wait", 60)])


def run_tasks(walk):
    body = {"command": "START", "product": "ux", "transid": "walk-1", "once": True, "force": True}
    task = walk.ask("postTasks", 202, body=body)
    assert walk.ask("postTasks", 202, body=body)["id"] == task["id"]
    walk.ask("postTasks", 409, body=dict(body, product="px"))
    unknown = {"command": "START", "product": "zz", "transid": "walk-2", "once": True}
    assert walk.ask("postTasks", 409, body=unknown)["guard"] == "product"
    assert walk.ask("getTask", 200, {"id": "walk-2"})["state"] == "refused"
    columns = ("version", "targetmsn", "optional", "context", "uaconfig", "uascript")
    every = dict.fromkeys(columns, "v")
    refusal = dict(every, command="START", product="ux", transid="walk-3", once=True, refused="why")
    assert walk.ask("postTasks", 202, body=refusal)["state"] == "refused"
    late = {"command": "START", "product": "ux", "expires": "2020-01-31T12:00:00Z"}
    late = walk.ask("postTasks", 202, body=late)
    assert walk.ask("getTask", 200, {"id": task["id"]}, [("wait", 60)])["state"] == "done"
    assert walk.ask("getTask", 200, {"id": late["id"]}, [("wait", 60)])["state"] == "expired"
    assert list(walk.events("getTaskOutput", {"id": task["id"]}))[-1] == ("end", {"state": "done"})
    for operation in ("getTask", "getTaskOutput", "postTaskCancel"):
        walk.ask(operation, 404, {"id": "none"})
    walk.ask("postTaskCancel", 409, {"id": task["id"]})
    walk.ask("postQuery", 200, body={"table": "KINAGT"})


def cancel_tasks(walk, gate):
    """One task runs, and as many wait as may."""
    body = {"command": "START", "product": "px"}
    running = walk.ask("postTasks", 202, body=body)
    while not running["details"]["commands"]:
        running = walk.ask("getTask", 200, {"id": running["id"]}, [("wait", 1)])
        assert running["state"] in ("queued", "running"), running
    output = walk.events("getTaskOutput", {"id": running["id"]}, [("follow", 1)])
    waiting = [walk.ask("postTasks", 202, body=body) for _ in range(2)]
    walk.ask("postTasks", 429, body=body)
    walk.ask("getTasks", 200)
    for task in waiting:
        assert walk.ask("postTaskCancel", 200, {"id": task["id"]})["state"] == "cancelled"
    assert walk.ask("postTaskCancel", 200, {"id": running["id"]})["state"] == "cancelled"
    assert list(output)[-1] == ("end", {"state": "cancelled"})
    with open(gate, "w", encoding="ascii"):
        pass


def list_tasks(walk):
    page = walk.ask("getTasks", 200, query=[("limit", 1)])
    walk.ask("getTasks", 200, query=[("after", page["next"])])
    for state in walk.description.schemas["TaskState"]["enum"]:
        walk.ask("getTasks", 200, query=[("state", state)])
    walk.ask("getTasks", 200, query=[("since", "2020-01-31T12:00:00Z"), ("product", "ux")])
    walk.ask("getTasks", 400, query=[("since", "yesterday")])


def read_events(walk):
    elsewhere = ("after", "0123456789abcdef-7")
    stream = walk.events("getEvents", query=[("table", "KAGDYST"), ("tasks", 1), elsewhere])
    wanted = {"gap", "message", "task"}
    for name, _ in stream:
        wanted.discard(name)
        if not wanted:
            break
    stream.close()
    walk.ask("getEvents", 404, query=[("table", "NONE")])


def complete(operation):
    """Input that is good as far as types go, with what must be there only."""
    query = [
        (one["name"], "x")
        for one in operation.get("parameters", [])
        if one["in"] == "query" and one.get("required")
    ]
    content = operation.get("requestBody", {}).get("content", {})
    schema = content.get("application/json", {}).get("schema", {})
    return query, {name: "x" for name in schema.get("required", [])}, schema


def values_of(operation):
    return {one["name"]: "x" for one in operation.get("parameters", []) if one["in"] == "path"}


def misuse_parameters(walk, name, operation):
    values, (query, body, _) = values_of(operation), complete(operation)
    body = body or None

    def refuse(wrong, status=400):
        walk.ask(name, status, values, wrong, body)

    parameters = [one for one in operation.get("parameters", []) if one["in"] == "query"]
    refuse(query + [("no-such-parameter", "1")], 404 if name == "getEvents" else 400)
    for one in parameters:
        rest = [pair for pair in query if pair[0] != one["name"]]
        schema = walk.description.resolve(one["schema"])
        if one.get("required"):
            refuse(rest)
        if schema["type"] == "integer":
            refuse(rest + [(one["name"], "-1")])
            refuse(rest + [(one["name"], "many")])
        if "enum" in schema and name != "getEvents":
            refuse(rest + [(one["name"], "another")])
        if schema["type"] not in ("array", "object"):
            refuse(rest + [(one["name"], "1"), (one["name"], "1")])
    if any(one["name"] == "journal" for one in operation.get("parameters", [])):
        refuse(query + [("journal", "another")], 412)


def misuse_body(walk, name, operation):
    values, (query, body, schema) = values_of(operation), complete(operation)
    if not schema:
        return
    for wrong in ("", "{", "[]", "1", '{"a": {"b": {"c": {"d": {"e": 1}}}}}'):
        walk.ask(name, 400, values, query, wrong)
    walk.ask(name, 400, values, query, dict(body, **{"no-such-member": 1}))
    for member in schema.get("required", []):
        walk.ask(name, 400, values, query, {key: body[key] for key in body if key != member})
    for member in schema["properties"]:
        walk.ask(name, 400, values, query, dict(body, **{member: None}))
    walk.ask(name, 412, values, query, dict(body, journal="another"))


def misuse_methods(walk):
    for path, methods in walk.description.document["paths"].items():
        status, headers, text = walk.exchange("PATCH", path)
        assert status == 405, text
        expected = {method.upper() for method in methods}
        expected |= {"HEAD"} if "get" in methods else set()
        assert set(headers["Allow"].split(", ")) == expected, path
        name = next(iter(methods.values()))["operationId"]
        error = walk.description.document["components"]["responses"]["405"]
        walk.compare(json.loads(text), error["content"]["application/json"]["schema"], name)


def misuse_the_server(walk):
    """These errors come before anybody knows which operation is meant."""
    big = b"x" * (2 << 20)
    for status, headers, body in (
        (413, {"Content-Length": str(len(big))}, b""),
        (501, {"Transfer-Encoding": "gzip"}, b""),
    ):
        found, answer, text = walk.exchange("POST", "/v1/query", body, headers)
        assert found == status, text
        walk.judge("postQuery", status, answer, text, "the server")


def ask_as_reader(walk, group):
    """In a process of its own, which is no more than a member of the group."""
    child = os.fork()
    if child == 0:
        try:
            os.setgroups([grp.getgrnam(group).gr_gid])
            user = pwd.getpwnam("nobody")
            os.setgid(user.pw_gid)
            os.setuid(user.pw_uid)
            for name, (_, _, operation) in walk.description.operations.items():
                if operation["x-access"] == "act":
                    query, body, _ = complete(operation)
                    walk.ask(name, 403, values_of(operation), query, body or None)
            assert walk.ask("getWhoami", 200)["access"] == "read"
            for task in walk.ask("getTasks", 200)["tasks"]:
                commands = walk.ask("getTask", 200, {"id": task["id"]})["details"]["commands"]
                assert not any("stdout" in command for command in commands)
            walk.ask("postQuery", 403, body={"table": "KAGREQT"})
        except BaseException as error:
            print(f"as a reader: {error}", file=sys.stderr, flush=True)
            os._exit(1)
        os._exit(0)
    assert os.waitpid(child, 0)[1] == 0


def expect_everything_seen(walk):
    described = set()
    for name, (_, _, operation) in walk.description.operations.items():
        described |= {(name, status) for status in operation["responses"]}
        if operation["x-access"] == "read":
            described.discard((name, "403"))
        for answer in operation["responses"].values():
            for content in answer.get("content", {}).values():
                described |= {(name, event) for event in content.get("x-events", {})}
    described = {one for one in described if one[1] not in OF_THE_SERVER and one[1] != "403"}
    missing = described - walk.statuses - NOT_PROVOKED
    assert not missing, f"not provoked: {sorted(missing)}"
    members = set()
    for schema in titled(walk.description.schemas):
        members |= {(schema["title"], name) for name in schema["properties"]}
    missing = members - walk.members - NOT_SEEN
    assert not missing, f"never seen: {sorted(missing)}"


def titled(thing):
    """All objects with names, wherever they stand."""
    if isinstance(thing, dict) and "title" in thing and isinstance(thing.get("properties"), dict):
        yield thing
    for part in thing.values() if isinstance(thing, dict) else thing:
        if isinstance(part, (dict, list)):
            yield from titled(part)


def main():
    path, home, gate, *readers = sys.argv[1:]
    walk = Walk(path)
    check_description(walk)
    ask_for_what_there_is(walk)
    list_instances(walk, home)
    look_into_the_depot(walk)
    query(walk, home)
    run_tasks(walk)
    cancel_tasks(walk, gate)
    list_tasks(walk)
    read_events(walk)
    for name, (_, _, operation) in walk.description.operations.items():
        misuse_parameters(walk, name, operation)
        misuse_body(walk, name, operation)
    misuse_methods(walk)
    misuse_the_server(walk)
    if readers:
        ask_as_reader(walk, readers[0])
    expect_everything_seen(walk)
    print(f"{len(walk.statuses)} answers of {len(walk.description.operations)} operations")


if __name__ == "__main__":
    main()
