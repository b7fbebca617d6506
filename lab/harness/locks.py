"""POSIX locks of whole files, see fcntl(2), which the kernel's NFS client requests from the server."""

import errno
import fcntl


def lock(path):
    """Locks the file, which is created if it is missing, for this process. Returns the open file, which owns the lock.
    Raises OSError if another machine has the lock."""
    file = open(path, "a", encoding="ascii")  # pylint: disable=consider-using-with
    try:
        fcntl.lockf(file, fcntl.LOCK_EX | fcntl.LOCK_NB)
    except OSError:
        file.close()
        raise
    return file


def is_locked(path):
    """Whether another machine has a lock of the file."""
    try:
        lock(path).close()
    except OSError as failure:
        assert failure.errno in (errno.EAGAIN, errno.EACCES)
        return True
    return False
