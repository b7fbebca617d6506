#!/usr/bin/env python3
"""testssl_test: testssl.sh(1) finds nothing above "LOW" on the port with TLS, with a certificate of a test authority.

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


def findings(port, authority, folder):
    """Runs testssl.sh; returns what it has found, by id."""
    output = pathlib.Path(folder) / "findings.json"
    done = subprocess.run(
        ["testssl", "--quiet", "--warnings", "off", "--nodns", "none", "--ip", "127.0.0.1", "--add-ca", authority,
         "--openssl-timeout", "60", "--jsonfile", output, "--color", "0", "--fast", f"localhost:{port}"],
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
        grave = [each for each in found if each["severity"] not in HARMLESS]
        self.assertEqual(grave, [])


if __name__ == "__main__":
    if shutil.which("testssl") is None:
        print("skipped: testssl.sh is not installed")
        sys.exit(SKIPPED)
    unittest.main()
