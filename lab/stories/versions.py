"""Every NFS version over IPv4 and IPv6, for each form of client, and both versions of the API."""

import os

import pytest

from harness import api
from harness.network import BOX_ADDRESS, BOX_ADDRESS6

SERVERS = {"IPv4": BOX_ADDRESS, "IPv6": BOX_ADDRESS6}


def use(mounted):
    """What every client does: creates, writes, reads, renames, lists, removes."""
    (mounted / "folder").mkdir()
    (mounted / "folder/file").write_bytes(b"content")
    assert (mounted / "folder/file").read_bytes() == b"content"
    os.rename(mounted / "folder/file", mounted / "moved")
    assert sorted(os.listdir(mounted)) == ["folder", "moved"]
    (mounted / "moved").unlink()
    (mounted / "folder").rmdir()


@pytest.mark.parametrize("network", SERVERS)


@pytest.mark.parametrize("version", ["3", "4.0", "4.1", "4.2"])


def test_a_client_works_over_each_version_and_network(box, client, other, version, network):
    data = box.share("data")
    own = {"IPv4": client.address, "IPv6": client.address6}[network]
    box.allow("data", {"client": own})
    # mount.nfs needs the transport's name for version 3 over IPv6.
    options = "proto=tcp6,mountproto=tcp6" if (network, version) == ("IPv6", "3") else ""
    with client.mounted("/srv/data", version=version, server=SERVERS[network], options=options) as mounted:
        use(mounted)
    assert os.listdir(data) == []
    assert not other.mounts("/srv/data", version=version, server=SERVERS[network], options=options)

FORMS6 = {
    "an address": ("fd00:9::b", {"client"}),
    "an address with leading zeros": ("fd00:0009:0:0::000b", {"client"}),
    "a network": ("fd00:9::/124", {"client", "other"}),
    "the whole network": ("fd00:9::/64", {"client", "other", "third"}),
    "everybody": ("*", {"client", "other", "third"}),
}


@pytest.mark.parametrize("form", FORMS6)


def test_a_rule_admits_whom_it_names_over_ipv6(box, client, other, third, form):
    text, admitted = FORMS6[form]
    box.share("data")
    box.allow("data", {"client": text})
    machines = {"client": client, "other": other, "third": third}
    seen = {name for name, machine in machines.items() if machine.mounts("/srv/data", server=BOX_ADDRESS6)}
    assert seen == admitted


def test_an_ipv4_rule_admits_nobody_over_ipv6_and_the_other_way_round(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    assert not client.mounts("/srv/data", server=BOX_ADDRESS6)
    box.allow("data", {"client": client.address6})
    assert not client.mounts("/srv/data", server=BOX_ADDRESS)


def test_version_2_of_the_api_reads_and_sets_the_same_settings(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    assert api.call("NFS", "get", api_version=2) == api.call("NFS", "get")
    api.call("NFS", "set", api_version=2, enable_nfs=True, enable_nfs_v4=False)
    assert not client.mounts("/srv/data", version="4.2")
    assert client.mounts("/srv/data", version="3")
    api.call("NFS", "set", api_version=2, enable_nfs=True, enable_nfs_v4=True, nfs_v4_domain="second.example",
             read_size=32768)
    settings = api.call("NFS", "get", api_version=2)
    assert settings == api.call("NFS", "get")
    assert settings["enable_nfs_v4"] and settings["nfs_v4_domain"] == "second.example"
    assert settings["read_size"] == 32768
    assert client.mounts("/srv/data", version="4.2")
    api.call("NFS", "set", api_version=2, enable_nfs=False)
    assert box.threads() == 0
    assert not client.mounts("/srv/data")
