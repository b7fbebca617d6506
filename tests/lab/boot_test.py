"""lab/uml/boot with a program in place of the kernel: the port that it forwards, and what a signal leaves behind."""

import os
import pathlib
import shutil
import signal
import socket
import subprocess
import sys
import tempfile
import time
import unittest

BOOT = pathlib.Path(__file__).resolve().parents[2] / "lab/uml/boot"
NEEDED = ("vde_switch", "slirpvde", "socat", "unshare", "setpriv", "findmnt", "pkill", "ss")
PATIENCE = int(os.environ.get("PATIENCE", "60"))  # seconds


def missing():
    """The reason why this machine cannot forward a port; empty if it can."""
    absent = [program for program in NEEDED if shutil.which(program) is None]
    if absent:
        return f"not installed: {', '.join(absent)}"
    namespaces = subprocess.run(["unshare", "--user", "--map-root-user", "--net", "--pid", "--fork", "true"],
                                capture_output=True, check=False)
    return "" if namespaces.returncode == 0 else "no network namespaces here"


def wait_for(condition):
    limit = time.monotonic() + PATIENCE
    while not condition():
        if time.monotonic() > limit:
            raise AssertionError("what was awaited did not come")
        time.sleep(0.05)


def free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def listeners(port):
    """The addresses at which this machine listens at the port."""
    lines = subprocess.run(["ss", "-Hltn", f"sport = :{port}"], capture_output=True, text=True, check=True).stdout
    return {line.split()[3].rsplit(":", 1)[0] for line in lines.splitlines()}


def processes_with(text):
    """The processes with this text in their command line."""
    found = []
    for folder in pathlib.Path("/proc").glob("[0-9]*"):
        try:
            command = (folder / "cmdline").read_bytes().replace(b"\0", b" ").decode(errors="replace")
        except OSError:
            continue
        if text in command:
            found.append(command)
    return found


class BootTest(unittest.TestCase):
    """A guest whose kernel is a script that notes its arguments and waits."""

    def setUp(self):
        self.folder = pathlib.Path(tempfile.mkdtemp(prefix="boot-test-"))
        self.addCleanup(shutil.rmtree, self.folder)
        kernel = self.folder / "linux"
        kernel.write_text(f"#!/bin/bash\necho \"$@\" >{self.folder}/arguments\nexec -a \"$0\" sleep 600\n", encoding="utf-8")
        kernel.chmod(0o755)
        self.port = free_port()

    def boot(self):
        arguments = [self.folder, self.folder / "image", self.folder / "share", self.folder / "disk"]
        child = subprocess.Popen([BOOT, *arguments], env={**os.environ, "PORT": str(self.port)})  # pylint: disable=R1732
        self.addCleanup(child.wait)
        self.addCleanup(child.terminate)
        wait_for(lambda: (self.folder / "arguments").exists() and listeners(self.port))
        words = (self.folder / "arguments").read_text(encoding="utf-8").split()
        scratch = next(word for word in words if word.startswith("uml_dir=")).removeprefix("uml_dir=").rstrip("/")
        return child, scratch

    def test_listens_at_loopback_only_and_leaves_nothing_after_a_signal(self):
        for number in (signal.SIGTERM, signal.SIGINT):
            with self.subTest(number.name):
                child, scratch = self.boot()
                self.assertEqual(listeners(self.port), {"127.0.0.1"})
                for program in ("vde_switch", "slirpvde", f"{scratch}/linux 600"):
                    self.assertTrue(any(program in command for command in processes_with(scratch)), program)
                child.send_signal(number)
                self.assertEqual(child.wait(PATIENCE), 143)
                self.assertEqual(listeners(self.port), set())
                self.assertFalse(pathlib.Path(scratch).exists())
                wait_for(lambda: not processes_with(scratch))  # pylint: disable=cell-var-from-loop
                (self.folder / "arguments").unlink()


if __name__ == "__main__":
    REASON = missing()
    if REASON:
        print(f"skipped: {REASON}")
        sys.exit(77)
    unittest.main()
