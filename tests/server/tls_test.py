#!/usr/bin/env python3
"""tls_test: the real vornd over TLS, plain loopback and its Unix socket, on a trial root with accounts of its own.

The clients are Python's ssl module and openssl(1). Certificates come from an authority that the test makes.
"""

import contextlib
import http.client
import json
import os
import pathlib
import re
import shutil
import signal
import socket
import ssl
import subprocess
import sys
import tempfile
import time
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(PROJECT / "scripts"))
from trial_server import (  # noqa: E402 pylint: disable=wrong-import-position
    UnixConnection, add_accounts, expect_no_secret, make_trial_root)

VORND = os.environ["VORND"]
PATIENCE = 120  # seconds; reaching it is a failure
API = "/api/VORN.Core.FileServ."
SESSION = "/api/VORN.Server.Session/v1/"
TOKEN = "/api/VORN.Server.Token/v1/"


def eventually(condition):
    """Polls the condition until it is true."""
    limit = time.monotonic() + PATIENCE
    while not (result := condition()):
        if time.monotonic() > limit:
            raise AssertionError("the condition has not become true")
        time.sleep(0.05)
    return result


def openssl(*words, text=None):
    """Runs openssl(1), and returns its output."""
    return subprocess.run(["openssl", *words], input=text, capture_output=True, text=True, check=True).stdout


class Authority:
    """A certificate authority, and the certificates that it issues."""

    def __init__(self, folder):
        self.folder = folder
        self.certificate = folder / "ca.pem"
        openssl("req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes", "-days", "300",
                "-subj", "/CN=Test authority", "-addext", "keyUsage=critical,keyCertSign",
                "-keyout", folder / "ca.key", "-out", self.certificate)

    def issue(self, name, kind=("ec", "-pkeyopt", "ec_paramgen_curve:P-256")):
        """Makes NAME.pem and NAME.key, for localhost and 127.0.0.1."""
        key, request = self.folder / f"{name}.key", self.folder / f"{name}.csr"
        openssl("req", "-newkey", *kind, "-nodes", "-subj", "/CN=localhost", "-keyout", key, "-out", request)
        extensions = self.folder / "extensions"
        extensions.write_text("subjectAltName=DNS:localhost,IP:127.0.0.1\nbasicConstraints=critical,CA:FALSE\n"
                              "keyUsage=critical,digitalSignature\nextendedKeyUsage=serverAuth\n"
                              "crlDistributionPoints=URI:http://localhost/crl\n")
        certificate = self.folder / f"{name}.pem"
        openssl("x509", "-req", "-in", request, "-CA", self.certificate, "-CAkey", self.folder / "ca.key",
                "-CAcreateserial", "-days", "300", "-sha256", "-extfile", extensions, "-out", certificate)
        return certificate, key


