#!/usr/bin/env python3
"""ansible_test: the Ansible collection against a vornd on a trial root.

Skipped (status 77) without Ansible; in CI it must be there.
"""

import json
import os
import pathlib
import shutil
import subprocess
import sys
import tempfile
import unittest

import yaml

PROJECT = pathlib.Path(__file__).resolve().parents[2]
sys.path[:0] = [str(PROJECT / "scripts"), str(PROJECT / "cli")]
from trial_server import TrialServer  # noqa: E402 pylint: disable=wrong-import-position
from vorn_cli.api import Api  # noqa: E402 pylint: disable=wrong-import-position

SKIPPED = 77
NFS = "VORN.Core.FileServ.NFS"
MODULES = ("advanced", "exports", "idmap", "keytab", "service", "share")
# The checks of ansible-test that need no packages from a network. No version has all of them.
SANITY = ("empty-init", "line-endings", "no-assert", "no-basestring", "no-dict-iteritems",
          "no-main-display", "no-smart-quotes", "no-unicode-literals", "replace-urlopen", "shebang", "symlinks",
          "use-argspec-type-path", "use-compat-six")
# Its check of modules, which it would run in an environment of its own.
VALIDATE = pathlib.Path("/usr/lib/python3/dist-packages/ansible_test/_util/controller/sanity/validate-modules")


def files_below(folder):
    """The content of all files below a folder, by path."""
    return {path: path.read_bytes() for path in sorted(folder.rglob("*")) if path.is_file() and not path.is_symlink()}


class CollectionTest(unittest.TestCase):
    """A fresh trial root for each test; the collection is built once."""

    @classmethod
    def setUpClass(cls):
        cls.folder = pathlib.Path(tempfile.mkdtemp(prefix="vorn-ansible-"))
        cls.addClassCleanup(shutil.rmtree, cls.folder)
        subprocess.run([PROJECT / "packaging/ansible/build", cls.folder], check=True, stdout=subprocess.DEVNULL)
        cls.environment = {**os.environ, "ANSIBLE_COLLECTIONS_PATH": str(cls.folder), "ANSIBLE_HOME": str(cls.folder / "home"), "ANSIBLE_LOCAL_TEMP": str(cls.folder / "local"),
                           "ANSIBLE_REMOTE_TEMP": str(cls.folder / "remote"), "ANSIBLE_NOCOLOR": "1", "LC_ALL": "C.UTF-8", "PYTHONDONTWRITEBYTECODE": "1"}

    def setUp(self):
        self.server = TrialServer()
        self.server.__enter__()
        self.addCleanup(self.server.__exit__)
        self.api = Api(str(self.server.socket))

    def play(self, *tasks, check=False):
        """Runs tasks, each a module and its options, and returns their results."""
        results = self.folder / "results.json"
        names = [f"result_{number}" for number in range(len(tasks))]
        steps = [{f"vorn.nfs.{module}": options, "ignore_errors": True, "register": name}
                 for name, (module, options) in zip(names, tasks)]
        steps.append({"ansible.builtin.copy": {"content": f"{{{{ [{', '.join(names)}] | to_json }}}}", "dest": str(results)},
                      "check_mode": False, "diff": False})
        play = [{"hosts": "localhost", "gather_facts": False, "tasks": steps, "module_defaults": {
            f"vorn.nfs.{module}": {"socket": str(self.server.socket)} for module in MODULES}}]
        book = self.folder / "play.yml"
        book.write_text(yaml.safe_dump(play), "utf-8")
        done = subprocess.run(["ansible-playbook", "--connection", "local", "--diff", *(["--check"] if check else []),
                               "--extra-vars", "ansible_python_interpreter=/usr/bin/python3", "--inventory", "localhost,",
                               book], env=self.environment, capture_output=True, text=True, timeout=600, check=False)
        self.assertEqual(done.returncode, 0, done.stdout + done.stderr)
        return json.loads(results.read_text("utf-8"))

    def data(self, method, parameters=None):
        return self.api.call(method, parameters).data


