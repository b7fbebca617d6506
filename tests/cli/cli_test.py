#!/usr/bin/env python3
"""cli_test: the command line against a vornd on a trial root, and what is made from the commands."""

import contextlib
import csv
import io
import json
import os
import pathlib
import pty
import shlex
import stat
import subprocess
import sys
import tempfile
import threading
import unittest

import yaml

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path[:0] = [str(PROJECT / "scripts"), str(PROJECT / "cli")]
from trial_server import TrialServer  # noqa: E402 pylint: disable=wrong-import-position
from vorn_cli import parser  # noqa: E402 pylint: disable=wrong-import-position
from vorn_cli.command import Command  # noqa: E402 pylint: disable=wrong-import-position
from vorn_cli.commands import COMMANDS, state  # noqa: E402 pylint: disable=wrong-import-position
from vorn_cli.failure import Exit  # noqa: E402 pylint: disable=wrong-import-position
from vorn_cli.manual import page  # noqa: E402 pylint: disable=wrong-import-position
from vorn_cli.output import Output  # noqa: E402 pylint: disable=wrong-import-position

VORN = PROJECT / "cli/vorn"
NFS = "VORN.Core.FileServ.NFS"


class BoxTest(unittest.TestCase):
    """A fresh trial root for each test."""

    def setUp(self):
        self.server = TrialServer()
        self.server.__enter__()
        self.addCleanup(self.server.__exit__)
        home = tempfile.TemporaryDirectory()
        self.addCleanup(home.cleanup)
        self.environment = {**os.environ, "VORN_SOCKET": str(self.server.socket), "XDG_CONFIG_HOME": home.name}

    def run_vorn(self, line, stdin="", **environment):
        """Runs a command line, given as a shell would get it."""
        return subprocess.run([VORN, *shlex.split(line)], input=stdin, capture_output=True, text=True, timeout=300,
                              env={**self.environment, **environment}, check=False)

    def vorn(self, line, stdin="", **environment):
        """Runs a command that succeeds, and returns what it prints."""
        done = self.run_vorn(line, stdin, **environment)
        self.assertEqual((done.returncode, done.stderr), (0, ""), line)
        return done.stdout

    def refuses(self, line, status, *texts, stdin="", **environment):
        """Runs a command that ends with this status and prints these texts to standard error."""
        done = self.run_vorn(line, stdin, **environment)
        self.assertEqual(done.returncode, status, f"{line}: {done.stderr}")
        for text in texts:
            self.assertIn(text, done.stderr)
        return done

    def json(self, line):
        """What a command prints for programs."""
        return json.loads(self.vorn(f"--json {line}"))


class ServiceTest(BoxTest):
    """vorn nfs, vorn advanced."""

    def test_changes_only_what_is_given(self):
        before = self.json("nfs show")
        self.vorn("nfs set --service on --domain new.example")
        self.assertEqual(self.json("nfs show"), {**before, "enable_nfs": True, "nfs_v4_domain": "new.example"})
        self.vorn("advanced set --fixed-ports on --statd-port 4050 --lockd-port 4051")
        self.assertEqual(self.json("nfs show")["enable_nfs"], True)
        self.vorn("advanced set --lockd-port 4052")
        advanced = self.json("advanced show")
        self.assertEqual((advanced["custom_port_enable"], advanced["statd_port"], advanced["nlm_port"]), (1, 4050, 4052))

    def test_refuses_nothing_and_nonsense(self):
        self.refuses("nfs set", Exit.USAGE, "give at least one option")
        self.refuses("nfs set --nfs4 maybe", Exit.USAGE, "maybe", "vorn nfs set --help")
        self.refuses("nfs set --read-size many", Exit.USAGE, "many")
        self.refuses("nfs frobnicate", Exit.USAGE, "frobnicate")
        self.refuses("nfs set --speed high", Exit.USAGE, "--speed high", "vorn nfs set --help")

    def test_shows_the_reasons_of_the_box(self):
        self.refuses("advanced set --fixed-ports on --statd-port 4050 --lockd-port 4050", Exit.FAILED, "(code 2302,",
                  "statd_port and nlm_port are both 4050")

    def test_prints_words_for_people(self):
        shown = self.vorn("nfs show")
        self.assertRegex(shown, r"(?m)^NFS service: +disabled$")
        self.assertRegex(shown, r"(?m)^Read size: +chosen by the system$")
        self.assertRegex(self.vorn("advanced show"), r"(?m)^Port of statd: +not set$")


