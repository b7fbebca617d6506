"""The power fails while clients hold locks: the next boot lets them reclaim what they had before anybody else gets it.

The clients of the lab have the box's kernel and lose their locks with it, so no reclaim itself can be seen. What the box
does for it can: it tells the clients of NFSv3 that it has rebooted, and keeps those of NFSv4 their grace period."""

import contextlib
import pathlib
import threading
import time

import pytest

from harness.locks import lock
from harness.programs import run, wait_for

BOOTS = 2

DIES = pathlib.Path("/lab/dies")  # tells the host that the guest ends without a verdict
MONITORED = pathlib.Path("/var/lib/nfs/sm")  # a file for each client that rpc.statd(8) notifies after a reboot
_TOO_LONG_FOR_LOCKD = "rpc.nfsd: Unable to write nlm_grace_period"  # the grace period of NFSv4 that the story sets
_OPEN = 18  # the operation's number, see RFC 7530, 16.16


@pytest.mark.boot(1)
def test_the_power_fails_while_clients_hold_locks(box, client):
    data = box.share("data")
    for name in ("three", "four"):
        (data / name).touch()
    box.allow("data", {"client": "10.9.0.0/24"})
    # Longer than any boot. The grace period of NFSv4 ends earlier when all clients have reclaimed their state.
    pathlib.Path("/etc/nfs.conf.d/lease.conf").write_text("[nfsd]\nlease-time=90\ngrace-time=900\n", encoding="ascii")
    # See harness/network.py: with a fixed port all lock managers of this kernel register the same one.
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    with contextlib.ExitStack() as stack:
        stack.enter_context(client.locking())
        three = stack.enter_context(client.mounted("/srv/data", version="3", options="lock"))
        four = stack.enter_context(client.mounted("/srv/data", version="4.2"))
        stack.enter_context(lock(three / "three"))
        stack.enter_context(lock(four / "four"))
        wait_for(lambda: list(MONITORED.iterdir()), "the client is not monitored")
        run("sync")
        DIES.touch()
        pathlib.Path("/proc/sysrq-trigger").write_text("o", encoding="ascii")
        time.sleep(60)
    pytest.fail("the power has not failed")


def opens():
    """The number of OPEN operations that the server has answered."""
    statistics = pathlib.Path("/proc/net/rpc/nfsd").read_text(encoding="ascii").splitlines()
    (operations,) = [line.split() for line in statistics if line.startswith("proc4ops ")]
    return int(operations[2 + _OPEN])


@pytest.mark.boot(2)
def test_nobody_gets_a_lock_of_nfsv4_before_its_owner_has_returned(box, client, other):
    box.foresees(_TOO_LONG_FOR_LOCKD)
    assert "no clients to reclaim" not in box.journal.text()
    with other.mounted("/srv/data", version="4.2") as theirs:
        before = opens()
        attempt = threading.Thread(target=lambda: lock(theirs / "four").close())
        attempt.start()
        wait_for(lambda: opens() > before, "the client does not ask for the file")
        assert attempt.is_alive(), "a lock is given although its owner may still reclaim it"
        with client.mounted("/srv/data", version="4.2"):  # says that it has nothing to reclaim
            wait_for(lambda: not attempt.is_alive(), "no lock is given after its owner has returned")


@pytest.mark.boot(2)
def test_the_clients_of_nfsv3_are_told_to_reclaim_their_locks(box, client):
    log = pathlib.Path("/tmp/statd.log")
    box.foresees(_TOO_LONG_FOR_LOCKD)
    box.foresees("sm-notify")  # it cannot reach the client before this story has created it
    with client.locking(log=str(log)):
        wait_for(lambda: "SM_NOTIFY from" in log.read_text(encoding="utf-8", errors="replace"),
                 "the client is not told of the reboot")