class PlaybookTest(CollectionTest):
    """Playbooks of all modules. Starting Ansible takes seconds, so that a playbook has many tasks."""

    def wanted(self):
        """Tasks that do not depend on each other, and each change a fresh trial root."""
        self.server.keytab()
        (self.server.root / "volume1/projects").mkdir()
        return (
            ("service", {"enabled": True, "domain": "new.example", "unix_permissions": True}),
            ("advanced", {"fixed_ports": True, "statd_port": 4050, "lockd_port": 4051}),
            ("share", {"name": "projects", "path": "/volume1/projects"}),
            ("exports", {"share": "data", "rules": [
                {"client": "10.20.0.0/16"},
                {"client": "build01.example.net", "access": "rw", "squash": "root", "security": ["krb5p", "sys"],
                 "async": True}]}),
            ("exports", {"share": "media", "rules": []}),
            ("idmap", {"mappings": {"one@EXAMPLE": "alice", "two@EXAMPLE": "bob"}, "state": "exact"}),
            ("keytab", {"src": str(self.server.folder / "nfs.keytab")}),
        )

    def test_a_playbook_changes_a_box_once(self):
        tasks = self.wanted()
        before = files_below(self.server.root)
        foretold = self.play(*tasks, check=True)
        self.assertEqual(files_below(self.server.root), before, "check mode")
        made = self.play(*tasks)
        for (module, _), foreseen, result in zip(tasks, foretold, made):
            self.assertFalse(result["failed"], result)
            self.assertTrue(foreseen["changed"] and result["changed"], result)
            if module in ("exports", "share"):  # the files of the others are changed by two tasks
                self.assertEqual((result["diff"], result["rules"]), (foreseen["diff"], foreseen["rules"]))
        self.check_effects(made)
        after = files_below(self.server.root)
        for result in self.play(*tasks):
            self.assertEqual((result["failed"], result["changed"], result["diff"]), (False, False, []), result)
        self.assertEqual(files_below(self.server.root), after, "the second run")

    def check_effects(self, made):
        service = self.data(f"{NFS}/v1/get")
        self.assertEqual((service["enable_nfs"], service["nfs_v4_domain"], service["unix_pri_enable"]),
                         (True, "new.example", True))
        self.assertIn("+Domain = new.example", json.dumps(made[0]["diff"]))
        ports = self.data(f"{NFS}.AdvancedSetting/v1/get")
        self.assertEqual((ports["custom_port_enable"], ports["statd_port"], ports["nlm_port"]), (1, 4050, 4051))
        shares = {share["name"]: share["path"] for share in self.data("VORN.Core.Share/v1/list")["shares"]}
        self.assertEqual(shares["projects"], "/volume1/projects")
        rules = self.data(f"{NFS}.SharePrivilege/v1/load", {"share_name": "data"})["rule"]
        self.assertEqual([(rule["client"], rule["privilege"], rule["async"]) for rule in rules],
                         [("10.20.0.0/16", "ro", False), ("build01.example.net", "rw", True)])
        self.assertEqual(self.data(f"{NFS}.SharePrivilege/v1/load", {"share_name": "media"})["rule"], [])
        self.assertEqual({change["change"] for rule in made[4]["rules"] for change in rule["changes"]}, {"removed"})
        rows = {row["id"]: row["local_name"] for row in self.data(f"{NFS}.IDMap/v1/list")["idmap"]}
        self.assertEqual(rows, {"one@EXAMPLE": "alice", "two@EXAMPLE": "bob"})
        self.assertEqual(len(self.data(f"{NFS}.Kerberos/v1/list")["keytab"]), 1)
        self.assertIn("nfs/box.example@STORAGE.EXAMPLE", json.dumps(made[6]["diff"]))

    def test_steps_back(self):
        (self.server.root / "volume1/projects").mkdir()
        results = self.play(
            ("idmap", {"mappings": {"one@EXAMPLE": "alice"}}),
            ("idmap", {"mappings": {"one@EXAMPLE": "bob"}}),
            ("idmap", {"mappings": {"one@EXAMPLE": ""}, "state": "absent"}),
            ("share", {"name": "projects", "path": "/volume1/projects"}),
            ("share", {"name": "projects", "state": "absent"}),
            ("advanced", {"fixed_ports": True, "statd_port": 4050, "lockd_port": 4051}),
            ("advanced", {"lockd_port": 4052}),
            ("advanced", {"fixed_ports": False}))
        self.assertEqual([result["changed"] for result in results], [True] * len(results), results)
        self.assertNotIn("one@EXAMPLE", json.dumps(self.data(f"{NFS}.IDMap/v1/list")))
        self.assertNotIn("projects", json.dumps(self.data("VORN.Core.Share/v1/list")))
        self.assertTrue((self.server.root / "volume1/projects").is_dir())
        self.assertFalse(self.data(f"{NFS}.AdvancedSetting/v1/get")["custom_port_enable"])

    def test_what_the_box_refuses_fails_and_changes_nothing(self):
        self.play(("service", {"nfs4": False}))
        refused = (
            (("service", {"domain": "new.example"}), "only be set where NFSv4 is enabled"),
            (("service", {}), "one of the following is required"),
            (("service", {"enabled": True, "socket": "/none"}), "/none cannot be reached"),
            (("advanced", {"statd_port": 4060}), "only be set where fixed ports are enabled"),
            (("advanced", {"fixed_ports": True, "statd_port": 4050, "lockd_port": 4050}), "code 2302"),
            (("share", {"name": "media", "path": "/volume1/data"}), "is /volume1/media"),
            (("share", {"name": "media", "state": "absent"}), "code 2373"),
            (("share", {"name": "media"}), "path"),
            (("exports", {"share": "data", "rules": [{"client": "10.0.0.256"}]}), "10.0.0.256"),
            (("exports", {"share": "none", "rules": []}), "code 2370"),
            (("idmap", {"mappings": {"four@EXAMPLE": "nobody-has-this-name"}}), "code 2352"),
            (("keytab", {"src": "/none"}), "cannot be read"),
            (("keytab", {"src": __file__}), "code 2331"),
        )
        before = files_below(self.server.root)
        for check in (True, False):
            results = self.play(*(task for task, _ in refused), check=check)
            for result, (task, text) in zip(results, refused):
                self.assertTrue(result["failed"], task)
                self.assertIn(text, result["msg"] + json.dumps(result.get("reasons")), task)
        self.assertEqual(files_below(self.server.root), before)

    def test_a_token_over_the_network(self):
        url = f"http://{self.server.address()}"
        token = self.data("VORN.Server.Token/v1/create", {"name": "playbook", "role": "administrator"})["token"]
        good, bad = self.play(("service", {"enabled": True, "url": url, "token": token}),
                              ("service", {"enabled": False, "url": url, "token": "wrong"}))
        self.assertTrue(good["changed"], good)
        self.assertNotIn(token, json.dumps(good))
        self.assertTrue(bad["failed"], bad)
        self.assertTrue(self.data(f"{NFS}/v1/get")["enable_nfs"])