class ExplainTest(BoxTest):
    """vorn explain."""

    def test_names_the_rule_that_decides_and_those_that_lose(self):
        self.vorn("nfs set --service on")
        self.vorn("exports add data '*'")
        self.vorn("exports add data 10.0.0.0/24 --access rw --squash guest")
        shown = self.vorn("explain data 10.0.0.5 --user root")
        self.assertRegex(shown, r"(?m)^May mount: +")
        self.assertIn('The rule for "*" of /volume1/data (/etc/exports, line ', shown)
        self.assertIn("a rule for a network comes first", shown)
        self.assertIn("The rule squashes root (root_squash)", shown)
        answer = self.json("explain data 10.0.0.5 --user root --groups 0,50 --security sys --nfs-version 3 --port 1000")
        self.assertEqual(answer["rule"]["client"], "10.0.0.0/24")
        self.assertEqual(answer["identity"]["groups"], [50])

    def test_says_what_would_have_to_change(self):
        self.vorn("exports add data 10.0.0.0/24")
        shown = self.vorn("explain data 10.0.0.5 --port 40000 --nfs-version 4.1")
        self.assertRegex(shown, r"(?m)^May mount: +no$")
        self.assertIn("The NFS service is switched off. Switch NFS on.", shown)
        self.assertIn("(\"insecure\")", shown)

    def test_refuses_what_is_no_question(self):
        self.refuses("explain none 10.0.0.5", Exit.FAILED, "(code 2370,")
        self.refuses("explain data 10.0.0.5 --user nobody-of-this-name", Exit.FAILED, "(code 2380,")
        self.refuses("explain data 10.0.0.5 --port many", Exit.USAGE, "many")
        self.refuses("explain data 10.0.0.5 --security sis", Exit.USAGE, "sis")


class MatrixTest(BoxTest):
    """vorn matrix."""

    def test_lists_the_rights_of_a_client(self):
        self.vorn("nfs set --service on")
        self.vorn("exports add data 10.0.0.0/24 --access rw")
        shown = self.vorn("matrix --client 10.0.0.5")
        self.assertRegex(shown, r"(?m)^data +read and write +10\.0\.0\.0/24$")
        self.assertRegex(shown, r"(?m)^backup +none +-$")

    def test_lists_the_clients_of_a_folder(self):
        self.vorn("nfs set --service on")
        self.vorn("exports add data 10.0.0.0/24 --access ro")
        self.vorn("exports add data '*.example.net' --access rw")
        shown = self.vorn("matrix --share data --security sys")
        self.assertRegex(shown, r"(?m)^10\.0\.0\.0/24 +- +10\.0\.0\.1 +4\.2 +sys read +10\.0\.0\.0/24$")
        self.assertRegex(shown, r"(?m)^\*\.example\.net +- +- +4\.2 +- +-$")
        self.assertIn("- 10.0.0.0/24: 10.0.0.1 stands for the hosts of this network", shown)
        clients = self.json("matrix --share data --nfs-version 3")
        self.assertEqual([flavor["flavor"] for flavor in clients[0]["flavors"]], ["sys", "krb5", "krb5i", "krb5p"])
        self.assertEqual(clients[0]["version"], "3")

    def test_refuses_what_is_no_question(self):
        self.refuses("matrix", Exit.USAGE, "Give either --client or --share.")
        self.refuses("matrix --share data --client 10.0.0.5", Exit.USAGE, "Give either --client or --share.")
        self.refuses("matrix --share none", Exit.FAILED, "(code 2370,")


class HealthTest(BoxTest):
    """vorn health."""

    def write(self, path, text):
        file = self.server.root / path
        file.parent.mkdir(parents=True, exist_ok=True)
        file.write_text(text, "utf-8")

    def test_ends_well_on_a_box_that_has_only_notices(self):
        shown = self.vorn("health")
        self.assertIn("notice: shared_file_system: backup\n", shown)
        self.assertIn("not checked: closed_port: ", shown)
        self.assertIn("The box has 1 notice.", shown)
        self.assertIn("Nothing is wrong as far as it was checked.", self.vorn("health --severity warning"))
        self.assertEqual(self.json("health --kind left_share")["total"], 0)

    def test_tells_the_worst_finding_by_its_status(self):
        self.write("etc/idmapd.conf", "[Translation]\nMethod = static\n[Static]\nroot@X = root\n")
        done = self.refuses("health", Exit.HEALTH_WARNINGS, "The box has 1 warning, 1 notice.")
        self.assertIn("warning: mapping_to_root: root@X /etc/idmapd.conf:4\n", done.stdout)
        self.assertIn("""vorn call VORN.Core.FileServ.NFS.IDMap v1/delete '{"id": ["root@X"]}'""", done.stdout)
        self.write("etc/exports", "/volume1/data *(foo)\n")
        done = self.refuses("--json health --share data", Exit.HEALTH_ERRORS, "The box has 1 error.")
        self.assertEqual(json.loads(done.stdout)["findings"][0]["kind"], "exports_fault")

    def test_tells_the_findings_that_a_rehearsed_change_adds_or_removes(self):
        self.write("etc/idmapd.conf", "[Translation]\nMethod = static\n[Static]\nmallory@X = mallory\n")
        shown = self.vorn("idmap add root@X root --rehearse")
        self.assertIn("- new warning: root@X is mapped to root", shown)
        shown = self.vorn("idmap remove mallory@X --rehearse")
        self.assertIn("- no more warning: mallory@X is mapped to the user mallory", shown)
        self.assertNotIn("- new", shown)

    def test_prints_a_call_that_can_be_run(self):
        self.write("etc/idmapd.conf", "[Translation]\nMethod = static\n[Static]\nroot@X = root\n")
        done = self.run_vorn("health --kind mapping_to_root")
        line = next(line for line in done.stdout.splitlines() if line.startswith("    vorn call "))
        self.vorn(line.removeprefix("    vorn "))
        self.assertEqual(self.json("health --kind mapping_to_root")["findings"], [])

    def test_refuses_what_is_no_question(self):
        self.refuses("health --severity fatal", Exit.USAGE, "fatal")


