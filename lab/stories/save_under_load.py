"""A save while clients write: they do not notice."""

import os
import threading

import pytest

from harness.programs import run


class Writer(threading.Thread):
    """Writes and syncs without a pause, until it is told to stop."""

    def __init__(self, path):
        super().__init__()
        self._path = path
        self._finished = threading.Event()
        self.written = 0
        self.failure = None

    def run(self):
        try:
            with open(self._path, "wb", buffering=0) as file:
                while not self._finished.is_set():
                    file.write(b"x" * 1024)
                    os.fsync(file.fileno())
                    self.written += 1
        except OSError as failure:
            self.failure = failure

    def finish(self):
        self._finished.set()
        self.join()


def started():
    """When the service was started last."""
    return run("systemctl", "show", "--value", "--property=ActiveEnterTimestampMonotonic", "nfs-server")


@pytest.mark.parametrize("version", ["3", "4.2"])
def test_a_save_interrupts_nobody(box, client, other, version):
    data = box.share("data")
    box.share("another")
    box.allow("data", {"client": client.address})
    before = started()
    with client.mounted("/srv/data", version=version) as mounted:
        writer = Writer(mounted / "file")
        writer.start()
        for privilege in ("ro", "rw") * 5:
            written = writer.written
            box.allow("another", {"client": other.address, "privilege": privilege})
            box.allow("data", {"client": client.address}, {"client": other.address, "privilege": privilege})
            while writer.written == written and writer.is_alive():
                pass
        writer.finish()
    assert writer.failure is None
    assert (data / "file").stat().st_size == writer.written * 1024
    assert started() == before
    assert "grace period" not in box.journal.text()
