"""Runs the steps of a check: some side by side, each in a process group of its own, with its output in build/run/NAME.

A step that fails ends the run, unless it is told to keep going: the steps that are still running are killed with all
their children. The results are kept in build/run/results.json, where those of earlier runs stay until the step runs
again.
"""

import ctypes
import dataclasses
import datetime
import json
import os
import pathlib
import signal
import subprocess
import threading
import time

PROJECT = pathlib.Path(__file__).resolve().parent.parent
FOLDER = PROJECT / "build/run"
RESULTS = FOLDER / "results.json"
GRACE = 10  # seconds between SIGTERM and SIGKILL
SHOWN = 60  # lines of a failed step's output


@dataclasses.dataclass
class Step:
    """A command. It starts after the steps in `after`, which must be listed before it."""
    name: str
    command: tuple
    share: str = ""  # the part of the time budget that it counts for
    lane: str = "main"  # the steps of one lane run one after the other, the lanes side by side
    after: tuple = ()
    wanted: bool = True  # false: skipped in this run


@dataclasses.dataclass
class Result:
    """How a step ended. `status` is its exit status, None while it runs. `stopped`: the run ended it."""
    step: Step
    begun: float
    seconds: float = 0.0
    cpu_seconds: float = 0.0
    status: int = None
    stopped: bool = False

    def outcome(self):
        if self.stopped:
            return "stopped"
        return "passed" if self.status == 0 else f"failed with status {self.status}"


class Stopped(Exception):
    """The run was told to end, or another step has failed."""


class Run:
    """Runs steps, once. Safe to stop() from another thread or a signal handler."""

    def __init__(self, steps, limit_minutes, keep_going=False):
        self._steps = [step for step in steps if step.wanted]
        self._finished = {step.name: threading.Event() for step in self._steps}
        self._deadline = time.monotonic() + 60 * limit_minutes
        self._limit_minutes = limit_minutes
        self._keep_going = keep_going
        self._stop = threading.Event()
        self._lock = threading.Lock()
        self._processes = set()  # of the steps that have been started
        self.results = {}
        self.complaint = ""

    def stop(self, complaint):
        self.complaint = self.complaint or complaint
        self._stop.set()

    def run(self):
        """Returns true if every step succeeded."""
        adopt_orphans()
        FOLDER.mkdir(parents=True, exist_ok=True)
        lanes = dict.fromkeys(step.lane for step in self._steps)
        threads = [threading.Thread(target=self._run_lane, args=(lane,)) for lane in lanes]
        for thread in threads:
            thread.start()
        for thread in threads:
            while thread.is_alive():
                thread.join(0.5)
                self._reap_orphans()
                if time.monotonic() > self._deadline:
                    self.stop(f"the limit of {self._limit_minutes} minutes is exceeded")
        kill_descendants()
        return not self.complaint and len(self.passed()) == len(self._steps)

    def passed(self):
        return [name for name, result in self.results.items() if result.outcome() == "passed"]

    def failed(self):
        return [name for name, result in self.results.items() if result.status != 0 and not result.stopped]

    def _reap_orphans(self):
        """Waits for the adopted orphans that have ended. The steps' own processes are left to their lanes."""
        with self._lock:
            while (pid := ended_child()) is not None and pid not in self._processes:
                os.waitpid(pid, 0)

    def _run_lane(self, lane):
        try:
            for step in self._steps:
                if step.lane == lane:
                    self._await(step.after)
                    self._run_step(step)
        except Stopped:
            pass
        except OSError as error:
            self.stop(f"{lane}: {error}")

    def _await(self, names):
        for name in names:
            while name in self._finished and not self._finished[name].wait(0.2):
                if self._stop.is_set():
                    raise Stopped
        if self._stop.is_set():
            raise Stopped

    def _run_step(self, step):
        result = Result(step, time.time())
        self.results[step.name] = result
        print(f"== {step.name}: {' '.join(step.command)}", flush=True)
        with open(FOLDER / step.name, "wb") as output:
            result.status = self._wait(step, result, output)
        self._keep(result)
        print(f"== {step.name} {result.outcome()} after {result.seconds:.0f} s", flush=True)
        if result.outcome() != "passed" and not self._keep_going:
            self.stop(f"{step.name} {result.outcome()}")
            raise Stopped
        self._finished[step.name].set()

    def _wait(self, step, result, output):
        """Runs the command to its end, or kills it. Returns its exit status."""
        # The other lanes wait for clocks; the compilers of the main lane must not slow them down.
        prefix = ("nice", "-n", "10") if step.lane == "main" else ()
        with self._lock:
            process = subprocess.Popen(  # pylint: disable=consider-using-with
                prefix + step.command, cwd=PROJECT, stdin=subprocess.DEVNULL, stdout=output, stderr=output,
                start_new_session=True)
            self._processes.add(process.pid)
        told = None  # when the step was told to end
        while True:
            pid, status, usage = os.wait4(process.pid, os.WNOHANG)
            result.seconds = time.time() - result.begun
            if pid != 0:
                break
            if self._stop.is_set() and told is None:
                told = result.seconds
                result.stopped = True
                kill_group(process.pid, signal.SIGTERM)
            elif told is not None and result.seconds > told + GRACE:
                kill_group(process.pid, signal.SIGKILL)
            time.sleep(0.1)
        kill_group(process.pid, signal.SIGKILL)  # what the command left behind
        process.returncode = os.waitstatus_to_exitcode(status)
        result.cpu_seconds = usage.ru_utime + usage.ru_stime
        return process.returncode

    def _keep(self, result):
        with self._lock:
            kept = read_results()
            kept[result.step.name] = {
                "command": " ".join(result.step.command), "outcome": result.outcome(),
                "seconds": round(result.seconds), "cpu_seconds": round(result.cpu_seconds),
                "begun": datetime.datetime.fromtimestamp(result.begun).strftime("%Y-%m-%d %H:%M"), "commit": commit()}
            RESULTS.write_text(json.dumps(kept, indent=1) + "\n", encoding="utf-8")