class ClientsTest(BoxTest):
    """vorn clients. The trial root has one client of NFSv4."""

    def add_client(self, number, address):
        """Adds a client of NFSv4 to the kernel of the trial root."""
        folder = self.server.root / "proc/fs/nfsd/clients" / str(number)
        folder.mkdir()
        (folder / "info").write_text(f'clientid: 0x{number:x}\naddress: "{address}:871"\nname: "c{number}"\n', "ascii")
        (folder / "ctl").touch()
        return folder / "ctl"

    def test_lists_clients(self):
        shown = self.vorn("clients list")
        self.assertRegex(shown, r"(?m)^10\.0\.0\.5 +4\.2 +confirmed .* 2 +1 +/volume1/data +- +7 +Linux NFSv4\.2 work05")
        self.assertEqual(self.json("clients list --filter work05")[0]["client_id"], "0x2e7d35d86553f100")
        self.assertEqual(self.json("clients list --filter nobody"), [])
        self.add_client(8, "10.0.0.6")
        self.assertEqual([client["id"] for client in self.json("clients list")], [7, 8])
        self.assertEqual([client["id"] for client in self.json("clients list --offset 1")], [8])
        self.assertIn("1 of 2", self.vorn("clients list --limit 1"))
        self.refuses("clients list --limit -1", Exit.USAGE, "not negative")

    def test_disconnects_one_client(self):
        control = self.server.root / "proc/fs/nfsd/clients/7/ctl"
        self.assertIn("disconnect: The client loses", self.vorn("clients disconnect 10.0.0.5 --rehearse"))
        self.assertEqual(control.read_text("ascii"), "")
        self.assertIn("has ended", self.vorn("clients disconnect 10.0.0.5"))
        self.assertEqual(control.read_text("ascii"), "expire\n")
        self.assertEqual(self.json("history")[0]["actions"], ["disconnect: done"])
        second = self.add_client(8, "10.0.0.5")
        self.refuses("clients disconnect 10.0.0.5", Exit.USAGE, "several clients of NFSv4: name one of 7, 8")
        self.vorn("clients disconnect 8")
        self.assertEqual(second.read_text("ascii"), "expire\n")
        self.refuses("clients disconnect 10.0.0.9", Exit.FAILED, "no client of NFSv4")


class HistoryTest(BoxTest):
    """vorn history, vorn undo, vorn audit."""

    def test_shows_and_takes_back_a_change(self):
        self.vorn("exports add data 10.0.0.0/24 --access rw")
        change = self.json("history --file /etc/exports")[0]
        self.assertEqual((change["kind"], change["files"]), ("change", ["/etc/exports"]))
        self.assertIn(change["id"][:12], self.vorn("history"))
        self.assertIn("+/volume1/data 10.0.0.0/24", self.vorn(f"history {change['id'][:12]}"))
        self.assertIn("10.0.0.0/24", self.vorn("audit --method SharePrivilege"))
        self.assertIn("-/volume1/data 10.0.0.0/24", self.vorn(f"undo {change['id'][:12]} --rehearse"))
        self.assertEqual(self.json("history")[0]["id"], change["id"], "a rehearsal leaves no trace")
        self.vorn(f"undo {change['id'][:12]}")
        self.assertEqual(self.json("history")[0]["undoes"], change["id"])
        self.assertEqual(self.json("exports show data"), [])
        self.refuses(f"undo {change['id']}", Exit.FAILED, "(code 2394,")
        self.refuses("undo ffff", Exit.FAILED, "(code 2390,")

    def test_shows_a_conflict(self):
        self.vorn("exports add data 10.0.0.0/24 --access rw")
        change = self.json("history")[0]["id"]
        self.vorn("exports add data 10.0.0.0/24 --access ro")
        self.refuses(f"undo {change}", Exit.FAILED, "(code 2391,", "10.0.0.0/24(ro")

    def test_filters(self):
        self.vorn("exports add data 10.0.0.0/24 --access rw")
        self.assertEqual(self.json("history --caller nobody-of-this-name"), [])
        self.assertEqual(self.json("history --file /etc/fstab --days 1 --limit 5"), [])
        self.assertTrue(self.json("audit --days 1"))


