"""Locks and open files, when the service restarts under the clients that hold them."""

import contextlib
import os
import pathlib

import pytest

from harness.locks import is_locked, lock
from harness.programs import wait_for


@pytest.fixture
def long_lease(box):
    """A busy machine must be able to renew its lease, and to reclaim its state within the grace period. The server
    ends the grace period earlier when every client of NFSv4.1 and later has reclaimed its state."""
    settings = pathlib.Path("/etc/nfs.conf.d/lease.conf")
    settings.write_text("[nfsd]\nlease-time=45\ngrace-time=45\n", encoding="ascii")
    box.restart()
    yield
    settings.unlink()


def restart_by_settings(box):
    """A change that restarts the service under its clients, as an administrator makes it."""
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)


@pytest.mark.usefixtures("long_lease")
@pytest.mark.parametrize("version", ["4.0", "4.2"])
def test_open_files_and_locks_of_nfsv4_outlast_a_restart(box, client, other, version):
    data = box.share("data")
    (data / "file").touch()
    box.allow("data", {"client": "10.9.0.0/24"})
    with contextlib.ExitStack() as stack:
        mine = stack.enter_context(client.mounted("/srv/data", version=version, options="hard"))
        theirs = stack.enter_context(other.mounted("/srv/data", version=version, options="hard"))
        file = stack.enter_context(lock(mine / "file"))
        assert is_locked(theirs / "file")
        restart_by_settings(box)
        file.write("after\n")
        file.flush()
        os.fsync(file.fileno())
        assert is_locked(theirs / "file")
        file.close()
        wait_for(lambda: not is_locked(theirs / "file"), "the lock outlives its file")
    assert (data / "file").read_text(encoding="ascii") == "after\n"


@pytest.mark.usefixtures("long_lease")
def test_an_unlinked_open_file_can_be_read_after_a_restart(box, client):
    data = box.share("data")
    (data / "file").write_text("content", encoding="ascii")
    box.allow("data", {"client": client.address})
    with client.mounted("/srv/data", options="hard") as mounted:
        with open(mounted / "file", encoding="ascii") as file:
            os.unlink(mounted / "file")
            restart_by_settings(box)
            assert file.read() == "content"


def test_nfsv3_goes_on_and_locks_again_after_a_restart(box, client, other):
    """The kernel drops the locks of version 3 when its server stops. What must hold: the clients go on, and the lock
    manager gives every lock to one of them only."""
    data = box.share("data")
    (data / "file").touch()
    box.allow("data", {"client": "10.9.0.0/24"})
    box.foresees("lockd: cannot unmonitor (client|other)")  # their status daemons end with the story
    # The kernel registers the lock managers of all network namespaces at the box's rpcbind(8), over its Unix socket.
    # With a fixed port they all register the same one, so that rpcbind always names the box's.
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    with client.locking(), other.locking(), contextlib.ExitStack() as stack:
        mine = stack.enter_context(client.mounted("/srv/data", version="3", options="lock"))
        theirs = stack.enter_context(other.mounted("/srv/data", version="3", options="lock"))
        lock(mine / "file").close()
        box.advanced(statd_port=32766)  # restarts the service
        wait_for(lambda: not is_locked(mine / "file"), "no lock is given after the restart")
        with lock(mine / "file"):
            assert is_locked(theirs / "file")
        assert not is_locked(theirs / "file")