def kill_group(leader, number):
    try:
        os.killpg(leader, number)
    except ProcessLookupError:
        pass


def adopt_orphans():
    """Makes this process the parent of every orphan of a step, see PR_SET_CHILD_SUBREAPER in prctl(2)."""
    ctypes.CDLL(None).prctl(36, 1, 0, 0, 0)


def ended_child():
    """The process ID of a child that has ended and has not been waited for, or None."""
    try:
        ended = os.waitid(os.P_ALL, 0, os.WEXITED | os.WNOHANG | os.WNOWAIT)
    except ChildProcessError:
        return None
    return ended.si_pid if ended else None


def kill_descendants():
    """Kills what left its step's process group and outlived the step."""
    parents = {}
    for stat in pathlib.Path("/proc").glob("[0-9]*/stat"):
        try:
            parents[int(stat.parent.name)] = int(stat.read_text("ascii", "replace").rsplit(")", 1)[1].split()[1])
        except OSError:
            pass  # it has just ended
    family = {os.getpid()}
    while more := {child for child, parent in parents.items() if parent in family} - family:
        family |= more
    for process in family - {os.getpid()}:
        try:
            os.kill(process, signal.SIGKILL)
        except ProcessLookupError:
            pass


def commit():
    return subprocess.run(["git", "rev-parse", "--short", "HEAD"], cwd=PROJECT, capture_output=True, text=True,
                          check=False).stdout.strip()


def read_results():
    """The last result of each step that ever ran in this checkout, by name."""
    return json.loads(RESULTS.read_text(encoding="utf-8")) if RESULTS.exists() else {}


def show_failures(run):
    """Prints the end of the output of each step that did not pass. If the time is up, that is the steps that ran."""
    for name in run.failed() or [name for name, result in run.results.items() if result.stopped]:
        lines = (FOLDER / name).read_text(encoding="utf-8", errors="replace").splitlines()
        print(f"\n== {name} {run.results[name].outcome()}; the end of build/run/{name}:")
        print("\n".join(lines[-SHOWN:]), flush=True)


def show_skipped(run):
    """Prints the tests that scripts/test reports as skipped, with the reasons."""
    for name in run.passed():
        for line in (FOLDER / name).read_text(encoding="utf-8", errors="replace").splitlines():
            if line.startswith("test: skipped"):
                print(f"{name}: {line}")


def show_times(run, steps, shares, limit_minutes):
    """Prints a table of the steps, and of the shares of the time budget (in minutes)."""
    print(f"\n{'step':<14} {'share':<10} {'seconds':>8} {'CPU s':>8}  result")
    used = dict.fromkeys(shares, 0.0)
    for step in steps:
        result = run.results.get(step.name)
        if result is None:
            print(f"{step.name:<14} {step.share:<10} {'-':>8} {'-':>8}  {'not run' if step.wanted else 'not this time'}")
            continue
        used[step.share] = used.get(step.share, 0) + result.seconds
        print(f"{step.name:<14} {step.share:<10} {result.seconds:8.0f} {result.cpu_seconds:8.0f}  "
              f"{result.outcome()}")
    print(f"\n{'share':<10} {'minutes':>8} {'of':>4}")
    for share, minutes in shares.items():
        remark = "  EXCEEDED" if used[share] > 60 * minutes else ""
        print(f"{share:<10} {used[share] / 60:8.1f} {minutes:4}{remark}")
    print(f"The limit of the whole run is {limit_minutes} minutes.", flush=True)
