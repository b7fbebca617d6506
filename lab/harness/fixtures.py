"""What a story can ask for by naming it as an argument."""

import pathlib
import re

import pytest

from harness import kerberos, network, users
from harness.box import Box, wait_for
from harness.programs import run

ADDRESSES = {"client": "10.9.0.11", "other": "10.9.0.12", "third": "10.9.7.13"}
NAMES = {"client": "client.lab.test", "other": "other.lab.test", "third": "third.elsewhere.test"}

_machines = {}


@pytest.fixture(scope="session")
def realm():
    """A Kerberos realm."""
    kerberos.found_realm()


@pytest.fixture
def kerberos_client(realm, client):
    """A client machine in the realm."""
    del realm
    with kerberos.joined(client):
        yield client
        client.unmount_all()
    for user in (users.ALICE, users.BOB, users.CAROL):
        kerberos.sign_out(user)


@pytest.fixture(scope="session", autouse=True)
def furnished():
    """The box as it stands in the rack: on its network, with its users, serving."""
    users.create()
    network.build()
    # Short times, so that no story waits a minute and a half after a restart.
    pathlib.Path("/etc/nfs.conf.d/administrator.conf").write_text(
        "[nfsd]\nthreads=4\ngrace-time=10\nlease-time=10\n[mountd]\nport=20048\n", encoding="ascii")
    pathlib.Path("/proc/sys/fs/nfs/nlm_grace_period").write_text("1", encoding="ascii")
    with open("/etc/hosts", "a", encoding="ascii") as hosts:
        hosts.writelines(f"{address} {NAMES[name]}\n" for name, address in ADDRESSES.items())
    nsswitch = pathlib.Path("/etc/nsswitch.conf")
    nsswitch.write_text(re.sub("netgroup:.*", "netgroup: files", nsswitch.read_text(encoding="ascii")), encoding="ascii")
    wait_for(lambda: pathlib.Path("/run/vorn/vornd.sock").exists(), "vornd does not listen")
    run("systemctl", "enable", "--now", "nfs-server", timeout=60)


@pytest.fixture
def box():
    """The box; put back as it was when the story is over, which fails with what nobody foresaw in the journal."""
    the_box = Box()
    the_box.set_up()
    yield the_box
    for machine in _machines.values():
        machine.unmount_all()
    the_box.put_back()
    complaints = the_box.journal.complaints()
    assert not complaints, "\n".join(complaints)


def _machine(name):
    if name not in _machines:
        _machines[name] = network.Client(NAMES[name], ADDRESSES[name])
    return _machines[name]


@pytest.fixture
def client():
    """A client machine."""
    return _machine("client")


@pytest.fixture
def other():
    """Another one, next to it."""
    return _machine("other")


@pytest.fixture
def third():
    """One in another part of the network."""
    return _machine("third")
