"""Programs of the box, and processes that run as another user."""

import os
import subprocess
import time


def wait_for(condition, what, limit=400):
    """Waits until the condition holds; fails with `what` if it does not within `limit` seconds. An operation on a mount
    may take a minute where the server does not answer, and several on a busy machine."""
    deadline = time.monotonic() + limit
    while not condition():
        assert time.monotonic() < deadline, what
        time.sleep(0.05)


class ProgramFailed(Exception):
    """A program that failed, with its output."""


def run(*command, user=None, timeout=300, before=None):
    """Runs a program and returns its output. `before` is called in the child, for example to change its namespaces."""

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
    """Whether the program succeeds."""
    try:
        run(*command, **options)
    except ProgramFailed:
        return False
    return True


def become(user):
    """Changes the user of this process permanently to a User (see users.py)."""
    os.setgroups(user.groups)
    os.setgid(user.gid)
    os.setuid(user.uid)


def as_user(user, action):
    """Calls `action` in a child process of the user. Raises the OSError that `action` raised."""
    child = os.fork()
    if child == 0:
        status = 0
        try:
            become(user)
            action()
        except OSError as error:
            status = error.errno
        except BaseException:  # the child must end here, whatever the exception
            status = 255
        os._exit(status)
    _, status = os.waitpid(child, 0)
    if os.waitstatus_to_exitcode(status) != 0:
        raise OSError(os.waitstatus_to_exitcode(status), os.strerror(os.waitstatus_to_exitcode(status)))
