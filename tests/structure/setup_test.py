#!/usr/bin/env python3
"""setup_test: what scripts/setup, scripts/run and a second configuration do on a machine, tried on stand-ins.

Programs that would change the machine (apt-get, update-rc.d) are replaced by scripts that make the same files. The
folders that they change are temporary file systems of a mount namespace, in which this file runs itself again.
"""

import os
import pathlib
import re
import shutil
import socket
import subprocess
import sys
import tempfile
import unittest

PROJECT = pathlib.Path(__file__).resolve().parents[2]
NOBODY = 65534
SKIPPED = 77

# The packages' programs. A maintainer script asks the policy before it starts a service, and enables it.
APT_GET = """#!/bin/sh
case "$*" in *install*) ;; *) exit 0 ;; esac
if [ -x /usr/sbin/policy-rc.d ]; then /usr/sbin/policy-rc.d nfs-server start || echo "refused" >>"$STAND_IN/starts"; fi
[ -s "$STAND_IN/starts" ] || echo "started" >>"$STAND_IN/starts"
mkdir -p /etc/systemd/system/multi-user.target.wants /etc/rc3.d
ln -sf /lib/systemd/system/nfs-server.service /etc/systemd/system/multi-user.target.wants/nfs-server.service
ln -sf ../init.d/krb5-kdc /etc/rc3.d/S01krb5-kdc
echo "installed nfs-kernel-server" >>"$STAND_IN/packages"
"""
DPKG_QUERY = """#!/bin/sh
case "$*" in
-S*) exit 1 ;;
*Package*) cat "$STAND_IN/packages" ;;
*) grep -q "^installed $3\\$" "$STAND_IN/packages" && echo installed ;;
esac
"""
UPDATE_RC_D = """#!/bin/sh
rm -f /etc/rc?.d/S??"$1"
"""
ALL_INSTALLED = "#!/bin/sh\necho installed\n"
VORND = '#!/bin/sh\nprintf "%s\\n" "$@" >"$STAND_IN/arguments"\n'
CALLED = '#!/bin/sh\necho "$0" >>"$STAND_IN/builds"\n'


def write_program(path, text):
    path.parent.mkdir(parents=True, exist_ok=True)
    path.write_text(text, encoding="utf-8")
    path.chmod(0o755)


class StandIn:
    """A folder with stand-in programs, which come first along PATH, and what they recorded."""

    def __init__(self, folder, programs):
        self.folder = pathlib.Path(folder)
        for name, text in programs.items():
            write_program(self.folder / "bin" / name, text)
        self.environment = dict(os.environ, STAND_IN=str(self.folder), PATH=f"{self.folder}/bin:{os.environ['PATH']}")

    def record(self, name):
        path = self.folder / name
        return path.read_text(encoding="utf-8") if path.exists() else ""

    def run(self, *command, user=None, **variables):
        return subprocess.run(command, env=dict(self.environment, **variables), capture_output=True, text=True,
                              check=False, user=user)


class TestCase(unittest.TestCase):
    def setUp(self):
        folder = tempfile.TemporaryDirectory()
        self.addCleanup(folder.cleanup)
        self.folder = pathlib.Path(folder.name)
        self.folder.chmod(0o755)

    def copy_project(self, folder):
        """Copies the parts of the tree that scripts/run uses, with a vornd that records its arguments."""
        for part in ("scripts", "linux/service"):
            shutil.copytree(PROJECT / part, folder / part, dirs_exist_ok=True)
        write_program(folder / "build/trial/bin/vornd", VORND)
        return folder


class Setup(TestCase):
    """In the mount namespace."""

    LINK = pathlib.Path("/etc/systemd/system/multi-user.target.wants/nfs-server.service")

    def install(self):
        stand_in = StandIn(self.folder, {"apt-get": APT_GET, "dpkg-query": DPKG_QUERY, "update-rc.d": UPDATE_RC_D,
                                         "systemctl": "#!/bin/sh\n"})
        (self.folder / "packages").write_text("installed bash\n", encoding="utf-8")
        (self.folder / "starts").write_text("", encoding="utf-8")
        result = stand_in.run(PROJECT / "scripts/setup", "--install", "nfs-kernel-server")
        self.assertEqual(result.returncode, 0, result.stderr)
        return stand_in, result.stderr

    def setUp(self):
        super().setUp()
        for folder in pathlib.Path("/etc").iterdir():
            shutil.rmtree(folder)

    def test_starts_no_service(self):
        stand_in, _ = self.install()
        self.assertEqual(stand_in.record("starts"), "refused\n")
        self.assertFalse(pathlib.Path("/usr/sbin/policy-rc.d").exists())

    def test_leaves_no_service_enabled_that_was_not_enabled(self):
        _, log = self.install()
        self.assertFalse(self.LINK.is_symlink())
        self.assertFalse(pathlib.Path("/etc/rc3.d/S01krb5-kdc").is_symlink())
        self.assertRegex(log, "disabled and were not started: krb5-kdc nfs-server.service")

    def test_leaves_a_service_enabled_that_was_enabled(self):
        self.LINK.parent.mkdir(parents=True, exist_ok=True)
        self.LINK.symlink_to("/lib/systemd/system/nfs-server.service")
        self.install()
        self.assertTrue(self.LINK.is_symlink())

    def test_keeps_the_policy_of_the_machine(self):
        policy = pathlib.Path("/usr/sbin/policy-rc.d")
        write_program(policy, "#!/bin/sh\nexit 0\n")
        self.addCleanup(policy.unlink)
        stand_in, _ = self.install()
        self.assertEqual(stand_in.record("starts"), "refused\n")
        self.assertEqual(policy.read_text(encoding="utf-8"), "#!/bin/sh\nexit 0\n")

    def test_says_what_it_installed(self):
        _, log = self.install()
        self.assertRegex(log, "setup: installed: nfs-kernel-server")


