#!/usr/bin/env python3
"""Writes the client's operations from the description of the host's interface.

usage: generate.py docs/openapi.json zavhost/operations.py
"""

import json
import re
import sys
import textwrap

HEAD = '''"""The requests of the host's interface, one method each.

Made by generate.py from docs/openapi.json.
"""

from collections.abc import Iterator
from typing import Any, Literal, NotRequired, TypedDict

from .transport import Event, Transport, segment

'''

WIDTH = 100


def snake_case(name):
    return re.sub(r"(?<!^)([A-Z])", r"_\1", name).lower()


def sentence(text):
    text = text[0].upper() + text[1:]
    return text if text.endswith(".") else text + "."


def wrapped(text, indent):
    return textwrap.fill(text, WIDTH, initial_indent=indent, subsequent_indent=indent)


def commented(text, indent):
    return textwrap.fill(
        text, WIDTH, initial_indent=indent + "#: ", subsequent_indent=indent + "#: "
    )


def doc_comment(lines, indent):
    """A doc string of a first line and more lines."""
    if len(lines) == 1 and len(indent) + len(lines[0]) + 6 <= WIDTH:
        return [f'{indent}"""{lines[0]}"""']
    first = textwrap.wrap(lines[0], WIDTH - len(indent) - 3)
    body = [indent + '"""' + first[0]] + [indent + line for line in first[1:]]
    if len(lines) > 1:
        body.append("")
        body += [indent + line if line else "" for line in lines[1:]]
    return body + [indent + '"""']


class Types:
    """The classes of the documents, in an order in which each stands behind those that it names."""

    SIMPLE = {"string": "str", "integer": "int", "number": "float", "boolean": "bool"}

    def __init__(self, schemas):
        self.schemas = schemas
        self.texts = {}

    def of(self, schema):
        if "$ref" in schema:
            named = self.schemas[schema["$ref"].rsplit("/", 1)[1]]
            return self.choice(named) if "enum" in named else self.of(named)
        if "anyOf" in schema:
            # The other of an answer and an error is raised.
            kinds = [one for one in schema["anyOf"] if not one.get("$ref", "").endswith("/Error")]
            return " | ".join(self.of(one) for one in kinds)
        if "enum" in schema:
            return "Literal[" + ", ".join(json.dumps(value) for value in schema["enum"]) + "]"
        kinds = schema["type"] if isinstance(schema["type"], list) else [schema["type"]]
        return " | ".join(self.kind(kind, schema) for kind in kinds)

    def choice(self, schema):
        """A name for one of several values."""
        name = schema["title"]
        values = ",\n".join(f"    {json.dumps(value)}" for value in schema["enum"])
        self.texts[name] = f"#: {schema['description']}\n{name} = Literal[\n{values},\n]"
        return name

    def kind(self, kind, schema):
        if kind == "null":
            return "None"
        if kind == "array":
            return "list[" + self.of(schema["items"]) + "]" if "items" in schema else "list[Any]"
        if kind != "object":
            return self.SIMPLE[kind]
        if "properties" in schema:
            return self.document(schema)
        values = schema.get("additionalProperties")
        return f"dict[str, {self.of(values)}]" if values else "dict[str, Any]"

    def document(self, schema):
        name = schema["title"]
        if name in self.texts:
            return name
        lines = [f"class {name}(TypedDict):"]
        lines += doc_comment([schema["description"]], "    ")
        for member, shape in schema["properties"].items():
            kind = self.of(shape)
            if member not in schema.get("required", []):
                kind = f"NotRequired[{kind}]"
            # The code must stay readable whatever the shape is.
            if "description" in shape:
                lines.append(commented(shape["description"], "    "))
            lines.append(f"    {member}: {kind}")
        self.texts[name] = "\n".join(lines)
        return name


