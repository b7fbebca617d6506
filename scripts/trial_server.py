"""A vornd of the release build that serves a fresh trial root in a temporary folder, called over its Unix socket."""

import base64
import http.client
import json
import os
import pathlib
import re
import shutil
import socket
import subprocess
import tempfile
import time

PROJECT = pathlib.Path(__file__).resolve().parent.parent
VORND = os.environ.get("VORND", PROJECT / "build/release/bin/vornd")
PATIENCE = 60  # seconds until vornd serves, and until it has ended
BOUNDARY = "trial-server-boundary"
CHANGE_ID = re.compile("[0-9a-f]{40}")  # of a change of the history

# Tokens, sessions and codes, and the passwords of the tests.
SECRET = re.compile(r"vorn[sc]?_[0-9a-f]{16}|Passphrase-of-|PRIVATE KEY")
PRINTED_LINK = re.compile(r"^Sign in once, within .*$", re.MULTILINE)


def expect_no_secret(log, secrets=()):
    """Fails if a log has a secret. `secrets` are further ones: bytes, which may be quoted in hexadecimal or base64."""
    text = PRINTED_LINK.sub("", log)  # printed to the standard output, which the tests keep in the same file
    spellings = [spelling for secret in secrets
                 for spelling in (secret.decode("latin-1"), secret.hex(), secret.hex().upper(),
                                  base64.b64encode(secret).decode().rstrip("="))]
    found = [line for line in text.splitlines() if SECRET.search(line) or any(word in line for word in spellings)]
    if found:
        raise AssertionError(f"a secret is logged: {found[:3]}")


def make_trial_root(folder):
    """Copies the trial root, with the service script of the box, into the folder. Returns the root."""
    root = folder / "root"
    shutil.copytree(PROJECT / "scripts/trial", root)
    services = root / "usr/vorn/etc/rc.sysv"
    services.mkdir(parents=True)
    shutil.copy(PROJECT / "linux/service/S83nfsd.sh", services)
    return root


class UnixConnection(http.client.HTTPConnection):
    """HTTP over a Unix socket."""

    def __init__(self, path):
        super().__init__("localhost", timeout=PATIENCE)
        self._path = path

    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX)
        self.sock.settimeout(self.timeout)
        self.sock.connect(str(self._path))


PAM_MODULE = os.environ.get("PAM_MODULE", PROJECT / "build/release/tests/server/pam_test.so")


def add_accounts(root):
    """Adds the administrator alice and the reader bob; tests/server/modules/pam_test.cpp has their passwords."""
    (root / "etc/pam.d").mkdir(exist_ok=True)
    (root / "etc/pam.d/vornd").write_text(f"auth required {PAM_MODULE}\naccount required {PAM_MODULE}\n")
    with open(root / "etc/passwd", "a", encoding="ascii") as passwd:
        passwd.write("alice:x:1001:100::/:/bin/sh\nbob:x:1002:100::/:/bin/sh\n")
    with open(root / "etc/group", "a", encoding="ascii") as group:
        group.write("vorn-admin:x:3001:alice\nvorn-readonly:x:3002:bob\n")


