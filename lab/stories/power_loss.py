"""The power fails while rules and mappings are saved: after the next boot everything that was acknowledged is there.

lab/run boots the box twice for it: in the first boot it dies, in the second one the damage is looked at."""

import os
import pathlib
import random
import re
import threading
import time

import pytest

from harness import api
from harness.programs import run

ACKNOWLEDGED = pathlib.Path("/lab/acknowledged")  # the host's, who keeps its power

pytestmark = pytest.mark.power_loss


def record(line):
    """Where no power failure reaches it."""
    with open(ACKNOWLEDGED, "a", encoding="ascii") as file:
        file.write(f"{line}\n")
        file.flush()
        os.fsync(file.fileno())


def recorded(what):
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


def test_before(box, client):
    """Ends with the box, at a moment of chance."""
    seconds = random.uniform(1, 4)
    record(f"the power fails after {seconds:.3f} s")
    box.share("good")
    box.share("data")
    box.allow("good", {"client": client.address})
    run("sync")
    for load in (lambda: save_rules(box), create_mappings):
        threading.Thread(target=load, daemon=True).start()
    time.sleep(seconds)
    # Off at once: nothing is synced, nothing is unmounted.
    pathlib.Path("/proc/sysrq-trigger").write_text("o", encoding="ascii")
    time.sleep(60)


def test_after(box, client):
    """What is acknowledged is there, whole; and the box serves."""
    (rule,) = box.rules("data")
    _, _, high, low = rule["client"].split(".")
    assert recorded("rule")[-1] <= int(high) * 250 + int(low) - 1 <= recorded("try")[-1]
    mapped = {item["id"] for item in api.call("NFS.IDMap", "list")["idmap"]}
    assert {f"user{number}@LAB.TEST" for number in recorded("mapping")} <= mapped
    assert client.mounts("/srv/good")
    box.allow("data")
    api.call("NFS.IDMap", "delete", id=sorted(mapped))
    assert list(pathlib.Path("/etc").glob(".*.vorn-*")) == []