class Run(TestCase):
    def stand_in(self):
        return StandIn(self.folder, {"dpkg-query": ALL_INSTALLED, "cmake": CALLED})

    def test_works_in_a_folder_too_deep_for_a_socket(self):
        project = self.copy_project(self.folder / ("deep" * 30))
        stand_in = self.stand_in()
        result = stand_in.run(project / "scripts/run", PORT="0")
        self.assertEqual(result.returncode, 0, result.stderr)
        path = re.search(r"unix:(\S+)", stand_in.record("arguments")).group(1)
        self.assertLessEqual(len(path), 107)
        self.addCleanup(shutil.rmtree, pathlib.Path(path).parent)

    def test_listens_on_a_socket_where_its_path_fits(self):
        project = self.copy_project(self.folder / "p")
        stand_in = self.stand_in()
        self.assertEqual(stand_in.run(project / "scripts/run", PORT="0").returncode, 0)
        self.assertIn("unix:", stand_in.record("arguments"))

    def test_finds_a_busy_port_before_it_builds(self):
        project = self.copy_project(self.folder / "p")
        stand_in = self.stand_in()
        with socket.create_server(("127.0.0.1", 0)) as busy:
            port = busy.getsockname()[1]
            result = stand_in.run(project / "scripts/run", PORT=str(port))
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertIn(f"port {port} is in use", result.stderr)
        self.assertEqual(stand_in.record("builds"), "")

    def test_names_the_owner_of_an_earlier_build(self):
        project = self.copy_project(self.folder / "p")
        (project / "build/old").write_text("", encoding="utf-8")
        (project / "build/old").chmod(0o444)
        user = NOBODY if os.geteuid() == 0 else None
        result = self.stand_in().run(project / "scripts/run", user=user, PORT="0")
        self.assertEqual(result.returncode, 1, result.stderr)
        self.assertRegex(result.stderr, "belongs to .*, and .* may not write it")


class Tools(TestCase):
    def test_come_with_the_packages_of_run(self):
        """The programs that README.md and the banner of scripts/run use."""
        setup = (PROJECT / "scripts/setup").read_text(encoding="utf-8")
        packages = re.search(r'\[run\]="([^"]*)"', setup).group(1).split()
        for program, package in {"curl": "curl", "nfsconf": "nfs-common", "kadmin": "krb5-user"}.items():
            self.assertIn(package, packages, program)


class Configuration(TestCase):
    def test_again_compiles_nothing(self):
        """Ninja compiles a source again if its command changes."""
        command = ("cmake", "-S", PROJECT, "-B", self.folder, "-G", "Ninja")
        commands = []
        for _ in range(2):
            subprocess.run(command, check=True, capture_output=True)
            commands.append((self.folder / "compile_commands.json").read_text(encoding="utf-8"))
        self.assertTrue(commands[0] == commands[1], "the second configuration changed a command")


def run_in_namespace():
    """Runs the class Setup in a mount namespace in which /etc and /usr/sbin are empty."""
    mounts = "mount -t tmpfs none /etc && mount -t tmpfs none /usr/sbin || exit; "
    unshare = ("unshare", "--mount", *(() if os.geteuid() == 0 else ("--map-root-user",)), "--", "sh", "-c")
    if subprocess.run((*unshare, mounts), check=False, capture_output=True).returncode != 0:
        print("Skipped\nno mount namespace can be made here")
        return SKIPPED
    command = (*unshare, mounts + 'exec "$@"', "sh", sys.executable, __file__, "Setup")
    return subprocess.run(command, check=False).returncode


def main():
    if sys.argv[1:] == ["--namespace"]:
        return run_in_namespace()
    return unittest.main()


if __name__ == "__main__":
    sys.exit(main())