class Server:
    """A vornd on a trial root, until the end of the "with" statement."""

    def __init__(self, configuration="", options=()):
        self.folder = pathlib.Path(tempfile.mkdtemp(prefix="vorn"))
        self.root = make_trial_root(self.folder)
        self.socket = self.folder / "socket"
        add_accounts(self.root)
        self.configure(configuration)
        self._options = options
        self._process = None

    def configure(self, text):
        """Writes the configuration file; the addresses are added."""
        folder = self.root / "etc/vorn"
        folder.mkdir(exist_ok=True)
        addresses = f"unix:{self.socket} 127.0.0.1:0 tls:127.0.0.1:0"
        (folder / "vornd.conf").write_text(f"[server]\nlisten = {addresses}\n{text}\n", "ascii")

    def __enter__(self):
        with open(self.folder / "log", "ab") as log:
            self._process = subprocess.Popen(  # pylint: disable=consider-using-with
                [VORND, "--root", self.root, *self._options], stdout=log, stderr=log)
        eventually(lambda: self.log().count("Listening at") == 3 or self._process.poll() is not None)
        return self

    def __exit__(self, *_):
        self.stop()
        log = self.log()
        shutil.rmtree(self.folder)
        expect_no_secret(log)

    def stop(self):
        self._process.terminate()
        return self._process.wait(PATIENCE)

    def log(self):
        return (self.folder / "log").read_text("utf-8")

    def port(self, prefix=""):
        return int(re.search(rf"Listening at {prefix}127\.0\.0\.1:(\d+)", self.log())[1])

    def reload(self, result):
        """Sends SIGHUP and waits for one more line with `result`."""
        before = self.log().count(result)
        self._process.send_signal(signal.SIGHUP)
        eventually(lambda: self.log().count(result) > before)

    def check(self):
        """Runs vornd --check. Returns its status and its output."""
        done = subprocess.run([VORND, "--root", self.root, "--check", *self._options], capture_output=True, text=True,
                              check=False)
        return done.returncode, done.stdout + done.stderr

    def dial(self):
        """A plain TCP connection to the port with TLS."""
        return socket.create_connection(("127.0.0.1", self.port("tls:")), PATIENCE)

    def certificate(self):
        """The certificate that a new connection gets, in PEM."""
        return ssl.get_server_certificate(("127.0.0.1", self.port("tls:")))

    def connect(self, way, authority=None):
        if way == "unix":
            return UnixConnection(self.socket)
        if way == "plain":
            return http.client.HTTPConnection("127.0.0.1", self.port(), PATIENCE)
        context = ssl.create_default_context(cadata=authority or self.certificate())
        return http.client.HTTPSConnection("127.0.0.1", self.port("tls:"), context=context, timeout=PATIENCE)

    def call(self, way, path, parameters=None, headers=None):
        """Calls a method. Returns the status, the headers and the answer."""
        connection = self.connect(way)
        with contextlib.closing(connection):
            body = json.dumps(parameters or {})
            connection.request("POST", path, body, {"Content-Type": "application/json", **(headers or {})})
            answer = connection.getresponse()
            return answer.status, answer.headers, json.loads(answer.read())


def client_context(low=ssl.TLSVersion.TLSv1_2, high=ssl.TLSVersion.TLSv1_3):
    context = ssl.SSLContext(ssl.PROTOCOL_TLS_CLIENT)
    context.check_hostname = False
    context.verify_mode = ssl.CERT_NONE
    context.set_ciphers("ALL:@SECLEVEL=0")
    context.minimum_version, context.maximum_version = low, high
    return context


GET = b"GET /healthz HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n"


def read_all(connection):
    data = b""
    while piece := connection.recv(65536):
        data += piece
    return data