class ExportsTest(BoxTest):
    """vorn exports, vorn share."""

    def rules(self, share):
        return self.json(f"exports show {share}")

    def test_adds_replaces_and_removes_rules(self):
        self.vorn("exports add data 10.0.0.0/24 --access rw --squash admin --security sys,krb5p --crossmnt")
        self.vorn("exports add data @staff")
        self.assertEqual([rule["client"] for rule in self.rules("data")], ["10.0.0.0/24", "@staff"])
        first = self.rules("data")[0]
        self.assertEqual((first["privilege"], first["root_squash"], first["crossmnt"], first["async"]),
                         ("rw", "admin", True, False))
        self.assertEqual([name for name, on in first["security_flavor"].items() if on], ["kerberos_privacy", "sys"])
        self.vorn("exports add data 10.0.0.0/24")
        self.assertEqual([(rule["client"], rule["privilege"]) for rule in self.rules("data")],
                         [("10.0.0.0/24", "ro"), ("@staff", "ro")])
        self.vorn("exports remove data @staff")
        self.vorn("exports remove data --all")
        self.assertEqual(self.rules("data"), [])

    def test_copies_rules_from_one_folder_to_another(self):
        rules = self.vorn("--json exports show media")
        self.vorn("exports set data --file -", stdin=rules)
        self.assertEqual(self.rules("data"), json.loads(rules))
        self.vorn("exports set data --file -", stdin="- client: 10.0.0.1\n")
        self.assertEqual(self.rules("data")[0]["privilege"], "ro")

    def test_rehearses_a_change(self):
        before = (self.server.root / "etc/exports").read_bytes()
        rehearsed = self.vorn("exports remove media 10.20.0.0/16 --rehearse")
        self.assertIn("--- /etc/exports\n", rehearsed)
        self.assertIn("- reload: ", rehearsed)
        self.assertIn("- 10.20.0.0/16 at /volume1/media: loses its rule\n", rehearsed)
        self.assertEqual((self.server.root / "etc/exports").read_bytes(), before)
        self.assertEqual(len(self.rules("media")), 2)
        self.refuses("exports add data 10.0.0.256 --rehearse", Exit.FAILED, "not a whole address")

    def test_refuses_what_is_no_list_of_rules(self):
        for text in ("", "a: b", "- 1", "- {privilege: rw}", "["):
            self.refuses("exports set data --file -", Exit.USAGE, stdin=text)
        self.refuses("exports set data --file /none", Exit.USAGE, "/none")
        self.refuses("exports add data 10.0.0.1 --security none", Exit.USAGE, "\"none\" is no security flavour")
        self.refuses("exports add data 10.0.0.256", Exit.FAILED, "not a whole address")
        self.refuses("exports remove data", Exit.USAGE, "--all")
        self.refuses("exports remove data nobody", Exit.FAILED, "no rule for nobody")
        self.refuses("exports show none", Exit.FAILED, "(code 2370,")
        self.assertEqual(self.rules("data"), [])

    def test_makes_a_folder_a_shared_folder_and_back(self):
        self.vorn("share add photos /volume1/photos")
        self.assertIn({"name": "photos", "path": "/volume1/photos", "rules": 0}, self.json("share list --filter PHOTO"))
        self.vorn("exports add photos 10.0.0.1")
        self.assertRegex(self.vorn("exports list"), r"(?m)^photos +1 +10\.0\.0\.1$")
        self.refuses("share remove photos", Exit.FAILED, "(code 2373,")
        self.vorn("exports remove photos --all")
        self.vorn("share remove photos")
        self.refuses("share remove photos", Exit.FAILED, "(code 2370,")
        self.refuses("share add media2 /volume1/media", Exit.FAILED, "(code 2372,")
        self.refuses("share add new /none", Exit.FAILED, "(code 2374,")
        self.assertTrue((self.server.root / "volume1/photos").is_dir())

    def test_never_saves_a_rule_that_it_does_not_wholly_know(self):
        with open(self.server.root / "etc/exports", "a", encoding="ascii") as file:
            file.write("/volume1/data 10.0.0.9(rw,anonuid=4711,anongid=4711)\n")
        rule = self.rules("data")[0]
        if "root_squash" not in rule:
            self.refuses("exports add data 10.0.0.1", Exit.FAILED, "10.0.0.9", "root_squash")
        self.assertIn("anonuid=4711", (self.server.root / "etc/exports").read_text("ascii"))


