"""A box with thousands of shares: a save is quick, and clients of other shares do not notice it."""

import pathlib
import statistics
import time

import pytest

from harness.programs import run, wait_for
from harness.writer import Writer

_SAVES = 6


def add_shares(box, count):
    """Shares with three rules each, in the file that an administrator brought along."""
    root = pathlib.Path("/srv/many")
    shares, lines = [], []
    for number in range(count):
        (root / str(number)).mkdir(parents=True)
        shares.append(f"many{number} = {root}/{number}\n")
        rules = " ".join(f"10.8.{number // 250}.{client}(rw,no_subtree_check)" for client in (1, 2, 3))
        lines.append(f"{root}/{number} {rules}\n")
    box.share("data")
    with open("/etc/vorn/shares.conf", "a", encoding="ascii") as file:
        file.writelines(shares)
    with open("/etc/exports", "a", encoding="ascii") as file:
        file.writelines(lines)


def seconds_of(action):
    begun = time.monotonic()
    action()
    return time.monotonic() - begun


def apply_whole_table():
    return seconds_of(lambda: run("exportfs", "-r", timeout=1200))


def compute(seconds):
    """Occupies the guest's only processor, as a save does, and changes nothing."""
    run("sh", "-c", f"timeout {seconds:.3f} sh -c 'while :; do :; done'; true")


@pytest.mark.timeout(3000)
@pytest.mark.parametrize("count", [2000, pytest.param(10000, marks=pytest.mark.long)])
def test_a_save_among_thousands_of_shares_is_in_force_and_nobody_else_waits(box, client, other, record_property, count):
    box.share("data")
    box.share("another")
    box.allow("data", {"client": client.address})

    def save(privilege):
        box.allow("another", {"client": other.address, "privilege": privilege})

    few = statistics.median(seconds_of(lambda p=privilege: save(p)) for privilege in ("ro", "rw") * 3)
    add_shares(box, count)
    whole_table = [apply_whole_table()]
    save("ro")  # reads the large file for the first time
    with client.mounted("/srv/data", options="hard") as mounted, other.mounted("/srv/another") as changing:
        writer = Writer(mounted / "file")
        writer.start()
        wait_for(lambda: writer.written > 0 or not writer.is_alive(), "the writer does not begin")
        seconds, gaps, computing = [], [], []
        for number in range(_SAVES):
            privilege = ("rw", "ro")[number % 2]
            gaps.append(writer.longest_gap_while(lambda p=privilege: seconds.append(seconds_of(lambda: save(p)))))
            assert writable(changing) == (privilege == "rw"), "a save was answered before it was in force"
            computing.append(writer.longest_gap_while(lambda: compute(seconds[-1])))
        writer.finish()
    whole_table.append(apply_whole_table())  # the load of the host may have changed
    for name, figures in (("few", [few]), ("exportfs -r", whole_table), ("seconds", seconds), ("gaps", gaps),
                          ("computing", computing)):
        record_property(name, sorted(figures))
        print(name, [round(figure, 3) for figure in sorted(figures)])
    assert writer.failure is None
    # All bounds depend on measurements of the same guest, because its processor is shared with the writer and with
    # other programs of the host.
    assert statistics.median(gaps) < 0.1 + 1.5 * statistics.median(computing)
    assert statistics.median(seconds) < few + statistics.mean(whole_table) / 3


def writable(folder):
    try:
        (folder / "probe").touch()
    except OSError:
        return False
    return True