class Handshakes(unittest.TestCase):
    """The protocol, on a server with a self-signed certificate."""

    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Server("[limits]\nhead-time = 3s"))

    def test_both_versions_end_in_order(self):
        for version in (ssl.TLSVersion.TLSv1_2, ssl.TLSVersion.TLSv1_3):
            with client_context(version, version).wrap_socket(self.server.dial()) as connection:
                self.assertEqual(connection.version(), version.name.replace("v1_", "v1."))
                self.assertIsNone(connection.compression())
                connection.sendall(GET)
                # Without close_notify, reading to the end would raise SSLEOFError.
                self.assertIn(b" 200 OK\r\n", read_all(connection))

    def test_old_versions_are_refused(self):
        for version in (ssl.TLSVersion.TLSv1, ssl.TLSVersion.TLSv1_1):
            with self.assertRaisesRegex(ssl.SSLError, "ALERT_PROTOCOL_VERSION|UNSUPPORTED_PROTOCOL"):
                client_context(version, version).wrap_socket(self.server.dial())

    def test_http_1_1_is_the_only_protocol(self):
        context = client_context()
        context.set_alpn_protocols(["h2", "http/1.1"])
        with context.wrap_socket(self.server.dial()) as connection:
            self.assertEqual(connection.selected_alpn_protocol(), "http/1.1")
        context.set_alpn_protocols(["h2"])
        with self.assertRaisesRegex(ssl.SSLError, "(?i)no.application.protocol"):
            context.wrap_socket(self.server.dial())

    def test_sessions_are_not_resumed(self):
        context = client_context(high=ssl.TLSVersion.TLSv1_2)
        with context.wrap_socket(self.server.dial()) as first:
            session = first.session
            self.assertFalse(session is not None and session.has_ticket)
        with context.wrap_socket(self.server.dial(), session=session) as second:
            self.assertFalse(second.session_reused)

    def test_renegotiation_is_refused(self):
        done = subprocess.run(["openssl", "s_client", "-tls1_2", "-connect", f"127.0.0.1:{self.server.port('tls:')}"],
                              input="R\n", capture_output=True, text=True, timeout=PATIENCE, check=False)
        self.assertIn("no renegotiation", done.stderr)

    def test_plain_http_is_told_to_use_tls(self):
        with self.server.dial() as connection:
            connection.sendall(GET)
            answer = read_all(connection)
        self.assertTrue(answer.startswith(b"HTTP/1.1 400 "), answer)
        self.assertIn(b"https://", answer)

    def test_bytes_that_are_no_handshake_end_the_connection(self):
        for data in (b"\0" * 100, os.urandom(1000), b"\x16\x03\x01\xff\xff" + b"\1" * 40000):
            with self.server.dial() as connection, contextlib.suppress(ConnectionError):
                connection.sendall(data)
                while connection.recv(4096):
                    pass

    def test_slow_handshakes_are_cut_and_stop_nobody(self):
        slow = [self.server.dial() for _ in range(1000)]
        for connection in slow:
            with contextlib.suppress(ConnectionError):
                connection.sendall(b"\x16\x03\x01")
        for _ in range(20):
            with client_context().wrap_socket(self.server.dial()) as connection:
                connection.sendall(GET)
                self.assertIn(b" 200 OK\r\n", read_all(connection))
        for connection in slow:
            with connection, contextlib.suppress(ConnectionError):
                self.assertEqual(connection.recv(1), b"")

    def test_uploads_and_answers_may_be_large(self):
        with contextlib.closing(self.server.connect("tls")) as connection:
            for _ in range(3):
                connection.request("POST", SESSION + "sign_in", b"x" * 4_000_000, {"Content-Type": "application/json"})
                self.assertEqual(connection.getresponse().read()[:16], b'{"success":false')
                connection.close()
            connection.request("GET", "/openapi.json", headers={"Accept-Encoding": "identity"})
            document = connection.getresponse().read()
        self.assertGreater(len(document), 65536)
        self.assertEqual(json.loads(document)["openapi"], "3.1.0")

    def test_the_self_signed_certificate_is_the_one_that_the_log_names(self):
        printed = openssl("x509", "-noout", "-fingerprint", "-sha256", "-ext", "subjectAltName", "-checkend", "33000000",
                          text=self.server.certificate())
        fingerprint = re.search("Fingerprint=(.*)", printed)[1]
        self.assertIn(f"SHA-256 fingerprint {fingerprint}", self.server.log())
        self.assertIn(fingerprint, self.server.check()[1])
        for name in ("DNS:localhost", "IP Address:127.0.0.1", f"DNS:{socket.gethostname()}"):
            self.assertIn(name, printed)
        key = self.server.root / "var/lib/vorn/self-signed.pem"
        self.assertEqual(key.stat().st_mode & 0o7777, 0o600)


