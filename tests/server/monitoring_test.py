#!/usr/bin/env python3
"""monitoring_test: Prometheus reads /metrics of a vornd on a trial root, and evaluates packaging/monitoring.

Skipped (status 77) without Prometheus; in CI it must be there.
"""

import json
import os
import pathlib
import re
import shutil
import socket
import subprocess
import sys
import tempfile
import time
import unittest
import urllib.error
import urllib.parse
import urllib.request

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path.insert(0, str(PROJECT / "scripts"))
from trial_server import TrialServer  # noqa: E402 pylint: disable=wrong-import-position

MONITORING = PROJECT / "packaging/monitoring"
PATIENCE = 120  # seconds for a state that a few scrapes bring
SKIPPED = 77

KERNEL_STATISTICS = """rc 1 2 3
io 4096 8192
th 8 0
net 40 0 40 5
rpc 38 3 1 2 0
proc3 22 7 6 5 4 3 2 1 0 0 0 0 0 0 0 0 0 0 0 0 0 0 9
"""


def queries():
    """The queries of the dashboard, by title."""
    lines = (MONITORING / "queries.yml").read_text("utf-8").splitlines()
    titles = [line.removeprefix("- title: ") for line in lines if line.startswith("- title: ")]
    texts = [line.removeprefix("  query: ") for line in lines if line.startswith("  query: ")]
    return dict(zip(titles, texts, strict=True))


class Prometheus:
    """A Prometheus that scrapes one target, until the end of the "with" statement."""

    def __init__(self, target, token):
        self._target = target
        self._token = token

    def __enter__(self):
        self.folder = pathlib.Path(tempfile.mkdtemp(prefix="prometheus"))
        self._write("token", self._token)
        self._write("prometheus.json", json.dumps({
            "global": {"scrape_interval": "1s", "evaluation_interval": "1s"},
            "rule_files": [str(MONITORING / "alerts.yml")],
            "scrape_configs": [{"job_name": "vorn", "authorization": {"credentials_file": str(self.folder / "token")},
                                "static_configs": [{"targets": [self._target]}]}]}))
        with socket.socket() as free:
            free.bind(("127.0.0.1", 0))
            self._address = f"127.0.0.1:{free.getsockname()[1]}"
        with open(self.folder / "log", "wb") as log:
            self._process = subprocess.Popen(  # pylint: disable=consider-using-with
                ["prometheus", f"--config.file={self.folder}/prometheus.json", f"--storage.tsdb.path={self.folder}/data",
                 f"--web.listen-address={self._address}"], stdout=log, stderr=log)
        return self

    def __exit__(self, *_):
        self._process.kill()
        self._process.wait()
        shutil.rmtree(self.folder)

    def _write(self, name, text):
        (self.folder / name).write_text(text, encoding="utf-8")

    def get(self, path, **parameters):
        """The data of an answer of its HTTP API; None while it starts."""
        url = f"http://{self._address}/api/v1/{path}?{urllib.parse.urlencode(parameters)}"
        try:
            with urllib.request.urlopen(url, timeout=10) as answer:
                return json.load(answer)["data"]
        except OSError:
            return None

    def results(self, query):
        data = self.get("query", query=query)
        return data["result"] if data else []

    def log(self):
        return (self.folder / "log").read_text("utf-8", "replace")


def eventually(condition):
    limit = time.monotonic() + PATIENCE
    while not condition():
        if time.monotonic() > limit:
            return False
        time.sleep(0.2)
    return True


class Monitoring(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(TrialServer())
        statistics = cls.server.root / "proc/net/rpc/nfsd"
        statistics.parent.mkdir(parents=True, exist_ok=True)
        statistics.write_text(KERNEL_STATISTICS, encoding="ascii")
        cls.server.call("/api/VORN.Core.FileServ.NFS/v1/get", {})
        status, answer = cls.server.call("/api/VORN.Server.Token/v1/create", {"name": "prometheus", "role": "reader"})
        assert status == 200, answer
        cls.token = answer["data"]["token"]

    def test_the_page_is_accepted_by_promtool(self):
        status, content_type, page = self.server.request("GET", "/metrics")
        self.assertEqual(status, 200)
        self.assertTrue(content_type.startswith("text/plain; version=0.0.4"))
        check = subprocess.run(["promtool", "check", "metrics"], input=page, capture_output=True, check=False)
        self.assertEqual((check.returncode, check.stdout + check.stderr), (0, b""))

    def test_every_metric_is_documented(self):
        self.server.request("GET", "/metrics")  # counted by the next request
        page = self.server.request("GET", "/metrics")[2].decode()
        kinds = dict(re.findall(r"^# TYPE (\S+) (\S+)$", page, re.MULTILINE))
        meanings = dict(re.findall(r"^# HELP (\S+) (.*)$", page, re.MULTILINE))
        rows = re.findall(r"^\| `(\w+)` \| (\w+) \| .* \| (.*) \|$", (MONITORING / "metrics.md").read_text("utf-8"),
                          re.MULTILINE)
        self.assertIn("vorn_uploads", kinds)
        self.assertEqual({name: (kind, meaning) for name, kind, meaning in rows},
                         {name: (kind, meanings[name]) for name, kind in kinds.items()})

    def test_the_alerts_are_raised_when_they_should(self):
        check = subprocess.run(["promtool", "test", "rules", "alerts_test.yml"], cwd=MONITORING, capture_output=True,
                               text=True, check=False)
        self.assertEqual(check.returncode, 0, check.stdout + check.stderr)

    def test_every_alert_is_tested(self):
        lines = (MONITORING / "alerts.yml").read_text("utf-8").splitlines()
        names = [line.split("alert: ")[1] for line in lines if "- alert: " in line]
        tests = (MONITORING / "alerts_test.yml").read_text("utf-8")
        self.assertTrue(names)
        self.assertEqual([name for name in names if name not in tests], [])

    def test_every_query_has_an_answer(self):
        with Prometheus(self.server.address(), self.token) as prometheus:
            self.assertTrue(eventually(lambda: prometheus.results('up{job="vorn"} == 1')), prometheus.log())
            # Counters that a rate is taken of appear once, and grow later.
            self.server.call("/api/VORN.Core.FileServ.NFS/v1/set", {})
            for title, query in queries().items():
                with self.subTest(title):
                    self.assertTrue(eventually(lambda query=query: prometheus.results(query.removesuffix(" > 0"))), query)
            groups = prometheus.get("rules")["groups"]
            faults = [rule["lastError"] for group in groups for rule in group["rules"] if rule.get("lastError")]
            self.assertEqual(faults, [])

    def test_a_scrape_without_a_token_is_refused(self):
        with self.assertRaises(urllib.error.HTTPError) as refused:
            urllib.request.urlopen(f"http://{self.server.address()}/metrics", timeout=10)
        self.assertEqual(refused.exception.code, 401)


if __name__ == "__main__":
    if not shutil.which("prometheus") or not shutil.which("promtool"):
        print("skipped: there is no Prometheus")
        sys.exit(1 if os.environ.get("CI") == "true" else SKIPPED)
    unittest.main()
