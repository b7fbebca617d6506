"""vornd's HTTP API, at its Unix socket."""

import http.client
import json
import socket

_SOCKET = "/run/vorn/vornd.sock"


class Refused(Exception):
    """An answer without success: its code and its text."""

    def __init__(self, error):
        super().__init__(f"{error['code']}: {error['text']}")
        self.code = error["code"]
        self.details = error.get("details")


class _Connection(http.client.HTTPConnection):
    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX)
        self.sock.settimeout(60)
        self.sock.connect(_SOCKET)


def request(method, path, body=None, content_type="application/json"):
    """The status and the JSON of one request."""
    connection = _Connection("localhost")
    try:
        connection.request(method, path, body, {"Content-Type": content_type} if body else {})
        response = connection.getresponse()
        return response.status, json.loads(response.read())
    finally:
        connection.close()


def answers():
    """Whether vornd is there."""
    try:
        return request("GET", "/api")[0] == 200
    except OSError:
        return False


def _data(answer):
    _, body = answer
    if not body["success"]:
        raise Refused(body["error"])
    return body["data"]


def call(api, method, version=1, **parameters):
    """What the method answers. Raises Refused."""
    path = f"/api/VORN.Core.FileServ.{api}/v{version}/{method}"
    return _data(request("POST", path, json.dumps(parameters)))


def upload(api, method, field, content):
    """Like call(), with a file."""
    boundary = "a-boundary-that-no-keytab-has"
    head = f'--{boundary}\r\nContent-Disposition: form-data; name="{field}"; filename="file"\r\n\r\n'
    body = head.encode() + content + f"\r\n--{boundary}--\r\n".encode()
    path = f"/api/VORN.Core.FileServ.{api}/v1/{method}"
    return _data(request("POST", path, body, f"multipart/form-data; boundary={boundary}"))