class IDMapTest(BoxTest):
    """vorn idmap."""

    def test_adds_changes_and_removes_mappings(self):
        self.vorn("idmap add alice@EXAMPLE alice")
        self.vorn("idmap add root@EXAMPLE root")
        self.vorn("idmap change alice@EXAMPLE --user root")
        self.vorn("idmap change alice@EXAMPLE --new-principal a@EXAMPLE")
        self.assertEqual({row["id"]: row["local_name"] for row in self.json("idmap list")},
                         {"a@EXAMPLE": "root", "root@EXAMPLE": "root"})
        self.vorn("idmap remove a@EXAMPLE root@EXAMPLE")
        self.assertEqual(self.json("idmap list"), [])

    def test_says_what_is_wrong(self):
        self.refuses("idmap add alice@EXAMPLE nobody-at-all", Exit.FAILED, "(code 2352,")
        self.refuses("idmap change a@E --user root", Exit.FAILED, "no mapping of a@E")
        self.refuses("idmap remove a@E", Exit.FAILED, "no mapping of a@E")
        self.vorn("idmap add alice@EXAMPLE alice")
        self.refuses("idmap change alice@EXAMPLE", Exit.USAGE, "--user")
        self.refuses("idmap add alice@EXAMPLE alice", Exit.FAILED, "(code 2351,", "alice@EXAMPLE")

    def test_exports_what_it_imports(self):
        text = "kerberos_principal,local_name\r\n\"a,b@EXAMPLE\",alice\r\nroot@EXAMPLE,root\r\n"
        self.vorn("idmap import -", stdin=text)
        self.assertEqual(list(csv.reader(io.StringIO(self.vorn("idmap export")))), list(csv.reader(io.StringIO(text))))
        self.refuses("idmap import -", Exit.USAGE, "mapping 2", "3 columns", stdin="a@E,alice\nb@E,alice,x\n")

    def test_imports_what_the_box_does_not_have(self):
        text = "a@EXAMPLE,alice\nr@EXAMPLE,root\n"
        self.assertEqual(self.vorn("idmap import -", stdin="a@EXAMPLE,alice\n"), "1 mapping added.\n")
        self.assertEqual(self.vorn("idmap import -", stdin=text),
                         "The box has 1 mapping of the file already.\n1 mapping added.\n")
        self.assertEqual(self.vorn("idmap import -", stdin=text), "The box has all mappings of the file already.\n")
        self.assertEqual(json.loads(self.vorn("--json idmap import -", stdin=text)), {"id": []})
        self.refuses("idmap import -", Exit.FAILED, "(code 2351,", stdin="a@EXAMPLE,root\n")
        self.assertEqual(self.vorn("idmap remove a@EXAMPLE r@EXAMPLE"), "2 mappings removed.\n")

    def test_pages_and_suggests(self):
        self.assertIn("root@", self.vorn("idmap suggest"))
        self.assertIn("1 of", self.vorn("idmap suggest --limit 1"))


