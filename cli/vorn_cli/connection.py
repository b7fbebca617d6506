"""HTTP to a box: over its Unix socket, or over TCP with TLS or without."""

import hashlib
import http.client
import socket
import ssl
import urllib.parse

from .failure import Exit, Failure

PATIENCE = 300  # seconds for one answer: starting a service takes its time
DEFAULT_SOCKET = "/run/vorn/vornd.sock"


class UnixConnection(http.client.HTTPConnection):
    """HTTP over a Unix socket (unix(7))."""

    def __init__(self, path):
        super().__init__("localhost", timeout=PATIENCE)
        self._path = path

    def connect(self):
        self.sock = socket.socket(socket.AF_UNIX)
        self.sock.settimeout(self.timeout)
        self.sock.connect(self._path)


class PinnedConnection(http.client.HTTPSConnection):
    """HTTPS to a server whose certificate has a known SHA-256 fingerprint, whoever signed it."""

    def __init__(self, host, port, fingerprint):
        context = ssl.create_default_context()
        context.check_hostname = False
        context.verify_mode = ssl.CERT_NONE  # the fingerprint identifies the server
        super().__init__(host, port, timeout=PATIENCE, context=context)
        self._fingerprint = fingerprint

    def connect(self):
        super().connect()
        presented = fingerprint_of(self.sock.getpeercert(binary_form=True))
        if presented != self._fingerprint:
            self.close()
            raise Failure(f"The certificate of {self.host} is not the known one.", Exit.NO_CONNECTION, (
                f"known:     {self._fingerprint}", f"presented: {presented}",
                "If the box has a new certificate, compare the fingerprint there and run \"vorn login\" again."))


def fingerprint_of(certificate):
    """The SHA-256 of a certificate in DER, as vornd prints it: pairs of hexadecimal digits and colons."""
    digits = hashlib.sha256(certificate).hexdigest().upper()
    return ":".join(digits[at:at + 2] for at in range(0, len(digits), 2))


def presented_fingerprint(url):
    """Returns the fingerprint of the server's certificate if no authority of this system vouches for it, else None."""
    host, port = _address(url)
    try:
        with socket.create_connection((host, port), PATIENCE) as plain:
            with ssl.create_default_context().wrap_socket(plain, server_hostname=host):
                return None
    except ssl.SSLCertVerificationError:
        certificate = ssl.get_server_certificate((host, port))
        return fingerprint_of(ssl.PEM_cert_to_DER_cert(certificate))
    except OSError as error:
        raise unreachable(url, error) from error


def check_url(url):
    """Returns the URL without a trailing slash. Passwords and paths have no place in it."""
    parts = urllib.parse.urlsplit(url)
    try:
        port_is_valid = parts.port is None or parts.port > 0
    except ValueError:
        port_is_valid = False
    plain = not (parts.path.strip("/") or parts.query or parts.fragment or parts.username)
    if parts.scheme not in ("http", "https") or not parts.hostname or not port_is_valid or not plain:
        raise Failure(f"\"{url}\" is no URL of a box; an example: https://box.example:8443", Exit.USAGE)
    return url.rstrip("/")


def connect_to(target, fingerprint=None):
    """A connection to the URL, or to the Unix socket at this path. It is opened by the first request."""
    if target.startswith("/"):
        return UnixConnection(target)
    host, port = _address(target)
    if target.startswith("http:"):
        return http.client.HTTPConnection(host, port, timeout=PATIENCE)
    if fingerprint:
        return PinnedConnection(host, port, fingerprint)
    return http.client.HTTPSConnection(host, port, timeout=PATIENCE, context=ssl.create_default_context())


def unreachable(target, error):
    """The failure for an error of the system or of TLS."""
    reason = getattr(error, "strerror", None) or getattr(error, "verify_message", None) or str(error)
    hint = ()
    if isinstance(error, ssl.SSLCertVerificationError):
        hint = ("Run \"vorn login --url URL\" once to check the fingerprint of its certificate and to keep it.",)
    elif isinstance(error, PermissionError):
        hint = ("Only root and the members of the administrators' group may use the socket. "
                "With a token, use --url URL.",)
    elif target.startswith("/"):
        hint = ("Is vornd running? Another socket is named by --socket PATH, another box by --url URL.",)
    return Failure(f"{target} cannot be reached: {reason}", Exit.NO_CONNECTION, hint)


def _address(url):
    parts = urllib.parse.urlsplit(url)
    return parts.hostname, parts.port or (443 if parts.scheme == "https" else 80)
