"""What a story can ask for by naming it as an argument."""

import pytest

from harness import furniture, kerberos, users
from harness.box import Box

_machines = {}


@pytest.fixture(scope="session", autouse=True)
def furnished():
    """The box as it stands in the rack."""
    furniture.furnish()


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
        _machines[name] = furniture.machine(name)
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
