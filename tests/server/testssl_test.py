#!/usr/bin/env python3
"""testssl_test: testssl.sh(1) finds nothing above "LOW" on the port with TLS, with a certificate of a test authority.
With the certificate that the server makes, it finds that no authority has signed it, and nothing else.

Skipped (status 77) without testssl.sh. No name is resolved, and nothing but loopback is connected to.
"""

import json
import pathlib
import shutil
import subprocess
import sys
import tempfile
import unittest

import tls_test

SKIPPED = 77
PATIENCE = 1200
HARMLESS = {"OK", "INFO", "LOW", "WARN", "DEBUG"}
NOT_TRUSTED = {"cert_chain_of_trust", "cert_revocation", "cert_trust"}


def grave(found):
    return [each for each in found if each["severity"] not in HARMLESS]


def findings(port, authority, folder, *checks):
    """Runs testssl.sh, with all its checks or the given ones. Returns what it has found."""
    output = pathlib.Path(folder) / "findings.json"
    done = subprocess.run(
        ["testssl", "--quiet", "--warnings", "off", "--nodns", "none", "--ip", "127.0.0.1", "--add-ca", authority,
         "--openssl-timeout", "60", "--jsonfile", output, "--color", "0", "--fast", *checks, f"localhost:{port}"],
        stdin=subprocess.DEVNULL, capture_output=True, text=True, timeout=PATIENCE, check=False)
    if not output.exists():
        raise AssertionError(done.stdout + done.stderr)
    return json.loads(output.read_text("utf-8"))


class Testssl(unittest.TestCase):
    """The rating of a server with a certificate."""

    def test_nothing_above_low_is_found(self):
        with tempfile.TemporaryDirectory() as folder:
            authority = tls_test.Authority(pathlib.Path(folder))
            certificate, key = authority.issue("server")
            with tls_test.Server(f"[tls]\ncertificate = {certificate}\nkey = {key}\n") as server:
                found = findings(server.port("tls:"), authority.certificate, folder)
        names = {each["id"] for each in found}
        for name in ("TLS1_2", "TLS1_3", "cert_chain_of_trust", "secure_client_renego", "heartbleed"):
            self.assertIn(name, names, "testssl.sh has not run to its end")
        self.assertEqual(grave(found), [])

    def test_the_self_signed_certificate_is_only_not_trusted(self):
        with tempfile.TemporaryDirectory() as folder, tls_test.Server() as server:
            certificate = pathlib.Path(folder) / "self-signed.pem"
            certificate.write_text(server.certificate(), encoding="ascii")
            found = findings(server.port("tls:"), certificate, folder, "--server-defaults")
        self.assertIn("cert_chain_of_trust", {each["id"] for each in found}, "testssl.sh has not run to its end")
        self.assertLessEqual({each["id"] for each in grave(found)}, NOT_TRUSTED)


if __name__ == "__main__":
    if shutil.which("testssl") is None:
        print("skipped: testssl.sh is not installed")
        sys.exit(SKIPPED)
    unittest.main()
