"""A client of vornd's HTTP API over its Unix socket."""

import http.client
import json
import socket
import time

_SOCKET = "/run/vorn/vornd.sock"


_READING = ("/get", "/list", "/load")
_READING_LIMIT, _CHANGING_LIMIT = 30, 150  # seconds; generous, because a guest may share its cores

_seconds = {}  # path of a method to the longest time that an answer took


class Refused(Exception):
    """An answer that reports a failure, with its code and text."""

    def __init__(self, error):
        super().__init__(f"{error['code']}: {error['text']}")
        self.code = error["code"]
        self.details = error.get("details")


class _Connection(http.client.HTTPConnection):
    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX)
        self.sock.settimeout(300)
        self.sock.connect(_SOCKET)


def request(method, path, body=None, content_type="application/json"):
    """The status and the JSON of one request."""
    connection = _Connection("localhost")
    begun = time.monotonic()
    try:
        connection.request(method, path, body, {"Content-Type": content_type} if body else {})
        response = connection.getresponse()
        return response.status, json.loads(response.read())
    finally:
        connection.close()
        _seconds[path] = max(_seconds.get(path, 0), time.monotonic() - begun)


def answers():
    """Whether vornd answers."""
    try:
        return request("GET", "/api")[0] == 200
    except OSError:
        return False


def _data(body):
    if not body["success"]:
        raise Refused(body["error"])
    return body["data"]


def slow_answers():
    """Answers since the last call of this function that took longer than their limit."""
    slow = [f"{path} was answered after {taken:.1f} s" for path, taken in _seconds.items()
            if taken > (_READING_LIMIT if path.endswith(_READING) else _CHANGING_LIMIT)]
    _seconds.clear()
    return slow


def _path(api, method, api_version=1):
    return f"/api/VORN.Core.FileServ.{api}/v{api_version}/{method}"


def answer(api, method, api_version=1, **parameters):
    """The whole answer to a call, successful or not."""
    return request("POST", _path(api, method, api_version), json.dumps(parameters))[1]


def call(api, method, api_version=1, **parameters):
    """The data of the answer. Raises Refused."""
    return _data(answer(api, method, api_version, **parameters))


def rehearse(api, method, **parameters):
    """What a call would do. Raises Refused if the call would fail."""
    body = request("POST", _path(api, method) + "?rehearse=true", json.dumps(parameters))[1]
    _data(body)
    return body["rehearsal"]


def upload(api, method, field, content):
    """Like call(), with a file."""
    boundary = "a-boundary-that-no-keytab-has"
    head = f'--{boundary}\r\nContent-Disposition: form-data; name="{field}"; filename="file"\r\n\r\n'
    body = head.encode() + content + f"\r\n--{boundary}--\r\n".encode()
    return _data(request("POST", _path(api, method), body, f"multipart/form-data; boundary={boundary}")[1])