class TrialServer:
    """Serves until the end of the "with" statement; over TLS, too, for accounts with passwords, if that is wanted."""

    def __init__(self, tls=False):
        self._tls = tls

    def __enter__(self):
        self._keys = []
        self.folder = pathlib.Path(tempfile.mkdtemp(prefix="vorn"))  # a short path: a socket has 107 bytes at most
        self.root = make_trial_root(self.folder)
        self.socket = self.folder / "socket"
        if self._tls:
            add_accounts(self.root)
        with open(self.folder / "log", "wb") as log:
            self._process = subprocess.Popen(  # pylint: disable=consider-using-with
                [VORND, "--root", self.root, "--listen", f"unix:{self.socket}", "--listen", "127.0.0.1:0",
                 "--sign-in-link", *(["--listen", "tls:127.0.0.1:0"] if self._tls else [])],
                stdout=log, stderr=log)
        try:
            self._await()
        except RuntimeError:
            self.__exit__()
            raise
        return self

    def __exit__(self, *_):
        self._process.terminate()
        self._process.wait(PATIENCE)
        log = self.log()
        shutil.rmtree(self.folder)
        expect_no_secret(log, self._keys)

    def _await(self):
        limit = time.monotonic() + PATIENCE
        while True:
            try:
                return self.request("GET", "/healthz")
            except OSError as failure:
                if self._process.poll() is not None or time.monotonic() > limit:
                    raise RuntimeError(f"vornd does not serve: {self.log()}") from failure
                time.sleep(0.05)

    def address(self):
        """Address and port of the TCP listener."""
        return re.search(r"Listening at (127\.0\.0\.1:\d+)", self.log()).group(1)

    def tls_address(self):
        """Address and port of the listener with TLS, whose certificate vornd has made itself."""
        return re.search(r"Listening at tls:(127\.0\.0\.1:\d+)", self.log()).group(1)

    def log(self):
        return (self.folder / "log").read_text("utf-8", "replace")

    def process_id(self):
        return self._process.pid

    def sign_in_code(self):
        """The code that vornd has printed, which signs in once."""
        return re.search("#code=(vornc_[0-9a-f]+)", self.log()).group(1)

    def _send(self, method, path, body, headers):
        """The answer, with its body."""
        connection = UnixConnection(self.socket)
        connection.request(method, path, body, headers)
        response = connection.getresponse()
        answer = response.read()
        connection.close()
        return response, answer

    def request(self, method, path, body=None, content_type="application/json", if_match=None):
        """The status, the content type and the body of the answer."""
        headers = {"Content-Type": content_type} if body is not None else {}
        if if_match is not None:
            headers["If-Match"] = if_match
        response, answer = self._send(method, path, body, headers)
        return response.status, response.getheader("Content-Type"), answer

    def revision(self, path, parameters):
        """The ETag of the answer of a method that reads."""
        response, _ = self._send("POST", path, json.dumps(parameters), {"Content-Type": "application/json"})
        return response.getheader("ETag")

    def call(self, path, parameters, if_match=None):
        """The status and the answer of a method."""
        status, _, answer = self.request("POST", path, json.dumps(parameters), if_match=if_match)
        return status, json.loads(answer)

    def upload(self, path, name, content, if_match=None):
        """The status and the answer of a method that takes a file in the part `name` of a form."""
        head = f'--{BOUNDARY}\r\nContent-Disposition: form-data; name="{name}"; filename="upload"\r\n\r\n'
        body = head.encode() + content + f"\r\n--{BOUNDARY}--\r\n".encode()
        status, _, answer = self.request("POST", path, body, f"multipart/form-data; boundary={BOUNDARY}", if_match)
        return status, json.loads(answer)

    def keytab(self):
        """The content of a keytab with one key, made by ktutil(1)."""
        file = self.folder / "nfs.keytab"
        file.unlink(missing_ok=True)  # ktutil appends to a file that is there
        commands = ["addent -password -p nfs/box.example@STORAGE.EXAMPLE -k 1 -e aes256-cts", "secret", f"wkt {file}"]
        subprocess.run(["ktutil"], input="\n".join(commands) + "\n", text=True, check=True, capture_output=True)
        content = file.read_bytes()
        self._keys.append(content[-36:-4])  # a key of 256 bits, before the 32-bit key version
        return content


def newest_change(server):
    """The id of the newest change of /etc/exports."""
    changes = server.call("/api/VORN.Core.FileServ.NFS.History/v1/list", {"file": "/etc/exports", "limit": 1})[1]
    return changes["data"]["changes"][0]["id"]


def try_example(server, path, operation, name, if_match=None):
    """The status and the answer of the example request `name` of an operation of the OpenAPI document.

    An example that names a change of the history is tried with the newest change of /etc/exports.
    """
    (content_type, media), = operation["requestBody"]["content"].items()
    value = media["examples"][name]["value"]
    if content_type == "application/json":
        if CHANGE_ID.fullmatch(str(value.get("id"))):
            value = {**value, "id": newest_change(server)}
        return server.call(path, value, if_match)
    return server.upload(path, next(iter(value)), server.keytab(), if_match)
