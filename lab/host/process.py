"""Child processes that never outlive the lab."""

import ctypes
import os
import signal
import subprocess

from host.log import LabError

_PR_SET_PDEATHSIG = 1
_libc = ctypes.CDLL(None)


def end_with_parent(number=signal.SIGTERM):
    """prctl(2): this process gets the signal when the thread that started it ends, for whatever reason."""
    _libc.prctl(_PR_SET_PDEATHSIG, number)


def start(command, **options):
    """Popen; the child cleans up after itself when it gets SIGTERM."""
    return subprocess.Popen(command, preexec_fn=end_with_parent, **options)


def build(command, log, **options):
    """Runs a build step with its output in a log file. Raises LabError with the log's end."""
    with open(log, "w", encoding="utf-8") as output:
        # In a session of its own, so that the programs that it has started can be ended with it.
        child = start(command, stdin=subprocess.DEVNULL, stdout=output, stderr=subprocess.STDOUT,
                      start_new_session=True, **options)
        try:
            status = child.wait()
        except BaseException:
            os.killpg(child.pid, signal.SIGTERM)
            child.wait()
            raise
    if status != 0:
        lines = log.read_text(encoding="utf-8", errors="replace").splitlines()
        raise LabError("\n".join([*lines[-20:], f"{os.path.basename(command[0])} failed: see {log}"]))


def output_of(*command, cwd=None):
    """Runs a program and returns its output. Raises LabError."""
    done = subprocess.run(command, capture_output=True, text=True, check=False, cwd=cwd)
    if done.returncode != 0:
        raise LabError(f"{' '.join(command)}: {done.stderr.strip()}")
    return done.stdout
