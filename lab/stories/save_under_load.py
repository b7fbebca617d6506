"""A save while clients write: they do not notice."""

import statistics
import time

import pytest

from harness.programs import run, wait_for
from harness.writer import Writer

_SAVES = 10


def started():
    """When the service was started last."""
    return run("systemctl", "show", "--value", "--property=ActiveEnterTimestampMonotonic", "nfs-server")


def look(box):
    """Takes about as much of the processor as a save, and changes nothing."""
    for share in ("another", "data"):
        box.rules(share)
        run("exportfs", "-v")
    time.sleep(0.2)


@pytest.mark.parametrize("version", ["3", "4.2"])
def test_a_save_interrupts_nobody(box, client, other, version, record_property):
    data = box.share("data")
    box.share("another")
    box.allow("data", {"client": client.address})
    before = started()
    grace_periods = box.journal.text().count("grace period")

    def save(privilege):
        box.allow("another", {"client": other.address, "privilege": privilege})
        box.allow("data", {"client": client.address}, {"client": other.address, "privilege": privilege})

    with client.mounted("/srv/data", version=version, options="hard") as mounted:
        writer = Writer(mounted / "file")
        writer.start()
        wait_for(lambda: writer.written > 0 or not writer.is_alive(), "the writer does not begin")
        quiet = [writer.longest_gap_while(lambda: look(box)) for _ in range(_SAVES)]
        saving = [writer.longest_gap_while(lambda n=number: save(("ro", "rw")[n % 2])) for number in range(_SAVES)]
        writer.finish()
    record_property("gaps without saves", sorted(quiet))
    record_property("gaps with saves", sorted(saving))
    assert writer.failure is None
    assert (data / "file").stat().st_size == writer.written * 1024
    assert started() == before
    assert box.journal.text().count("grace period") == grace_periods
    # A busy machine has gaps of its own, so the bound depends on them. The median does not hide a stall of every save.
    assert statistics.median(saving) < 1 + 1.5 * statistics.median(quiet)
    assert max(saving) < 5 + 3 * max(quiet)
