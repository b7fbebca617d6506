"""Calls of the web API."""

import dataclasses
import http.client
import json
import secrets

from .connection import connect_to, unreachable
from .failure import Exit, Failure


@dataclasses.dataclass
class Answer:
    """What a successful call returned."""

    data: object
    warnings: tuple = ()
    revision: str | None = None  # the ETag: stands for the data
    rehearsal: dict | None = None  # what the call would do, if it was rehearsed


class CallFailure(Failure):
    """A call that the box refused or could not carry out: the text of its code, then the platform's reasons."""

    def __init__(self, method, status, error, warnings):
        details = error.get("details")
        lines = list(error.get("reasons") or [])
        if details is not None and status != http.HTTPStatus.PRECONDITION_FAILED:
            lines.append(f"details: {json.dumps(details, ensure_ascii=False)}")
        lines += [f"warning: {warning}" for warning in warnings]
        self.code = error.get("code", status)
        super().__init__(f"{error.get('text') or 'The call failed.'} (code {self.code}, {method})", _exit_of(status), lines)


class Api:
    """A box. Requests share one connection. Not thread-safe."""

    def __init__(self, target, token=None, fingerprint=None):
        self.target = target
        self._token = token
        self._fingerprint = fingerprint
        self._connection = None

    def call(self, method, parameters=None, *, revision=None, rehearse=False):
        """Calls "API/vN/method". With `revision`, only if the data that it stands for is still there."""
        body = json.dumps(parameters or {}).encode()
        return self._post(method, body, "application/json", revision, rehearse)

    def upload(self, method, field, name, content, *, rehearse=False):
        """Calls a method that takes a file."""
        boundary = secrets.token_hex(16)
        head = (f"--{boundary}\r\nContent-Disposition: form-data; name=\"{field}\"; filename=\"{name}\"\r\n"
                "Content-Type: application/octet-stream\r\n\r\n")
        body = head.encode() + content + f"\r\n--{boundary}--\r\n".encode()
        return self._post(method, body, f"multipart/form-data; boundary={boundary}", None, rehearse)

    def methods(self):
        """The methods of the box: the paths of its OpenAPI document, with their descriptions."""
        status, _, body = self._request("GET", "/openapi.json", None, {})
        if status != http.HTTPStatus.OK:
            raise CallFailure("/openapi.json", status, _parse(body).get("error") or {}, ())
        return {path.removeprefix("/api/"): item["post"] for path, item in _parse(body)["paths"].items() if "post" in item}

    def _post(self, method, body, content_type, revision, rehearse):
        headers = {"Content-Type": content_type}
        if revision:
            headers["If-Match"] = revision
        path = f"/api/{method}" + ("?rehearse=true" if rehearse else "")
        status, head, text = self._request("POST", path, body, headers)
        answer = _parse(text)
        warnings = tuple(answer.get("warnings") or ())
        if not answer.get("success"):
            raise CallFailure(method, status, answer.get("error") or {}, warnings)
        return Answer(answer.get("data"), warnings, head.get("ETag"), answer.get("rehearsal"))

    def _request(self, verb, path, body, headers):
        if self._token:
            headers = {**headers, "Authorization": f"Bearer {self._token}"}
        try:
            if self._connection is None:
                self._connection = connect_to(self.target, self._fingerprint)
            self._connection.request(verb, path, body, headers)
            response = self._connection.getresponse()
            return response.status, response.headers, response.read()
        except (OSError, http.client.HTTPException) as error:
            self._connection.close()
            raise unreachable(self.target, error) from error


def _parse(text):
    try:
        answer = json.loads(text)
    except ValueError as error:
        raise Failure("The answer is not JSON: this is no box.", Exit.NO_CONNECTION) from error
    return answer if isinstance(answer, dict) else {}


def _exit_of(status):
    if status in (http.HTTPStatus.UNAUTHORIZED, http.HTTPStatus.FORBIDDEN):
        return Exit.NOT_PERMITTED
    if status == http.HTTPStatus.PRECONDITION_FAILED:
        return Exit.CHANGED_MEANWHILE
    return Exit.FAILED