class Access(unittest.TestCase):
    """Who may do what, over each kind of connection."""

    WAYS = ("tls", "plain", "unix")

    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Server())

    def token(self, role, **more):
        name = os.urandom(8).hex()
        status, _, answer = self.server.call("unix", TOKEN + "create", {"name": name, "role": role, **more})
        self.assertEqual(status, 200, answer)
        return answer["data"]["id"], {"Authorization": "Bearer " + answer["data"]["token"]}

    def sign_in(self, way, account):
        """Signs in; returns the headers of further requests."""
        status, headers, answer = self.server.call(way, SESSION + "sign_in",
                                                   {"account": account, "password": "Passphrase-of-" + account})
        self.assertEqual(status, 200, answer)
        if way != "tls":
            self.assertNotIn("Set-Cookie", headers)
            return {"Authorization": "Bearer " + answer["data"]["token"]}
        self.assertNotIn("token", answer["data"])
        cookie, *attributes = headers["Set-Cookie"].split("; ")
        self.assertTrue(cookie.startswith("__Host-vorn-session=vorns_"))
        self.assertEqual(set(attributes), {"Path=/", "Secure", "HttpOnly", "SameSite=Strict"})
        return {"Cookie": cookie}

    def expect(self, status, way, path, parameters=None, headers=None):
        self.assertEqual(self.server.call(way, API + path, parameters, headers)[0], status, (way, path))

    def each_way(self):
        for way in self.WAYS:
            with self.subTest(way=way):
                yield way

    def test_an_account_signed_in_by_pam_may_do_what_its_group_may(self):
        for way in self.each_way():
            headers = self.sign_in(way, "alice")
            self.expect(200, way, "NFS/v1/get", headers=headers)
            self.expect(200, way, "NFS.IDMap/v1/delete", {"id": []}, headers)
            headers = self.sign_in(way, "bob")
            self.expect(200, way, "NFS/v1/get", headers=headers)
            self.expect(403, way, "NFS/v1/set", {"enable_nfs": True}, headers)

    def test_nobody_is_let_in_after_signing_out(self):
        for way in self.each_way():
            headers = self.sign_in(way, "bob")
            self.assertEqual(self.server.call(way, SESSION + "sign_out", headers=headers)[0], 200)
            self.expect(401, way, "NFS/v1/get", headers=headers)

    def test_without_credentials_only_the_local_administrator_is_known(self):
        for way, status in (("tls", 401), ("plain", 401), ("unix", 200)):
            self.expect(status, way, "NFS/v1/get")

    def test_a_stale_token_is_refused(self):
        for way in self.each_way():
            name, headers = self.token("administrator")
            self.expect(200, way, "NFS/v1/get", headers=headers)
            self.assertEqual(self.server.call("unix", TOKEN + "revoke", {"id": name})[0], 200)
            self.expect(401, way, "NFS/v1/get", headers=headers)

    def test_a_page_of_another_origin_is_refused(self):
        for way in self.each_way():
            headers = self.sign_in(way, "alice")
            own = {"tls": f"https://127.0.0.1:{self.server.port('tls:')}",
                   "plain": f"http://127.0.0.1:{self.server.port()}", "unix": "http://localhost"}[way]
            self.expect(200, way, "NFS/v1/get", headers={**headers, "Origin": own})
            swapped = own.replace("https:", "http:") if way == "tls" else own.replace("http:", "https:")
            for origin in (swapped, "https://evil.example", own + "1", "null"):
                self.expect(403, way, "NFS/v1/get", headers={**headers, "Origin": origin})
            self.expect(403, way, "NFS/v1/get", headers={**headers, "Sec-Fetch-Site": "cross-site"})

    def test_another_host_name_is_refused_over_tcp(self):
        for way, status in (("tls", 421), ("plain", 421)):
            _, headers = self.token("reader")
            self.expect(status, way, "NFS/v1/get", headers={**headers, "Host": "evil.example"})

    def test_a_token_that_reads_does_not_write(self):
        for way in self.each_way():
            _, headers = self.token("reader")
            self.expect(200, way, "NFS/v1/get", headers=headers)
            self.expect(403, way, "NFS/v1/set", {"enable_nfs": True}, headers)

    def test_a_token_for_a_share_is_for_no_other(self):
        for way in self.each_way():
            _, headers = self.token("administrator", shares=["data"])
            self.expect(200, way, "NFS.SharePrivilege/v1/load", {"share_name": "data"}, headers)
            self.expect(403, way, "NFS.SharePrivilege/v1/load", {"share_name": "music"}, headers)
            self.expect(403, way, "NFS/v1/get", headers=headers)

    def test_a_change_of_another_revision_is_refused(self):
        for way in self.each_way():
            _, headers = self.token("administrator")
            _, answer, envelope = self.server.call(way, API + "NFS/v1/get", headers=headers)
            settings = {name: envelope["data"][name] for name in ("enable_nfs", "enable_nfs_v4", "nfs_v4_domain")}
            settings["unix_pri_enable"] = envelope["data"]["unix_pri_enable"]
            self.expect(412, way, "NFS/v1/set", settings, {**headers, "If-Match": '"another"'})
            self.expect(200, way, "NFS/v1/set", settings, {**headers, "If-Match": answer["ETag"]})

    def test_a_session_of_one_form_is_not_taken_in_the_other(self):
        cookie = self.sign_in("tls", "bob")
        bearer = {"Authorization": "Bearer " + cookie["Cookie"].split("=", 1)[1]}
        self.expect(401, "tls", "NFS/v1/get", headers=bearer)
        self.expect(401, "plain", "NFS/v1/get", headers=cookie)


