"""One guest: its folder, its boots, its results."""

import fcntl
import os
import pathlib
import shutil
import signal
import subprocess
import threading

from host import process
from host.cache import PROJECT
from host.log import LabError, say, show

WORK = PROJECT / "build/lab"
_RESULTS = ("verdict", "journal", "results.xml", "install.log", "acknowledged")
NO_STORY = 5  # pytest's exit status
_TIME_LIMIT = 124

_running = {}
_ending = threading.Event()
_lock = threading.RLock()  # the signal handler takes it, too


def end_all():
    """Ends all guests and prevents new ones. Their boot scripts clean up."""
    with _lock:
        _ending.set()
        for child in _running.values():
            child.terminate()


def packages_of(build):
    """The packages that packaging/build has made in a build folder."""
    found = [path for path in (build / "package").glob("vorn-*_*.deb") if "-dbgsym_" not in path.name]
    if not found:
        raise LabError(f"{build / 'package'} has no packages")
    return found


class Guest:
    """A guest with a folder of its own below build/lab, which becomes /lab in it."""

    def __init__(self, name, machine, kernel, image, packages):
        self.folder = WORK / name
        self.share = self.folder / "share"
        self._boot = PROJECT / "lab" / machine / "boot"
        self._inputs = [str(kernel), str(image), str(self.share), str(self.folder / "disk")]
        self._claim()
        self._fill(packages)

    def _claim(self):
        """Locks the guest's folder, because another run of this checkout may use the same name."""
        WORK.mkdir(parents=True, exist_ok=True)
        self._lock = open(f"{self.folder}.lock", "w", encoding="ascii")  # pylint: disable=consider-using-with
        try:
            fcntl.flock(self._lock, fcntl.LOCK_EX | fcntl.LOCK_NB)
        except BlockingIOError:
            raise LabError(f"another run of this checkout has a guest \"{self.folder.name}\"") from None

    def _fill(self, packages):
        shutil.rmtree(self.folder, ignore_errors=True)
        self.share.mkdir(parents=True)
        for name in ("harness", "stories"):
            shutil.copytree(PROJECT / "lab" / name, self.share / name, ignore=shutil.ignore_patterns("__pycache__"))
        (self.share / "packages").mkdir()
        for package in packages:
            shutil.copy(package, self.share / "packages")

    def boot(self, job, environment=None, output=None, boots_again=False):
        """Boots once; the lines of `job` say what the guest is to do. Returns the exit status of its kernel. A guest
        whose disk boots again shuts its services down first."""
        (self.share / "job").write_text("".join(f"{word}\n" for word in job), encoding="utf-8")
        (self.share / "verdict").unlink(missing_ok=True)
        again = self.share / "boots-again"
        again.unlink(missing_ok=True)
        if boots_again:
            again.touch()
        with _lock:
            if _ending.is_set():
                raise LabError("the run was ended")
            child = process.start([str(self._boot), *self._inputs], env={**os.environ, **(environment or {})},
                                  stdin=None if output is None else subprocess.DEVNULL, stdout=output, stderr=output)
            _running[id(self)] = child
        try:
            return child.wait()
        finally:
            with _lock:
                del _running[id(self)]

    def verdict(self, status):
        """The guest's verdict: pytest's exit status. Raises LabError if the guest wrote none."""
        planned = self.share / "dies"
        verdict = self.share / "verdict"
        said = verdict.read_text(encoding="ascii").strip() if verdict.exists() else ""
        if planned.exists():
            planned.unlink()
            if said:
                raise LabError("the guest was to die and did not")
            return 0
        if said:
            return int(said)
        if status == _TIME_LIMIT:
            raise LabError(f"the guest had not ended after {os.environ.get('LIMIT', '3600')} seconds")
        raise LabError(f"the guest died without a verdict (its kernel's status: {status})")

    def keep_results(self, boot):
        """Moves the results of this boot to where the guest cannot change them."""
        for name in _RESULTS:
            left = self.share / name
            if left.exists():
                shutil.copy(left, self.folder / f"{pathlib.Path(name).stem}-{boot}{pathlib.Path(name).suffix}")
        (self.share / "results.xml").unlink(missing_ok=True)


def tell(job, arguments, make_guest, quiet=False):
    """Boots a guest for the job, prints its output and returns its exit status; 5 if no story was selected."""
    guest = make_guest(job.name)
    verdicts = []
    for boot in range(1, job.boots + 1):
        words = ["stories", f"--boot={boot}/{job.boots}", *arguments]
        words += [f"/lab/stories/{story.name}.py" for story in job.stories]
        console = guest.folder / f"console-{boot}"
        with open(console, "wb") as output:
            status = guest.boot(words, output=output, boots_again=boot < job.boots)
        if not quiet:
            show(console.read_text(encoding="utf-8", errors="replace"))
        guest.keep_results(boot)
        try:
            verdicts.append(guest.verdict(status))
        except LabError as error:
            say(f"{job.name}, boot {boot}: {error}")
            verdicts.append(1)
        if verdicts[-1] not in (0, NO_STORY):
            say(f"{job.name} failed; journal and results: {guest.folder.relative_to(PROJECT)}")
            break
    (guest.folder / "disk").unlink(missing_ok=True)
    failures = [verdict for verdict in verdicts if verdict not in (0, NO_STORY)]
    return failures[0] if failures else min(verdicts)


def end_on_signals():
    """SIGTERM, SIGINT and SIGHUP end the guests and the run. So does the end of the process that started the run, which
    may be flock(1) or a shell. Under nohup(1), which ignores SIGHUP, the run goes on."""

    def end(number, _frame):
        end_all()
        raise SystemExit(128 + number)

    signal.signal(signal.SIGTERM, end)
    signal.signal(signal.SIGINT, end)
    if signal.getsignal(signal.SIGHUP) != signal.SIG_IGN:
        signal.signal(signal.SIGHUP, end)
        process.end_with_parent(signal.SIGHUP)
