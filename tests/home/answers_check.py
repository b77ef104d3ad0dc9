#!/usr/bin/python3
"""answers_check.py URL TOKEN: holds every row's requests and answers against the schemas of the server's /openapi.json.

Each row is called with its examples in the document, which must succeed, without parameters, and with each parameter of another
type or left out. What an answer says must be described: here, and here only, no object may have members that its schema
does not name.
"""
import copy
import json
import sys
import time
import urllib.error
import urllib.request

import jsonschema

URL, TOKEN = sys.argv[1], sys.argv[2]
HEADERS = {"Content-Type": "application/json", "Authorization": f"Bearer {TOKEN}"}
WRONG = (None, True, 7, "no such text", [], [[]], {}, [1, "a"])
LAST = "/webapi/VORN.Core.Network.Router.Topology/1/set"  # the home is another one then
failures = 0
checked = 0


def check(done, text):
    global failures, checked
    checked += 1
    if not done:
        failures += 1
        if failures <= 20:
            print(f"FAIL {text}")


def ask(path, body=None, headers=None, method="POST"):
    request = urllib.request.Request(URL + path, data=body, method=method, headers=HEADERS if headers is None else headers)
    opener = urllib.request.build_opener(urllib.request.ProxyHandler({}))
    try:
        with opener.open(request, timeout=60) as answer:
            return answer.status, json.loads(answer.read())
    except urllib.error.HTTPError as answer:
        return answer.code, json.loads(answer.read())


def closed(schema):
    """The schema with every described object closed to what it does not name."""
    if isinstance(schema, list):
        return [closed(each) for each in schema]
    if not isinstance(schema, dict):
        return schema
    made = {name: closed(each) for name, each in schema.items()}
    if isinstance(schema.get("properties"), dict):
        made["properties"] = {name: closed(each) for name, each in schema["properties"].items()}
        made.setdefault("additionalProperties", False)
    return made


class Checker:
    def __init__(self, document):
        self.document = document
        self.components = closed(document["components"])

    def fault(self, schema, value):
        whole = {**closed(schema), "components": self.components}
        error = jsonschema.exceptions.best_match(jsonschema.Draft202012Validator(whole).iter_errors(value))
        return None if error is None else f"{'/'.join(map(str, error.absolute_path))}: {error.message}"[:600]

    def response(self, operation, status):
        response = operation["responses"].get(str(status), operation["responses"]["default"])
        if "$ref" in response:
            response = self.document["components"]["responses"][response["$ref"].rsplit("/", 1)[1]]
        return response["content"]["application/json"]["schema"]


def variants(parameters, schema):
    yield {}
    for name in schema.get("properties", {}):
        for wrong in WRONG:
            yield {**parameters, name: wrong}
        without = copy.deepcopy(parameters)
        without.pop(name, None)
        yield without


def call(checker, path, operation, parameters, what):
    status, answer = ask(path, json.dumps(parameters).encode())
    fault = checker.fault(checker.response(operation, status), answer)
    check(fault is None, f"{path} {what}: {status} {json.dumps(answer)[:300]}\n     {fault}")
    return status, answer


def check_examples(checker, path, operation):
    """Requests against the request's schema; they succeed, and their answers are as described."""
    schema = operation["requestBody"]["content"]["application/json"]["schema"]
    check(bool(schema.get("examples")), f"{path} has no example")
    for example in schema.get("examples", []):
        fault = checker.fault(schema, example)
        check(fault is None, f"{path} the example {json.dumps(example)[:200]} is not of its schema: {fault}")
        status, answer = call(checker, path, operation, example, "with its example")
        check(status == 200 and answer["success"], f"{path} fails with its example: {json.dumps(answer)[:300]}")
        while answer.get("data") and isinstance(answer["data"], dict) and answer["data"].get("finish") is False:
            time.sleep(0.1)
            status, answer = call(checker, path, operation, example, "asked again")


def check_wrong(checker, path, operation):
    schema = operation["requestBody"]["content"]["application/json"]["schema"]
    for parameters in variants(schema.get("examples", [{}])[0], schema):
        call(checker, path, operation, parameters, json.dumps(parameters)[:200])


def check_refusals(checker, path, operation):
    for status, body, headers in ((400, b"{", HEADERS), (401, b"{}", {"Content-Type": "application/json"}),
                                  (403, b"{}", {**HEADERS, "Origin": "http://evil.example"}),
                                  (413, b" " * 1100000, HEADERS), (415, b"{}", {**HEADERS, "Content-Type": "text/plain"})):
        got, answer = ask(path, body, headers)
        check(got == status and str(status) in operation["responses"], f"{path} is answered with {got}, not {status}")
        fault = checker.fault(checker.response(operation, got), answer)
        check(fault is None, f"{path} {got}: {json.dumps(answer)[:300]}\n     {fault}")


def main():
    document = ask("/openapi.json", method="GET")[1]
    checker = Checker(document)
    rows = {path: item["post"] for path, item in document["paths"].items() if path.startswith("/webapi/VORN.")}
    check(len(rows) == 23, f"{len(rows)} rows")
    for schema in document["components"]["schemas"].values():
        jsonschema.Draft202012Validator.check_schema(schema)
    changing = [path for path, row in rows.items() if row["x-access"] == "write" and path != LAST]
    reading = [path for path, row in rows.items() if row["x-access"] == "read"]
    for path in [*changing, *reading]:
        check_examples(checker, path, rows[path])
    for path in [*changing, *reading]:
        check_wrong(checker, path, rows[path])
        check_refusals(checker, path, rows[path])
    check_refusals(checker, LAST, rows[LAST])
    for parameters in ({}, {"net_topology": []}, {"net_topology": "star"}):
        call(checker, LAST, rows[LAST], parameters, json.dumps(parameters))
    check_examples(checker, LAST, rows[LAST])
    print(f"{checked} checks of {len(rows)} rows, {failures} failed")
    sys.exit(1 if failures else 0)


main()