class Method:
    """One request as a method."""

    def __init__(self, path, verb, operation, types):
        self.path, self.verb, self.operation, self.types = path, verb.upper(), operation, types
        self.parameters = operation.get("parameters", [])
        content = operation.get("requestBody", {}).get("content", {})
        self.body = content.get("application/json", {}).get("schema")

    def in_path(self):
        return [one for one in self.parameters if one["in"] == "path"]

    def in_query(self):
        return [one for one in self.parameters if one["in"] == "query"]

    def arguments(self):
        """Names, types, whether they must be there, and their documentation."""
        for one in self.in_path() + self.in_query():
            kind = self.types.of(one["schema"])
            yield one["name"], kind, one.get("required", False), one["description"]
        if self.body:
            for name, schema in self.body["properties"].items():
                yield (
                    name,
                    self.types.of(schema),
                    name in self.body.get("required", []),
                    schema["description"],
                )

    def answers(self):
        """The contents of the answers that are no errors."""
        for answer in self.operation["responses"].values():
            yield from answer.get("content", {}).items()

    def result(self):
        kinds = []
        for media, content in self.answers():
            kind = "Iterator[Event]" if "x-events" in content else self.types.of(content["schema"])
            kinds += [kind] if kind not in kinds else []
        return " | ".join(kinds)

    def events(self):
        for _, content in self.answers():
            for name, schema in content.get("x-events", {}).items():
                yield name, self.types.of(schema)

    def signature(self):
        given = list(self.arguments())
        words = ["self"] + [f"{name}: {kind}" for name, kind, needed, _ in given if needed]
        rest = [f"{name}: {kind} | None = None" for name, kind, needed, _ in given if not needed]
        words += ["*"] + rest if rest else []
        name = snake_case(self.operation["operationId"])
        if len(words) == 1:
            return [f"    def {name}(self) -> {self.result()}:"]
        lines = [f"    def {name}("] + [f"        {word}," for word in words]
        return lines + [f"    ) -> {self.result()}:"]

    def documentation(self):
        lines = [self.operation["summary"]]
        for name, _, _, text in self.arguments():
            lines += textwrap.wrap(f"{name}: {text}", WIDTH - 8, subsequent_indent="    ")
        for name, kind in self.events():
            lines.append(f'The data of an event "{name}" is {kind}.')
        if self.operation["x-access"] == "act":
            lines.append("For those who may act.")
        return doc_comment(lines, "        ")

    def code(self):
        path = re.sub(r"{(\w+)}", r"{segment(\1)}", self.path)
        quoted = ('f"' if path != self.path else '"') + path + '"'
        lines = ["        parameters: dict[str, Any] = {}"]
        for one in self.in_query():
            if one.get("style") == "form":
                lines.append(f'        parameters.update({one["name"]} or {{}})')
            else:
                lines.append(f'        parameters["{one["name"]}"] = {one["name"]}')
        words = [f'"{self.verb}"', quoted, "parameters"]
        if self.body:
            lines.append("        body: dict[str, Any] = {}")
            lines += [f'        body["{name}"] = {name}' for name in self.body["properties"]]
            words.append("body")
        call = "stream" if self.result() == "Iterator[Event]" else "ask"
        return lines + [f"        return self._transport.{call}({', '.join(words)})"]

    def text(self):
        return "\n".join(self.signature() + self.documentation() + self.code())


def generated(description):
    types = Types(description["components"]["schemas"])
    methods = [
        Method(path, verb, operation, types)
        for path, verbs in description["paths"].items()
        for verb, operation in verbs.items()
    ]
    texts = [method.text() for method in methods]
    version = description["info"]["version"]
    start = [
        "class Operations:",
        f'    """The requests of version {version}, by the names of the operations."""',
        "",
        "    def __init__(self, transport: Transport) -> None:",
        "        self._transport = transport",
    ]
    classes = "\n\n\n".join(types.texts.values())
    return HEAD + "\n" + classes + "\n\n\n" + "\n".join(start) + "\n\n" + "\n\n".join(texts) + "\n"


def main():
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    with open(sys.argv[1], encoding="utf-8") as source:
        text = generated(json.load(source))
    with open(sys.argv[2], "w", encoding="utf-8") as target:
        target.write(text)


if __name__ == "__main__":
    main()