class StateTest(BoxTest):
    """vorn dump, vorn apply."""

    def test_applying_a_dump_changes_nothing(self):
        dump = self.vorn("dump")
        self.assertEqual(self.vorn("apply - --check", stdin=dump), "The box is in the wanted state.\n")
        self.assertEqual(self.vorn("apply - --yes", stdin=dump), "The box is in the wanted state.\n")

    def test_makes_the_box_what_the_file_says(self):
        self.vorn("idmap add old@EXAMPLE alice")
        self.vorn("idmap add moved@EXAMPLE alice")
        wanted = yaml.safe_load(self.vorn("dump"))
        wanted["nfs"].update(enable_nfs=True, nfs_v4_domain="new.example")
        wanted["ports"] = {"custom_port_enable": True, "statd_port": 4050, "nlm_port": 4051}
        del wanted["shares"]["media"]
        wanted["shares"]["data"]["rules"] = [{"client": "10.0.0.1"}]
        wanted["shares"]["photos"] = {"path": "/volume1/photos", "rules": [{"client": "*", "privilege": "rw"}]}
        wanted["idmap"] = {"moved@EXAMPLE": "root", "new@EXAMPLE": "alice"}
        text = yaml.safe_dump(wanted)
        checked = self.refuses("apply - --check", Exit.DIFFERS, "differs from -: 9 steps", stdin=text)
        self.assertIn("Step 1 would do this:", checked.stdout)
        self.assertIn("enable_nfs: false -> true", checked.stdout)
        self.assertNotIn("photos", self.vorn("share list"))
        self.vorn("apply - --yes", stdin=text)
        self.assertEqual(self.vorn("apply - --check", stdin=text), "The box is in the wanted state.\n")
        self.assertEqual({share["name"]: share["rules"] for share in self.json("share list")},
                         {"backup": 1, "data": 1, "photos": 1})
        self.assertEqual(self.json("nfs show")["nfs_v4_domain"], "new.example")

    def test_leaves_sections_alone_that_the_file_does_not_have(self):
        before = self.vorn("dump")
        self.vorn("apply - --yes", stdin="nfs: {enable_nfs: true}\n")
        after = yaml.safe_load(self.vorn("dump"))
        self.assertEqual(after, {**yaml.safe_load(before), "nfs": {**yaml.safe_load(before)["nfs"], "enable_nfs": True}})

    def test_refuses_files_that_it_does_not_understand(self):
        for text in ("", "[]", "nix: 1", "nfs: [1]", "shares: {a: 1}", "shares: {a: {path: /a, rules: 1}}",
                     "shares: {a: {path: /a, rules: [1]}}", "shares: {a: {path: /a, x: 1}}", "a: [", "\x01"):
            self.refuses("apply - --yes", Exit.USAGE, stdin=text)
        self.refuses("apply /none --yes", Exit.USAGE, "/none")

    def test_asks_only_people(self):
        self.refuses("apply -", Exit.USAGE, "--yes", stdin="nfs: {enable_nfs: true}\n")
        self.assertFalse(self.json("nfs show")["enable_nfs"])

    def test_names_the_step_that_failed(self):
        wanted = "idmap: {a@EXAMPLE: nobody-at-all}\nnfs: {enable_nfs: true}\n"
        self.refuses("apply - --yes", Exit.FAILED, "(code 2352,", "step 1 of 2", stdin=wanted)

    def test_changes_only_what_it_has_read(self):
        present = state.State(nfs={"enable_nfs": False}, ports={}, shares={"a": {"path": "/a", "rules": []}}, idmap={})
        wanted = state.State(nfs={"enable_nfs": True}, shares={"a": {"path": "/a", "rules": [{"client": "*"}]}})
        revisions = state.Revisions(nfs="\"1\"", rules={"a": "\"2\""})
        self.assertEqual([step.revision for step in state.plan(present, wanted, revisions)], ["\"2\"", "\"1\""])
        self.refuses(f"call {NFS} set '{{\"enable_nfs\": true}}' --revision '\"stale\"'", Exit.CHANGED_MEANWHILE,
                  "(code 412,")
        self.assertFalse(self.json("nfs show")["enable_nfs"])


class KeytabTest(BoxTest):
    """vorn keytab."""

    def test_refuses_what_is_no_keytab(self):
        self.refuses("keytab import /none", Exit.USAGE, "/none")
        self.refuses(f"keytab import {__file__}", Exit.FAILED, "(code 2331,")

    def test_imports_a_keytab(self):
        self.server.keytab()
        path = self.server.folder / "nfs.keytab"
        self.vorn(f"keytab import {path}")
        self.assertRegex(self.vorn("keytab show"), r"(?m)^1 +nfs/box\.example@STORAGE\.EXAMPLE +aes256-cts-hmac-sha1-96$")


