"""A failing environment: a service that does not start, a full disk, a server that is killed while it saves."""

import pathlib
import random
import threading
import time

import pytest

from harness import api
from harness.programs import run, succeeds, wait_for


@pytest.fixture
def broken_service(box):
    """nfs-server cannot be started until the returned function is called."""
    del box
    folder = pathlib.Path("/run/systemd/system/nfs-server.service.d")
    folder.mkdir(parents=True, exist_ok=True)

    def mend():
        (folder / "broken.conf").unlink(missing_ok=True)
        run("systemctl", "daemon-reload")

    (folder / "broken.conf").write_text("[Service]\nExecStart=\nExecStart=/bin/false\n", encoding="ascii")
    run("systemctl", "daemon-reload")
    yield mend
    mend()


def test_a_service_that_does_not_start_is_an_error_that_the_log_explains(box, client, broken_service):
    box.share("data")
    box.allow("data", {"client": client.address})
    box.nfs(enable_nfs=False)
    with pytest.raises(api.Refused) as refusal:
        box.nfs(enable_nfs=True)
    assert refusal.value.code == 2302
    assert "nfs-server.service" in box.journal.text()
    assert "the job ended as" in box.journal.text()
    broken_service()
    box.nfs(enable_nfs=True)
    assert client.mounts("/srv/data")
    box.foresees(r"nfs-server\.service|failed to restart service nfs|^vornd: \S+ Request: ")


@pytest.fixture
def no_number_of_threads(box):
    """A fault in the settings of the kernel's server, with which its unit becomes active without a thread."""
    box.nfs(enable_nfs=False)
    settings = pathlib.Path("/etc/nfs.conf.d/zz-fault.conf")
    settings.write_text("[nfsd]\nthreads = many\n", encoding="ascii")
    yield settings.unlink
    settings.unlink(missing_ok=True)


def test_a_start_without_threads_is_an_error(box, client, no_number_of_threads):
    box.foresees(r"failed to (re)?start service nfs|no threads|^vornd: \S+ Request: |^nfsdcld: cld_pipe_read_msg: ")
    box.share("data")
    box.allow("data", {"client": client.address})
    with pytest.raises(api.Refused) as refusal:
        box.nfs(enable_nfs=True)
    assert refusal.value.code == 2302
    assert box.threads() == 0
    no_number_of_threads()
    box.nfs(enable_nfs=True)
    assert client.mounts("/srv/data")


@pytest.fixture
def full_etc(box):
    """/etc is on a file system of its own without room for another file, until the returned function is called."""
    box.share("data")
    run("mount", "-t", "tmpfs", "-o", "size=8m", "none", "/mnt")
    run("cp", "-a", "/etc/.", "/mnt")
    run("mount", "--bind", "/mnt", "/etc")
    run("umount", "/mnt")
    run("systemctl", "restart", "vornd")
    filler = pathlib.Path("/etc/filler")
    succeeds("dd", "if=/dev/zero", f"of={filler}", "bs=4k")
    yield filler.unlink
    run("systemctl", "stop", "vornd")
    run("umount", "-l", "/etc")
    run("systemctl", "daemon-reload")
    run("systemctl", "start", "vornd")


def contents(folder):
    return {path: path.read_bytes() for path in pathlib.Path(folder).iterdir() if path.is_file()}


def test_a_full_etc_loses_nothing(box, client, full_etc):
    box.foresees(r"No space left on device|Failed to VORN\w+|^vornd: \S+ Request: ")
    before = contents("/etc")
    with pytest.raises(api.Refused) as refusal:
        box.allow("data", {"client": client.address})
    assert refusal.value.code == 2302
    with pytest.raises(api.Refused):
        box.nfs(nfs_v4_domain="no.room.example")
    assert contents("/etc") == before
    full_etc()
    box.allow("data", {"client": client.address})
    assert client.mounts("/srv/data")


class Administrator(threading.Thread):
    """Saves rules of a share without a pause, and knows which were acknowledged."""

    def __init__(self, box, share):
        super().__init__()
        self._box = box
        self._share = share
        self._finished = threading.Event()
        self.tried = 0
        self.acknowledged = 0

    def run(self):
        while not self._finished.is_set():
            self.tried += 1
            try:
                self._box.allow(self._share, {"client": f"10.1.{self.tried // 250}.{self.tried % 250 + 1}"})
                self.acknowledged = self.tried
            except (OSError, api.Refused, ValueError):
                time.sleep(0.05)  # the server is gone for the moment

    def finish(self):
        self._finished.set()
        self.join()

    def number_in_force(self):
        (rule,) = self._box.rules(self._share)
        _, _, high, low = rule["client"].split(".")
        return int(high) * 250 + int(low) - 1


def test_a_server_killed_while_it_saves_loses_nothing_that_it_acknowledged(box, client):
    box.share("good")
    box.allow("good", {"client": client.address})
    for number in range(2):
        box.share(f"share{number}")
    administrators = [Administrator(box, f"share{number}") for number in range(2)]
    chance = random.Random(7)
    for administrator in administrators:
        administrator.start()
    for _ in range(8):
        wait_for(api.answers, "vornd does not come back")
        time.sleep(chance.uniform(0.2, 1.0))
        run("systemctl", "kill", "--kill-whom=main", "--signal=KILL", "vornd")
    wait_for(api.answers, "vornd does not come back")
    for administrator in administrators:
        administrator.finish()
    box.allow("good", {"client": client.address})
    for administrator in administrators:
        assert administrator.acknowledged > 0
        assert administrator.acknowledged <= administrator.number_in_force() <= administrator.tried
    assert ("/srv/good", client.address) in box.exported()
    assert list(pathlib.Path("/etc").glob(".*.vorn-*")) == []
    assert client.mounts("/srv/good")
    box.foresees(r"another vornd|vornd.service: (Failed with result 'signal'|Main process exited)")
    box.foresees("exportfs: .*(interrupted|signal)|^vornd: .*(killed|interrupted)")
