"""Answers of a host, compared with the description that it gives of itself."""

import copy
import http.client
import json
import re
import socket
from urllib.parse import quote_from_bytes

import jsonschema

TIME = re.compile(r"\d{4}-\d\d-\d\dT\d\d:\d\d:\d\d(\.\d+)?Z")
FORMATS = jsonschema.FormatChecker(formats=())
FORMATS.checks("date-time")(lambda text: not isinstance(text, str) or bool(TIME.fullmatch(text)))


class Connection(http.client.HTTPConnection):
    def __init__(self, path):
        super().__init__("localhost", timeout=120)
        self.path = path

    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX)
        self.sock.settimeout(self.timeout)
        self.sock.connect(self.path)


def encoded(text):
    return quote_from_bytes(text if isinstance(text, bytes) else str(text).encode(), safe="")


def closed(schema):
    """The schema without room for members that it does not name: nothing may go undescribed."""
    schema = copy.deepcopy(schema)
    if isinstance(schema, dict):
        schema = {key: closed(value) for key, value in schema.items()}
        if isinstance(schema.get("properties"), dict):
            schema["additionalProperties"] = False
    elif isinstance(schema, list):
        schema = [closed(value) for value in schema]
    return schema


class Description:
    def __init__(self, document):
        self.document = document
        self.schemas = closed(document["components"]["schemas"])
        self.operations = {
            operation["operationId"]: (path, method, operation)
            for path, methods in document["paths"].items()
            for method, operation in methods.items()
        }

    def resolve(self, thing):
        while "$ref" in thing:
            target = self.document
            for step in thing["$ref"].removeprefix("#/").split("/"):
                target = target[step]
            thing = target
        return thing

    def references(self, thing=None):
        thing = self.document if thing is None else thing
        if isinstance(thing, dict) and isinstance(thing.get("$ref"), str):
            yield thing
        parts = thing.values() if isinstance(thing, dict) else thing
        for part in parts:
            if isinstance(part, (dict, list)):
                yield from self.references(part)

    def validate(self, value, schema):
        whole = dict(closed(schema), components={"schemas": self.schemas})
        jsonschema.Draft202012Validator(whole, format_checker=FORMATS).validate(value)


class Walk:
    """Asks, and insists that each answer is as the description says. Notes what it has seen."""

    def __init__(self, path):
        self.path = path
        status, _, text = self.exchange("GET", "/v1/openapi.json")
        assert status == 200, text
        self.description = Description(json.loads(text))
        self.statuses = set()  # operations with the statuses that they gave
        self.members = set()  # titles of schemas with the members that were there

    def exchange(self, method, target, body=None, headers=None):
        connection = Connection(self.path)
        try:
            connection.request(method, target, body, headers or {})
            response = connection.getresponse()
            return response.status, response.headers, response.read()
        finally:
            connection.close()

    def target(self, name, values, query):
        path = self.description.operations[name][0]
        for key, value in values.items():
            path = path.replace("{" + key + "}", encoded(value))
        pairs = [f"{encoded(key)}={encoded(value)}" for key, value in query]
        return path + ("?" + "&".join(pairs) if pairs else "")

    def ask(self, name, expected, values=None, query=(), body=None):
        """The document that answers the operation."""
        method = self.description.operations[name][1].upper()
        content = json.dumps(body) if isinstance(body, (dict, list)) else body
        target = self.target(name, values or {}, query)
        status, headers, text = self.exchange(method, target, content)
        where = f"{method} {target} {content or ''}"
        assert status == expected, f"{where}: {status} instead of {expected}: {text[:500]}"
        return self.judge(name, status, headers, text, where)

    def judge(self, name, status, headers, text, where):
        operation = self.description.operations[name][2]
        assert str(status) in operation["responses"], f"{where}: {status} is not described: {text}"
        answer = self.description.resolve(operation["responses"][str(status)])
        kind = headers.get("Content-Type", "").split(";")[0]
        assert kind in answer["content"], f"{where}: the type {kind} is not described"
        # Of 503 the host does not always know.
        assert status != 429 or int(headers["Retry-After"]) > 0, f"{where}: ask again when?"
        self.statuses.add((name, str(status)))
        if kind != "application/json":
            return text.decode()
        document = json.loads(text)
        schema = answer["content"][kind]["schema"]
        self.compare(document, schema, where)
        return document

    def compare(self, document, schema, where):
        try:
            self.description.validate(document, schema)
        except jsonschema.ValidationError as error:
            raise AssertionError(f"{where}: {error}") from error
        self.note(document, schema)

    def note(self, value, schema):
        schema = self.description.resolve(schema)
        for one in schema.get("anyOf", ()):
            if not isinstance(value, dict) or set(value) <= set(
                self.description.resolve(one).get("properties", value)
            ):
                self.note(value, one)
        if isinstance(value, list):
            for one in value:
                self.note(one, schema.get("items", {}))
        if isinstance(value, dict):
            for name, shape in schema.get("properties", {}).items():
                if name in value:
                    self.members.add((schema["title"], name))
                    self.note(value[name], shape)

    def events(self, name, values=None, query=()):
        """The events of a stream, until the reader has had enough or the host ends it."""
        method = self.description.operations[name][1].upper()
        target = self.target(name, values or {}, query)
        connection = Connection(self.path)
        connection.request(method, target)
        response = connection.getresponse()
        assert response.status == 200, f"{target}: {response.read()}"
        answer = self.description.operations[name][2]["responses"]["200"]
        shapes = answer["content"]["text/event-stream"]["x-events"]
        self.statuses.add((name, "200"))
        event = "message"
        try:
            for raw in iter(response.readline, b""):
                key, _, value = raw.decode().rstrip("\n").partition(": ")
                if key == "event":
                    event = value
                elif key == "data":
                    document = json.loads(value)
                    assert event in shapes, f"{target}: the event {event} is not described"
                    self.compare(document, shapes[event], f"{target}: {event}")
                    self.statuses.add((name, event))
                    yield event, document
                    event = "message"
        finally:
            response.close()
            connection.close()
