"""Kernels and disks, kept in $VORN_LAB_CACHE by a digest of what they are made from."""

import contextlib
import fcntl
import hashlib
import os
import pathlib
import shutil
import tempfile
import time

from host import process
from host.log import LabError, say
from host.process import output_of

PROJECT = pathlib.Path(__file__).resolve().parents[2]
RELEASES = ("bookworm", "trixie")  # of Debian, by their code names


def _folder():
    caches = os.environ.get("XDG_CACHE_HOME") or os.path.expanduser("~/.cache")
    return pathlib.Path(os.environ.get("VORN_LAB_CACHE") or f"{caches}/vorn-lab")


def digest(text, files):
    """A digest of a string and of the contents of these files."""
    result = hashlib.sha256(text.encode())
    for file in files:
        result.update(pathlib.Path(file).read_bytes())
    return result.hexdigest()[:16]


@contextlib.contextmanager
def _locked(file, how):
    with open(file, "a", encoding="ascii") as lock:
        fcntl.flock(lock, how)
        yield


_used = []  # locks of folders that this process uses; held until it ends


class Cache:
    """A cache of folders. Another run does not remove a folder that this run uses."""

    def __init__(self, logs):
        self._folder = _folder()
        self._folder.mkdir(parents=True, exist_ok=True)
        self._logs = logs

    def get(self, name, key, fill):
        """The folder that `fill(folder, log)` fills for this key. Only the newest folder of each name is kept. Of a build
        that fails nothing is kept.

        >>> with tempfile.TemporaryDirectory() as folder:
        ...     os.environ["VORN_LAB_CACHE"] = folder
        ...     kept = Cache(pathlib.Path(folder))
        ...     made = kept.get("disk", "1" * 16, lambda *_: process.output_of("true")).name
        ...     with contextlib.suppress(LabError):
        ...         kept.get("disk", "2" * 16, lambda *_: process.output_of("false"))
        ...     made, sorted(path.name for path in pathlib.Path(folder).iterdir() if path.is_dir())
        ('disk-1111111111111111', ['disk-1111111111111111'])
        """
        with _locked(self._folder / "lock", fcntl.LOCK_EX):
            folder = self._folder / f"{name}-{key}"
            if not folder.is_dir():
                self._remove_old(name)
                self._build(name, folder, fill)
            self._use(folder)
        return folder

    def _build(self, name, folder, fill):
        say(f"building the {name}")
        fresh = pathlib.Path(tempfile.mkdtemp(prefix="new.", dir=self._folder))
        try:
            fresh.chmod(0o755)
            fill(fresh, self._logs / f"{name}.log")
            fresh.rename(folder)
        finally:
            shutil.rmtree(fresh, ignore_errors=True)

    @staticmethod
    def _use(folder):
        lock = open(f"{folder}.lock", "a", encoding="ascii")  # pylint: disable=consider-using-with
        fcntl.flock(lock, fcntl.LOCK_SH)
        _used.append(lock)

    def _remove_old(self, name):
        """Removes folders of the same name and the remains of a killed build, unless another run uses them."""
        for folder in [*self._folder.glob(f"{name}-????????????????"), *self._folder.glob("new.*")]:
            with open(f"{folder}.lock", "a", encoding="ascii") as lock, contextlib.suppress(BlockingIOError):
                fcntl.flock(lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
                shutil.rmtree(folder, ignore_errors=True)
                os.unlink(lock.name)


def _candidate(package):
    """The newest version of a package in the configured archives."""
    for line in output_of("apt-cache", "policy", package).splitlines():
        if line.strip().startswith("Candidate:"):
            return line.split()[-1]
    return "none"


def _this_month():
    return time.strftime("%Y-%m")


def kernel(cache, machine, release):
    """The folder with a release's kernel for this kind of machine ("uml" or "vm"). One that is made in a minimal system is
    made again each month, as the system is."""
    program = PROJECT / "lab" / machine / "kernel"
    files = [program, *program.parent.glob("*.c")]
    newest = _candidate("user-mode-linux") if release.is_here else _this_month()
    return cache.get(f"kernel-{machine}-{release.name}", digest(newest, files),
                     lambda folder, log: release.fill(folder, f"lab/{machine}/kernel", ["lab", f"lab_{machine}"], log))


def disk(cache, release):
    """The folder with the guest's disk image, which is made again each month."""
    others = {f"libraries.{name}" for name in RELEASES if name != release.name}
    files = [path for path in sorted((PROJECT / "lab/guest").iterdir()) if path.name not in others]
    folder = cache.get(f"disk-{release.name}", digest(_this_month(), files),
                       lambda folder, log: release.fill(folder, "lab/guest/disk", ["lab"], log))
    return folder / "disk.img"
