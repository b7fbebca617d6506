"""The server on the network: TLS under the restrictions of the unit, and vornd.conf read again by a reload."""

import hashlib
import pathlib
import shutil
import ssl

import pytest

from harness import api
from harness.network import BOX_ADDRESS
from harness.programs import run, succeeds, wait_for

SETTINGS = pathlib.Path("/etc/vorn/vornd.conf")
SELF_SIGNED = pathlib.Path("/var/lib/vorn/self-signed.pem")
OWN = pathlib.Path("/etc/vorn/own.pem")  # a certificate, and its key
PORT = 8443


def configure(text=""):
    SETTINGS.write_text(f"[server]\nlisten = unix:/run/vorn/vornd.sock tls:0.0.0.0:{PORT}\n{text}\n", encoding="ascii")


def certificate():
    """The certificate of new connections, in PEM."""
    return ssl.get_server_certificate(("127.0.0.1", PORT))


def process():
    return run("systemctl", "show", "--value", "--property=MainPID", "vornd").strip()


def reload_until(condition, what):
    run("systemctl", "reload", "vornd")
    wait_for(condition, what)


@pytest.fixture
def first():
    """A box that serves TLS with a new certificate of its own; the certificate."""
    before = SETTINGS.read_bytes() if SETTINGS.exists() else None
    SELF_SIGNED.unlink(missing_ok=True)
    configure()
    run("systemctl", "restart", "vornd")
    wait_for(api.answers, "vornd does not listen")
    yield certificate()
    SETTINGS.unlink() if before is None else SETTINGS.write_bytes(before)
    for path in (SELF_SIGNED, OWN):
        path.unlink(missing_ok=True)
    run("systemctl", "restart", "vornd")
    wait_for(api.answers, "vornd does not listen")


def test_a_client_that_knows_the_certificate_is_served(box, client, first, tmp_path):
    trusted = tmp_path / "box.pem"
    trusted.write_text(first, encoding="ascii")
    tmp_path.chmod(0o755)
    digest = hashlib.sha256(ssl.PEM_cert_to_DER_cert(first)).hexdigest().upper()
    assert ":".join(digest[i:i + 2] for i in range(0, len(digest), 2)) in box.journal.text()
    ask = ("curl", "--silent", "--max-time", "60", "--output", "/dev/null", "--write-out", "%{http_code}")
    url = f"https://{BOX_ADDRESS}:{PORT}"
    assert client.run(*ask, "--cacert", str(trusted), f"{url}/healthz") == "200"
    assert client.run(*ask, "--cacert", str(trusted), f"{url}/api") == "401"
    assert not client.succeeds(*ask, f"{url}/healthz"), "without the certificate"


def test_a_reload_exchanges_the_certificate_and_restarts_nothing(box, first):
    del box
    server = process()
    shutil.copy(SELF_SIGNED, OWN)
    configure("host-names = nas.example")
    reload_until(lambda: certificate() != first, "the server has no certificate for its new name")
    configure(f"[tls]\ncertificate = {OWN}\nkey = {OWN}")
    reload_until(lambda: certificate() == first, "the server does not use the certificate of the settings")
    assert process() == server


def test_a_reload_with_a_fault_fails_and_changes_nothing(box, first):
    del box
    server = process()
    for fault in (f"[tls]\ncertificate = {OWN}\nkey = {OWN}", "[log]\nlevel = loud"):
        configure(fault)
        assert not succeeds("systemctl", "reload", "vornd")
        assert certificate() == first
        assert api.answers()
    assert process() == server