class Certificates(unittest.TestCase):
    """Certificates that the settings name, and how they are exchanged."""

    def setUp(self):
        self.folder = pathlib.Path(self.enterContext(tempfile.TemporaryDirectory()))
        self.authority = Authority(self.folder)

    def settings(self, certificate, key):
        return f"[tls]\ncertificate = {certificate}\nkey = {key}\n"

    def get(self, server):
        """Makes a request that verifies the certificate with the authority. Returns the headers of the answer."""
        with contextlib.closing(server.connect("tls", self.authority.certificate.read_text())) as connection:
            connection.request("GET", "/healthz")
            answer = connection.getresponse()
            self.assertEqual(answer.status, 200)
            return answer.headers

    def test_a_reload_exchanges_the_certificate_and_keeps_connections(self):
        first, second = self.authority.issue("first"), self.authority.issue("second", ("rsa:2048",))
        with Server(self.settings(*first)) as server:
            self.assertNotIn("Strict-Transport-Security", self.get(server))
            old = server.certificate()
            with contextlib.closing(server.connect("tls", self.authority.certificate.read_text())) as kept:
                kept.request("GET", "/healthz")
                kept.getresponse().read()
                held = kept.sock
                server.configure(self.settings(*second) + "strict-transport = 30d\n")
                server.reload("The configuration was read again")
                self.assertNotEqual(server.certificate(), old)
                self.assertEqual(self.get(server)["Strict-Transport-Security"], "max-age=2592000")
                kept.request("GET", "/healthz")
                self.assertEqual(kept.getresponse().status, 200)
                self.assertIs(kept.sock, held, "the connection was not closed")

    def test_a_broken_certificate_is_reported_and_the_old_one_stays(self):
        certificate, key = self.authority.issue("good")
        _, other = self.authority.issue("other")
        readable = self.folder / "readable.key"
        shutil.copy(key, readable)
        readable.chmod(0o644)
        locked = self.folder / "locked.key"
        openssl("pkey", "-in", key, "-aes128", "-passout", "pass:secret", "-out", locked)
        empty = self.folder / "empty.pem"
        empty.touch()
        cases = ((certificate, other, "the key does not belong to the certificate"),
                 (empty, key, "the certificate cannot be used"), (certificate, empty, "every user may use the key"),
                 (certificate, readable, "every user may use the key"), (certificate, locked, "the key has a password"),
                 (self.folder / "none.pem", key, "No such file or directory"))
        with Server(self.settings(certificate, key)) as server:
            old = server.certificate()
            for pair in cases:
                server.configure(self.settings(*pair[:2]))
                status, output = server.check()
                self.assertEqual(status, 1, pair)
                self.assertIn(pair[2], output)
                server.reload("the previous one stays in force")
                self.assertIn(pair[2], server.log())
                self.assertEqual(server.certificate(), old)

    def test_a_server_does_not_start_with_a_broken_certificate(self):
        certificate, _ = self.authority.issue("good")
        _, other = self.authority.issue("other")
        with Server(self.settings(certificate, other)) as server:
            self.assertEqual(server.stop(), 1)
            self.assertIn("the key does not belong to the certificate", server.log())
            self.assertNotIn("Listening", server.log())

    def test_settings_that_do_not_fit_are_refused(self):
        certificate, key = self.authority.issue("good")
        cases = ((f"[tls]\ncertificate = {certificate}", ":4:15: certificate needs a key"),
                 (f"[tls]\nkey = {key}", ":4:7: key needs a certificate"),
                 ("[tls]\nstrict-transport = 1d", ":4:20: strict-transport needs a certificate of an authority"))
        for text, fault in cases:
            server = Server(text)
            status, output = server.check()
            self.assertEqual(status, 1)
            self.assertIn(fault, output)
        file = server.root / "etc/vorn/vornd.conf"
        file.write_text("[server]\nlisten = 0.0.0.0:8080\n")
        status, output = server.check()
        self.assertEqual(status, 1)
        self.assertIn(':2:10: "0.0.0.0:8080": only', output.replace("listen: ", ""))

    def test_a_self_signed_certificate_is_kept_and_made_for_new_names(self):
        with Server() as server:
            first = server.certificate()
            server.reload("The configuration was read again")
            self.assertEqual(server.certificate(), first)
            server.configure("host-names = nas.example")
            server.reload("The configuration was read again")
            self.assertNotEqual(server.certificate(), first)
            names = openssl("x509", "-noout", "-ext", "subjectAltName", text=server.certificate())
            self.assertIn("DNS:nas.example", names)


if __name__ == "__main__":
    unittest.main()