class AccessTest(BoxTest):
    """vorn token, session, login, whoami."""

    def url(self):
        return f"http://{self.server.address()}"

    def test_makes_lists_and_revokes_tokens(self):
        token = self.vorn("token create backup --role administrator --share data --days 3").strip()
        self.assertRegex(token, "^vorn_")
        self.assertRegex(self.vorn("token list"), r"backup +administrator +all +data")
        self.assertNotIn(token, self.vorn("--json token list"))
        self.vorn("token revoke backup")
        self.refuses("token revoke backup", Exit.FAILED, "no token backup")

    def test_uses_the_token_that_login_keeps(self):
        token = self.vorn("token create admin --role administrator")
        url = self.url()
        self.refuses(f"--url {url} nfs show", Exit.NOT_PERMITTED, "(code 401,")
        self.assertIn("administrator", self.vorn(f"login {url}", stdin=token))
        kept = pathlib.Path(self.environment["XDG_CONFIG_HOME"]) / "vorn/credentials.json"
        self.assertEqual(stat.S_IMODE(kept.stat().st_mode), 0o600)
        self.assertIn("token admin", self.vorn(f"--url {url} whoami"))
        self.assertIn("token admin", self.vorn("whoami", VORN_URL=url))
        kept.chmod(0o644)
        self.refuses(f"--url {url} whoami", Exit.NOT_PERMITTED, "can be read by others")
        kept.chmod(0o600)
        self.vorn(f"logout {url}")
        self.refuses(f"logout {url}", Exit.FAILED, "No token is kept")
        self.refuses(f"--url {url} nfs show", Exit.NOT_PERMITTED)

    def test_keeps_no_token_that_the_box_refuses(self):
        self.refuses(f"login {self.url()}", Exit.NOT_PERMITTED, stdin="vorn_wrong\n")
        self.refuses(f"logout {self.url()}", Exit.FAILED)

    def test_a_reader_may_not_change(self):
        token = self.vorn("token create reader --role reader").strip()
        self.vorn(f"--url {self.url()} nfs show", VORN_TOKEN=token)
        self.refuses(f"--url {self.url()} nfs set --service on", Exit.NOT_PERMITTED, "(code 403,", VORN_TOKEN=token)

    def test_lists_sessions(self):
        self.assertEqual(self.json("session list"), [])
        self.refuses("session end none", Exit.FAILED, "(code 404,")

    def test_says_why_a_box_is_not_reached(self):
        self.refuses("--socket /none nfs show", Exit.NO_CONNECTION, "/none cannot be reached", "Is vornd running?")
        self.refuses("--url http://127.0.0.1:1 nfs show", Exit.NO_CONNECTION, "refused")
        for url in ("box.example", "ftp://box", "http://", "http://a/b", "http://u:p@a", "http://a:0", "http://a:x"):
            self.refuses(f"--url {url} nfs show", Exit.USAGE, "is no URL of a box")
        self.refuses("--url http://a --socket /b nfs show", Exit.USAGE, "two boxes")


class CallTest(BoxTest):
    """vorn call, vorn methods."""

    def test_calls_any_method(self):
        self.assertEqual(json.loads(self.vorn(f"call {NFS} get")), self.json("nfs show"))
        self.assertEqual(json.loads(self.vorn(f"call {NFS} v2/get")), self.json("nfs show"))
        self.assertEqual(json.loads(self.vorn(f"call {NFS}/v2/get")), self.json("nfs show"))
        self.vorn(f"call {NFS}/v1/set '{{\"enable_nfs\": true}}'")
        self.assertEqual(self.json("nfs show")["enable_nfs"], True)
        self.assertEqual(json.loads(self.vorn(f"call {NFS}.SharePrivilege load -", stdin="{\"share_name\": \"data\"}")),
                         {"rule": []})

    def test_refuses_parameters_that_are_no_object(self):
        self.refuses(f"call {NFS} get '['", Exit.USAGE, "no JSON")
        self.refuses(f"call {NFS} get 1", Exit.USAGE, "one JSON object")
        self.refuses(f"call {NFS} none", Exit.FAILED, "(code 404,")
        self.refuses(f"call {NFS}", Exit.USAGE, "vorn methods")
        self.refuses(f"call {NFS}/v1/get get {{}}", Exit.USAGE, "the parameters only")

    def test_lists_the_methods(self):
        listed = {row["method"]: row["reads"] for row in self.json("methods")}
        self.assertEqual(listed[f"{NFS}/v1/get"], True)
        self.assertEqual(listed[f"{NFS}/v1/set"], False)


class TerminalTest(BoxTest):
    """What differs on a terminal."""

    def on_terminal(self, line, answer="", **environment):
        """What a command prints to a terminal, on which a person types `answer`."""
        pid, terminal = pty.fork()
        if pid == 0:
            os.execve(VORN, [str(VORN), *shlex.split(line)], {**self.environment, "TERM": "xterm", **environment})
        if answer:
            os.write(terminal, answer.encode())
        printed = b""
        with contextlib.suppress(OSError):  # EIO: the end of a terminal
            while data := os.read(terminal, 65536):
                printed += data
        return printed.decode(), os.waitstatus_to_exitcode(os.waitpid(pid, 0)[1])

    def test_colours_are_for_terminals(self):
        self.assertIn("\x1b[1m", self.on_terminal("share list")[0])
        self.assertNotIn("\x1b", self.on_terminal("share list", NO_COLOR="1")[0])
        self.assertNotIn("\x1b", self.on_terminal("share list", TERM="dumb")[0])
        self.assertNotIn("\x1b", self.vorn("share list"))

    def test_apply_asks(self):
        path = self.server.folder / "wanted.yaml"
        path.write_text("nfs: {enable_nfs: true}\n", "ascii")
        asked, status = self.on_terminal(f"apply {path}", "n\n")
        self.assertEqual(status, Exit.FAILED)
        self.assertRegex(asked, r"(?s)1\. enable_nfs.*Step 1 would do this:.*- start: .*Carry this out\?")
        self.assertFalse(self.json("nfs show")["enable_nfs"])
        self.assertEqual(self.on_terminal(f"apply {path}", "y\n")[1], Exit.SUCCESS)
        self.assertTrue(self.json("nfs show")["enable_nfs"])

    def test_a_reader_that_leaves_is_no_error(self):
        done = subprocess.run(f"{shlex.quote(str(VORN))} methods | true", shell=True, env=self.environment,
                              capture_output=True, text=True, check=False)
        self.assertEqual(done.stderr, "")


