"""Programs of the box, and processes that run as another user."""

import os
import subprocess
import time


def wait_for(condition, what, limit=180):
    """Waits until the condition holds; fails with `what` if it does not within `limit` seconds."""
    deadline = time.monotonic() + limit
    while not condition():
        assert time.monotonic() < deadline, what
        time.sleep(0.05)


class ProgramFailed(Exception):
    """A program that did not do what it was asked to, and what it said."""


def run(*command, user=None, timeout=300, before=None):
    """What the program printed. `before` runs in the child, where it may change its world."""

    def prepare():
        if before:
            before()
        if user:
            become(user)

    try:
        done = subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True, timeout=timeout,
                              stdin=subprocess.DEVNULL, preexec_fn=prepare, check=False)
    except subprocess.TimeoutExpired:
        raise ProgramFailed(f"{' '.join(command)}: not done after {timeout} s") from None
    if done.returncode != 0:
        raise ProgramFailed(f"{' '.join(command)}: status {done.returncode}: {done.stdout.strip()}")
    return done.stdout


def succeeds(*command, **options):
    """Whether the program does what it is asked to."""
    try:
        run(*command, **options)
    except ProgramFailed:
        return False
    return True


def become(user):
    """Gives this process for good to a User (see users.py)."""
    os.setgroups(user.groups)
    os.setgid(user.gid)
    os.setuid(user.uid)


def as_user(user, action):
    """Does `action` in a child that is the user; raises the OSError that it met there."""
    child = os.fork()
    if child == 0:
        status = 0
        try:
            become(user)
            action()
        except OSError as error:
            status = error.errno
        except BaseException:  # whatever else: not this story's process any more
            status = 255
        os._exit(status)
    _, status = os.waitpid(child, 0)
    if os.waitstatus_to_exitcode(status) != 0:
        raise OSError(os.waitstatus_to_exitcode(status), os.strerror(os.waitstatus_to_exitcode(status)))
