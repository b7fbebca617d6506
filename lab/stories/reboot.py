"""What comes up by itself: the box boots with NFS on, then with NFS off, and nothing touches it before the check."""

import pathlib

import pytest

from harness import api
from harness.firewall import reaches, strict_firewall
from harness.programs import run, succeeds

BOOTS = 3

STATD, LOCKD = 32765, 32803


@pytest.mark.boot(1)
def test_a_box_is_set_up(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    box.advanced(custom_port_enable=True, statd_port=STATD, nlm_port=LOCKD, read_size=32768, write_size=32768)
    box.nfs(nfs_v4_domain="kept.example")
    assert client.mounts("/srv/data")


@pytest.mark.boot(2)
def test_a_box_that_was_on_serves_after_a_boot(box, client):
    assert client.mounts("/srv/data")
    assert client.mounts("/srv/data", version="3")
    assert box.rpc_ports("status") == {STATD}
    assert box.rpc_ports("nlockmgr") == {LOCKD}
    with strict_firewall():
        assert reaches(client, STATD) and reaches(client, LOCKD)
        assert not reaches(client, STATD + 1)
    assert pathlib.Path("/proc/fs/nfsd/max_block_size").read_text(encoding="ascii").strip() == "32768"
    settings = api.call("NFS", "get")
    assert settings["enable_nfs"] and settings["nfs_v4_domain"] == "kept.example"
    assert len(box.rules("data")) == 1


@pytest.mark.boot(2)
def test_the_service_is_switched_off(box, client):
    box.nfs(enable_nfs=False)
    assert not client.mounts("/srv/data")


@pytest.mark.boot(3)
def test_a_box_that_was_off_stays_off_after_a_boot(box, client):
    assert box.threads() == 0
    assert not succeeds("systemctl", "-q", "is-active", "nfs-server")
    assert not client.mounts("/srv/data")
    assert api.answers()
    assert not api.call("NFS", "get")["enable_nfs"]
    assert len(box.rules("data")) == 1
    box.nfs(enable_nfs=True)
    assert client.mounts("/srv/data")
    run("systemctl", "is-enabled", "nfs-server", "vornd", "vorn-firewall")
