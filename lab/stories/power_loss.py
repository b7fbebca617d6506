"""The power fails while rules and mappings are saved: after the next boot everything that was acknowledged is there.

The disk is booted twice: in the first boot the power fails, in the second one the damage is looked at."""

import os
import pathlib
import random
import re
import threading
import time

import pytest

from harness import api
from harness.programs import run, wait_for

BOOTS = 2
GUESTS = 3  # the moment of the failure is random

# These files are the host's, which keeps its power.
ACKNOWLEDGED = pathlib.Path("/lab/acknowledged")
DIES = pathlib.Path("/lab/dies")  # tells the host that the guest ends without a verdict


def record(line):
    """Writes a line where no power failure reaches it."""
    with open(ACKNOWLEDGED, "a", encoding="ascii") as file:
        file.write(f"{line}\n")
        file.flush()
        os.fsync(file.fileno())


def recorded(what):
    if not ACKNOWLEDGED.exists():
        return []
    numbers = re.findall(rf"^{what} (\d+)$", ACKNOWLEDGED.read_text(encoding="ascii"), re.MULTILINE)
    return [int(number) for number in numbers]


def save_rules(box):
    number = 0
    while True:
        number += 1
        record(f"try {number}")
        box.allow("data", {"client": f"10.1.{number // 250}.{number % 250 + 1}"})
        record(f"rule {number}")


def create_mappings():
    number = 0
    while True:
        number += 1
        api.call("NFS.IDMap", "create", idmap=[{"kerberos_principal": f"user{number}@LAB.TEST", "local_name": "alice"}])
        record(f"mapping {number}")


@pytest.mark.boot(1)
def test_the_power_fails_while_changes_are_acknowledged(box, client):
    """Ends with the box, at a random moment between two acknowledgements."""
    box.share("good")
    box.share("data")
    box.allow("good", {"client": client.address})
    run("sync")
    for load in (lambda: save_rules(box), create_mappings):
        threading.Thread(target=load, daemon=True).start()
    changes = random.randint(5, 40)
    wait_for(lambda: len(recorded("rule")) >= changes and len(recorded("mapping")) >= 2, "no changes are acknowledged")
    time.sleep(random.uniform(0, 0.3))  # anywhere in the next change
    DIES.touch()
    # Off in one step: nothing is synced, nothing is unmounted.
    pathlib.Path("/proc/sysrq-trigger").write_text("o", encoding="ascii")
    time.sleep(60)
    pytest.fail("the power has not failed")


@pytest.mark.boot(2)
def test_everything_acknowledged_is_there_after_the_boot(box, client):
    assert len(recorded("rule")) >= 5 and len(recorded("mapping")) >= 2  # something was tried
    (rule,) = box.rules("data")
    _, _, high, low = rule["client"].split(".")
    assert recorded("rule")[-1] <= int(high) * 250 + int(low) - 1 <= recorded("try")[-1]
    mapped = {item["id"] for item in api.call("NFS.IDMap", "list")["idmap"]}
    assert {f"user{number}@LAB.TEST" for number in recorded("mapping")} <= mapped
    assert client.mounts("/srv/good")  # only the boot has started it
    box.allow("data")
    api.call("NFS.IDMap", "delete", id=sorted(mapped))
    assert list(pathlib.Path("/etc").glob(".*.vorn-*")) == []
