#!/usr/bin/env python3
"""Writes docs/api.md and docs/fleet-api.md, the descriptions of the interfaces for readers.

usage: scripts/api_page.py docs/openapi.json docs/api.md
       scripts/api_page.py docs/fleet-openapi.json docs/fleet-api.md
"""

import json
import sys

# By the titles of what is described.
HEADS = {
    "zavhost": """# The host's interface, request by request

Made by `scripts/api_page.py` from [openapi.json](openapi.json), which a host gives as
`GET /v1/openapi.json`. [http.md](http.md) explains the requests, with examples.
""",
    "zavfleetd": """# The centre's interface, request by request

Made by `scripts/api_page.py` from [fleet-openapi.json](fleet-openapi.json), which the centre of a
fleet gives as `GET /v1/openapi.json`. [fleet.md](fleet.md) tells what a fleet is.
""",
}
ACCESS = {
    "zavhost": {"read": "Everybody whom the host serves may ask.", "act": "Readers may not ask."},
    "zavfleetd": {
        "none": "It needs no session of an operator.",
        "read": "Every operator may ask.",
        "act": "Viewers may not ask.",
    },
}


def anchor(title):
    return title.lower()


def kind_of(schema):
    """The type in words, with a link to what has a section of its own."""
    if "$ref" in schema:
        name = schema["$ref"].rsplit("/", 1)[1]
        return f"[{name}](#{anchor(name)})"
    if "anyOf" in schema:
        return " or ".join(kind_of(one) for one in schema["anyOf"])
    if "enum" in schema:
        return " or ".join(f"`{json.dumps(value)}`" for value in schema["enum"])
    if "properties" in schema and "title" in schema:
        return f"[{schema['title']}](#{anchor(schema['title'])})"
    kinds = schema["type"] if isinstance(schema["type"], list) else [schema["type"]]
    if "array" in kinds and "items" in schema:
        return "list of " + kind_of(schema["items"])
    return " or ".join(kinds)


def table(head, rows):
    lines = ["| " + " | ".join(head) + " |", "|---" * len(head) + "|"]
    for row in rows:
        lines.append("| " + " | ".join(cell.replace("|", "\\|") for cell in row) + " |")
    return lines


def members(schema):
    """The properties of an object as rows."""
    for name, shape in schema["properties"].items():
        needed = "yes" if name in schema.get("required", []) else ""
        yield f"`{name}`", kind_of(shape), needed, shape.get("description", "")


def nested(schema):
    """The objects below a schema that have names but stand in no list of components."""
    below = list(schema.get("properties", {}).values())
    below += [schema["items"]] if "items" in schema else []
    for shape in below:
        if "title" in shape and "properties" in shape:
            yield shape
        yield from nested(shape)


def answers_of(operation):
    errors = []
    for status, answer in operation["responses"].items():
        if "$ref" in answer:
            errors.append(f"[{status}](#errors)")
            continue
        for media, content in answer["content"].items():
            what = kind_of(content["schema"]) if media == "application/json" else f"`{media}`"
            yield status, answer["description"], what
            for name, shape in content.get("x-events", {}).items():
                yield "", f"event `{name}`", kind_of(shape)
    yield ", ".join(errors), "an error", "[Error](#error)"


def operation_lines(path, verb, operation, access):
    about = f"{operation['summary']} {access[operation['x-access']]}"
    name = f"Operation: `{operation['operationId']}`."
    lines = [f"## {verb.upper()} {path}", "", f"{about} {name}", ""]
    rows = []
    for one in operation.get("parameters", []):
        needed = "yes" if one.get("required") else ""
        kind = kind_of(one["schema"])
        rows.append((f"`{one['name']}`", one["in"], kind, needed, one["description"]))
    if rows:
        lines += table(("Parameter", "In", "Type", "Required", "Meaning"), rows) + [""]
    if "requestBody" in operation:
        body = operation["requestBody"]["content"]["application/json"]["schema"]
        lines += table(("Member of the body", "Type", "Required", "Meaning"), members(body)) + [""]
    return lines + table(("Status", "Answer", "Type"), answers_of(operation)) + [""]


def schema_lines(name, schema):
    lines = [f"### {name}", "", schema["description"], ""]
    if "properties" in schema:
        lines += table(("Member", "Type", "Always there", "Meaning"), members(schema)) + [""]
        others = schema.get("additionalProperties")
        if others:
            lines += [f"Further members: {others['description']}.", ""]
    else:
        lines += [f"Type: {kind_of(schema)}.", ""]
    return lines


def page(description):
    title = description["info"]["title"]
    lines = [HEADS[title], description["info"]["description"], ""]
    lines += [f"Version {description['info']['version']}.", ""]
    for path, verbs in description["paths"].items():
        for verb, operation in verbs.items():
            lines += operation_lines(path, verb, operation, ACCESS[title])
    responses = description["components"]["responses"].items()
    lines += ["## Errors", "", "Each is an [Error](#error).", ""]
    lines += table(("Status", "When"), [(status, one["description"]) for status, one in responses])
    lines += ["", "## Documents", ""]
    schemas = dict(description["components"]["schemas"])
    for schema in list(schemas.values()):
        schemas.update((one["title"], one) for one in nested(schema))
    for name in sorted(schemas):
        lines += schema_lines(name, schemas[name])
    return "\n".join(lines)


def main():
    if len(sys.argv) != 3:
        sys.exit(__doc__)
    with open(sys.argv[1], encoding="utf-8") as source:
        text = page(json.load(source))
    with open(sys.argv[2], "w", encoding="utf-8") as target:
        target.write(text)


if __name__ == "__main__":
    main()
