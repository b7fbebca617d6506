"""Whom a rule admits, by each form of client that exports(5) knows, and nobody else."""

import pathlib

import pytest

FORMS = {
    "a host name": ("client.lab.test", {"client"}),
    "an address": ("10.9.0.11", {"client"}),
    "a network with its length": ("10.9.0.0/24", {"client", "other"}),
    "a network with its mask": ("10.9.0.0/255.255.255.0", {"client", "other"}),
    "a wildcard": ("*.lab.test", {"client", "other"}),
    "a wildcard of one character": ("?lient.lab.test", {"client"}),
    "a netgroup": ("@trusted", {"other"}),
    "everybody": ("*", {"client", "other", "third"}),
}


@pytest.mark.parametrize("version", ["3", "4.2"])
@pytest.mark.parametrize("form", FORMS)
def test_a_rule_admits_whom_it_names(box, client, other, third, form, version):
    text, admitted = FORMS[form]
    pathlib.Path("/etc/netgroup").write_text("trusted (other.lab.test,,)\n", encoding="ascii")
    box.share("data")
    box.allow("data", {"client": text})
    machines = {"client": client, "other": other, "third": third}
    seen = {name for name, machine in machines.items() if machine.mounts("/srv/data", version=version)}
    assert seen == admitted


def may_write(machine):
    with machine.mounted("/srv/data") as data:
        try:
            (data / machine.name).touch()
        except OSError:
            return False
    return True


def test_the_most_specific_client_wins(box, client, other, third):
    box.share("data")
    box.allow("data", {"client": "*", "privilege": "ro"}, {"client": "10.9.0.0/24", "privilege": "rw"},
              {"client": other.address, "privilege": "ro"})
    assert may_write(client)  # the network before everybody
    assert not may_write(other)  # the address before its network
    assert not may_write(third)  # everybody


def test_a_client_whose_rule_is_taken_away_is_refused(box, client, other):
    box.share("data")
    box.allow("data", {"client": client.address}, {"client": other.address})
    assert client.mounts("/srv/data")
    box.allow("data", {"client": other.address})
    assert not client.mounts("/srv/data")
    assert other.mounts("/srv/data")
    box.allow("data")
    assert not other.mounts("/srv/data")
