"""docs/openapi.yaml as something that answers are compared with."""

import json
import re

import jsonschema
import yaml

METHODS = ("get", "post", "put", "delete", "options", "head", "patch")


class Description:
    """The paths, answers and schemas of the file. It notes which answers were seen."""

    def __init__(self, path):
        self.text = yaml.safe_load(path.read_text(encoding="utf-8"))
        self.seen = set()

    def resolved(self, node):
        """The node, or what its $ref names."""
        while "$ref" in node:
            target = self.text
            for part in node["$ref"].removeprefix("#/").split("/"):
                target = target[part]
            node = target
        return node

    def schema(self, node):
        """A schema of JSON: without $ref, and with null among the types where it is allowed."""
        node = dict(self.resolved(node))
        if node.pop("nullable", False):
            node["type"] = [node["type"], "null"]
        for name in ("properties",):
            if name in node:
                node[name] = {key: self.schema(value) for key, value in node[name].items()}
        if "items" in node:
            node["items"] = self.schema(node["items"])
        return node

    def template_of(self, path):
        """The path of the file that a path of a request belongs to; None when there is none."""
        path = path.split("?")[0]
        for template in self.text["paths"]:
            pattern = re.sub(r"\{track\}", r"[^/]+", template)
            if re.fullmatch(pattern, path):
                return template
        return None

    def promised(self):
        """Every method, path and status of the file."""
        return {(method, template, int(status))
                for template, item in self.text["paths"].items()
                for method in METHODS if method in item
                for status in item[method]["responses"]}

    def answer(self, method, path, status):
        """What the file says of an answer; fails when it says nothing."""
        template = self.template_of(path)
        method = "GET" if method == "HEAD" else method
        own = self.text["paths"].get(template, {}).get(method.lower(), {}).get("responses", {})
        if str(status) in own:
            self.seen.add((method.lower(), template, status))
            return self.resolved(own[str(status)])
        anywhere = self.text["x-anywhere"]
        assert str(status) in anywhere, f"{method} {path}: {status} is not documented"
        return self.resolved(anywhere[str(status)])

    def check(self, method, path, status, headers, body):
        """Fails unless the answer is one that the file describes."""
        promised = self.answer(method, path, status)
        where = f"{method} {path}: {status}"
        for name, header in promised.get("headers", {}).items():
            header = self.resolved(header)
            assert headers[name] is not None or not header.get("required"), f"{where}: no {name}"
            if headers[name] is not None:
                fits(headers[name], header["schema"], f"{where}, {name}")
        if method == "HEAD" or status in (204, 304):
            assert body == b"", where
            return None
        kinds = promised.get("content", {})
        kind = headers.get_content_type()
        assert kind in kinds, f"{where}: {kind} instead of {list(kinds)}"
        if kind != "application/json":
            return body
        value = json.loads(body)
        fits(value, self.schema(kinds[kind]["schema"]), where)
        return value


def fits(value, schema, where):
    """Fails with a sentence when a value is not as its schema says."""
    complaints = list(jsonschema.Draft7Validator(schema).iter_errors(value))
    assert not complaints, f"{where}: " + "; ".join(
        f"{list(complaint.path)}: {complaint.message}" for complaint in complaints)