class UsageTest(BoxTest):
    """What all commands have in common."""

    def test_the_global_options_may_follow_the_command(self):
        self.assertEqual(json.loads(self.vorn("exports list --json")), self.json("exports list"))
        self.assertEqual(json.loads(self.vorn(f"nfs show --json --socket {self.server.socket}", VORN_SOCKET="/nowhere")),
                         self.json("nfs show"))
        self.refuses("nfs show --url nonsense", Exit.USAGE, "no URL of a box")

    def test_prints_its_version(self):
        self.assertRegex(self.vorn("--version"), r"^vorn [0-9.]+\n$")

    def test_an_empty_list_is_a_sentence_for_people(self):
        self.assertEqual(self.vorn("exports show data"), "There are no entries.\n")
        self.assertEqual(self.json("exports show data"), [])

    def test_the_help_breaks_no_word(self):
        for line in self.vorn("apply --help", COLUMNS="60").splitlines():
            self.assertLessEqual(len(line), 60)


class OutputTest(unittest.TestCase):
    """Tables and texts without a box."""

    def test_texts_cannot_control_the_terminal(self):
        stdout = io.StringIO()
        Output(stdout=stdout).table([{"a": "x\x1b[2Jy"}], {"A": lambda row: row["a"]})
        self.assertNotIn("\x1b", stdout.getvalue())

    def test_columns_have_the_width_that_a_terminal_shows(self):
        stdout = io.StringIO()
        Output(stdout=stdout).table([{"a": "\u65e5\u672c", "b": 1}, {"a": "e\u0301", "b": 2}, {"a": "long", "b": 3}],
                                    {"A": lambda row: row["a"], "B": lambda row: row["b"]})
        self.assertEqual(stdout.getvalue(), "A     B\n\u65e5\u672c  1\ne\u0301     2\nlong  3\n")

    def test_progress_is_shown_after_a_second_only(self):
        class Terminal(io.StringIO):  # pylint: disable=missing-class-docstring
            def isatty(self):
                return True
        stderr = Terminal()
        with Output(stderr=stderr).progress("waiting"):
            pass
        self.assertEqual(stderr.getvalue(), "")
        shown = threading.Event()
        stderr.flush = shown.set
        with Output(stderr=stderr).progress("waiting"):
            self.assertTrue(shown.wait(60))
        self.assertIn("waiting ... 1 s", stderr.getvalue())


class DocumentsTest(unittest.TestCase):
    """What is made from the commands."""

    def test_each_command_has_an_example_that_the_parser_accepts(self):
        for command in COMMANDS:
            self.assertIsInstance(command, Command)
            self.assertTrue(command.examples, command.words)
            for _, line in command.examples:
                words = [shlex.split(part) for part in line.split(" | ")]
                for one in words:
                    one = one[:one.index(">")] if ">" in one else one
                    self.assertEqual(one[0], "vorn")
                    parser.build().parse_args(one[1:])

    def test_the_manual_page_is_well_formed(self):
        with tempfile.NamedTemporaryFile("w", suffix=".1") as file:
            file.write(page())
            file.flush()
            done = subprocess.run(["groff", "-man", "-ww", "-z", file.name], capture_output=True, text=True, check=False)
        self.assertEqual(done.stderr, "")
        for command in COMMANDS:
            self.assertIn(f"\\fBvorn {command.words}\\fR", page())

    def test_each_shell_accepts_its_completions(self):
        for shell, check in (("bash", ["bash", "-n"]), ("zsh", ["zsh", "-n"]), ("fish", ["fish", "--no-execute"])):
            script = subprocess.run([VORN, "completion", shell], capture_output=True, text=True, check=True).stdout
            self.assertIn("exports", script)
            with contextlib.suppress(FileNotFoundError):  # a shell that is not installed
                subprocess.run(check, input=script, text=True, check=True)


if __name__ == "__main__":
    unittest.main()
