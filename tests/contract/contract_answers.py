#!/usr/bin/python3
"""contract_answers.py DESCRIPTOR FOLDER PROGRAM...: compares the answers of tests with the descriptor of the methods.

FOLDER has the file PROGRAM.jsonl of each test program that recorded answers (tests/support/recorded_answers.h). Of each
method there must be a successful answer and an answer with each listed error code, and none with another code, except
those of the server that every method may have. Each
answer matches its schema and has no member that the schema lacks. The parameters of each successful request match the
schema of the request, and those of each request that was answered with 2301 do not. Exit status 77 without Debian's
python3-jsonschema, except in CI.
"""

import copy
import json
import os
import pathlib
import sys

try:
    import jsonschema
except ImportError:
    print("python3-jsonschema is not installed (scripts/setup test)")
    sys.exit(1 if os.environ.get("CI") == "true" else 77)

BAD_PARAMETER = 2301
NULL_CHARACTER = r"\u0000"
SERVER = pathlib.Path(__file__).resolve().parents[2] / "server/api/openapi.json"


def codes_of_all_methods():
    """The codes of the server's own answers that every method may have."""
    responses = json.loads(SERVER.read_text("utf-8"))["components"]["responses"]
    return {int(name.removeprefix("Status")) for name, entry in responses.items() if entry["x-methods"] == "all"}


def load_answers(folder, programs):
    """The answers by method, and the names of the programs that recorded some."""
    answers = {}
    for program in programs:
        file = pathlib.Path(folder, program + ".jsonl")
        if file.exists():
            for line in file.read_text("utf-8").splitlines():
                answer = json.loads(line)
                answers.setdefault(answer["method"], []).append(answer)
    return answers


def closed(schema):
    """The schema with "additionalProperties": false in each object of properties."""
    if isinstance(schema, list):
        return [closed(item) for item in schema]
    if not isinstance(schema, dict):
        return schema
    schema = {key: closed(value) for key, value in schema.items()}
    if isinstance(schema.get("properties"), dict) and schema.get("type") == "object":
        schema["additionalProperties"] = False
    return schema


def without_nulls(value):
    """The value without members that are null: the API takes them as absent."""
    if isinstance(value, list):
        return [without_nulls(item) for item in value]
    if isinstance(value, dict):
        return {key: without_nulls(item) for key, item in value.items() if item is not None}
    return value


class Contract:
    """The descriptor, and what of it was broken."""

    def __init__(self, descriptor):
        self.descriptor = descriptor
        self.complaints = []
        self._open = descriptor["components"]
        self._closed = copy.deepcopy(self._open)
        self._closed["schemas"] = closed(self._open["schemas"])

    def complain(self, method, text, answer=None):
        shown = f": {json.dumps(answer)[:400]}" if answer else ""
        self.complaints.append(f"{method}: {text}{shown}")

    def fault(self, value, schema, is_closed):
        """The first fault of a value, or None."""
        components = self._closed if is_closed else self._open
        root = {"components": components, **(closed(schema) if is_closed else schema)}
        error = jsonschema.exceptions.best_match(jsonschema.Draft202012Validator(root).iter_errors(value))
        return error and f"{error.json_path}: {error.message}"

    def check_codes(self, method, codes, listed):
        if 0 not in codes:
            self.complain(method, "no test recorded a successful answer")
        for code in sorted(listed - codes):
            self.complain(method, f"no test recorded the listed error code {code}")
        for code in sorted(codes - listed - {0} - codes_of_all_methods()):
            self.complain(method, f"tests recorded the error code {code}, which is not listed")

    def check_answer(self, method, operation, answer):
        if answer["code"] == 0:
            schema = operation["responses"]["200"]["content"]["application/json"]["schema"]
        else:
            schema = operation["x-error-codes"].get(str(answer["code"]), {}).get("details", {"type": "null"})
        if fault := self.fault(answer["data"], schema, True):
            self.complain(method, f"the answer does not match its schema: {fault}", answer)

    def check_request(self, method, operation, answer):
        content = operation["requestBody"]["content"].get("application/json")
        if content is None:
            return  # a form: the module gets the path of the file
        request = without_nulls(answer["request"] or {})
        if answer["code"] == 0 and not answer["kerberos"] and isinstance(request, dict):
            for rule in request.get("rule", []):  # the flavours are ignored without Kerberos
                rule["security_flavor"] = {"sys": True}
        if NULL_CHARACTER in json.dumps(request):
            return  # the server refuses such a text before a method gets it
        fault = self.fault(request, content["schema"], False)
        if answer["code"] == 0 and fault:
            self.complain(method, f"the schema refuses a request that was accepted: {fault}", answer)
        if answer["code"] == BAD_PARAMETER and not fault:
            self.complain(method, "the schema accepts a request that was refused", answer)

    def check(self, answers):
        for path, item in self.descriptor["paths"].items():
            operation, method = item["post"], item["post"]["operationId"]
            if path != "/api/" + method:
                self.complain(method, "the operationId is not the path")
            recorded = answers.pop(method, [])
            self.check_codes(method, {answer["code"] for answer in recorded},
                             {int(code) for code in operation["x-error-codes"]})
            for answer in recorded:
                self.check_answer(method, operation, answer)
                self.check_request(method, operation, answer)
            self.check_examples(method, operation)
        for method in answers:
            self.complain(method, "answers were recorded of a method that is not described")

    def check_examples(self, method, operation):
        (request,), answer = operation["requestBody"]["content"].values(), operation["responses"]["200"]
        answer = answer["content"]["application/json"]
        if not request["examples"] or request["examples"].keys() != answer["examples"].keys():
            self.complain(method, "each example needs a request and an answer of the same name")
        for media, is_closed in ((request, True), (answer, True)):
            for name, example in media["examples"].items():
                if fault := self.fault(example["value"], media["schema"], is_closed):
                    self.complain(method, f"the example {name} does not match its schema: {fault}")


def main():
    descriptor, folder, *programs = sys.argv[1:]
    contract = Contract(json.loads(pathlib.Path(descriptor).read_text("utf-8")))
    answers = load_answers(folder, programs)
    count = sum(len(recorded) for recorded in answers.values())
    contract.check(answers)
    print(*contract.complaints, sep="\n")
    print(f"{count} answers, {len(contract.complaints)} complaints")
    return 1 if contract.complaints else 0


if __name__ == "__main__":
    sys.exit(main())