class SanityTest(CollectionTest):
    """The checks of Ansible for collections, as far as they need no network."""

    def run_in_collection(self, *command, **environment):
        """Runs a program in the folder of the collection, and returns what it prints."""
        return subprocess.run(command, cwd=self.folder / "ansible_collections/vorn/nfs", env={**self.environment, **environment},
                              capture_output=True, text=True, timeout=600, check=False)

    def test_sanity(self):
        checks = [name for name in SANITY if (VALIDATE.parent / "code-smell" / f"{name}.py").exists()]
        self.assertGreaterEqual(len(checks), 8)
        options = [word for name in checks for word in ("--test", name)]
        done = self.run_in_collection("ansible-test", "sanity", "--color", "no", "--python", "default", *options)
        self.assertEqual(done.returncode, 0, done.stdout + done.stderr)

    def test_arguments_are_those_of_the_documentation(self):
        done = self.run_in_collection("/usr/bin/python3", VALIDATE / "validate.py", "--collection",
                                      "ansible_collections/vorn/nfs", "--format", "json", "plugins/modules",
                                      PYTHONPATH=f"{VALIDATE}:{self.folder}")
        if "No module named 'antsibull_docs_parser'" in done.stderr:
            self.skipTest("the check needs antsibull-docs-parser, which is no package of this release of Debian")
        errors = [error for report in json.loads(done.stdout).values() for error in report["errors"]
                  if error["code"] != "missing-gplv3-license"]  # asked for by Ansible's own modules
        self.assertEqual(errors, [], done.stderr)

    def test_each_module_is_documented(self):
        for module in MODULES:
            done = self.run_in_collection("ansible-doc", "--json", f"vorn.nfs.{module}")
            self.assertIn("socket", json.loads(done.stdout)[f"vorn.nfs.{module}"]["doc"]["options"], done.stderr)


if __name__ == "__main__":
    if shutil.which("ansible-playbook") is None:
        print("skipped: Ansible is not installed")
        sys.exit(1 if os.environ.get("CI") == "true" else SKIPPED)
    unittest.main()
