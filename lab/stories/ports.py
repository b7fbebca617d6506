"""Fixed ports: rpcbind shows them, the firewall follows them, and locks work through them."""

import pathlib
import socket

import pytest

from harness import api, firewall
from harness.firewall import reaches
from harness.locks import is_locked, lock
from harness.programs import run

@pytest.fixture
def strict_firewall(box):
    """The box's own rules reject every port that nobody opens."""
    del box
    with firewall.strict_firewall():
        yield


def test_the_daemons_listen_where_they_are_told_to(box):
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    assert box.rpc_ports("status") == {32765}
    assert box.rpc_ports("nlockmgr") == {32803}
    box.advanced(custom_port_enable=True, statd_port=32766, nlm_port=32804)
    assert box.rpc_ports("status") == {32766}
    assert box.rpc_ports("nlockmgr") == {32804}


def test_a_port_of_another_service_is_refused_and_nothing_changes(box):
    with socket.socket() as somebody:
        somebody.bind(("0.0.0.0", 32777))
        somebody.listen()
        with pytest.raises(api.Refused) as refusal:
            box.advanced(custom_port_enable=True, statd_port=32777, nlm_port=32803)
    assert refusal.value.code == 2303
    assert 32777 not in box.rpc_ports("status")
    box.foresees(r"nfs statd port is conflict|^vornd: \S+ Request: ")


def test_locks_of_nfsv3_work_through_a_strict_firewall(box, client, other, strict_firewall):
    del strict_firewall
    box.share("data")
    box.allow("data", {"client": "10.9.0.0/24"})
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    with client.locking(), other.locking():
        with client.mounted("/srv/data", version="3", options="lock") as one:
            with other.mounted("/srv/data", version="3", options="lock") as two:
                with lock(one / "file"):
                    assert is_locked(two / "file")
                assert not is_locked(two / "file")


def test_the_firewall_opens_the_new_ports_and_closes_the_old_ones(box, client, strict_firewall):
    del strict_firewall
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    assert reaches(client, 32765) and reaches(client, 32803)
    assert not reaches(client, 32766) and not reaches(client, 32804)
    box.advanced(custom_port_enable=True, statd_port=32766, nlm_port=32804)
    assert reaches(client, 32766) and reaches(client, 32804)
    assert not reaches(client, 32765) and not reaches(client, 32803)


@pytest.mark.parametrize("action", ["restart", "reload"])
def test_the_firewall_returns_when_the_box_loads_its_own_rules_again(box, client, strict_firewall, action):
    del strict_firewall
    run("systemctl", "start", "nftables")
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    run("systemctl", action, "nftables")  # flushes all rules, the strict ones too
    run("nft", "-f", firewall.STRICT_RULES)
    assert reaches(client, 32765)
    assert not reaches(client, 32766)


def test_the_firewall_returns_with_a_start_of_nfs(box, client, strict_firewall):
    del strict_firewall
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    run("nft", "flush", "ruleset")
    run("nft", "-f", firewall.STRICT_RULES)
    assert not reaches(client, 32765)
    run("systemctl", "restart", "nfs-server")
    assert reaches(client, 32765)


def test_the_ports_of_the_two_daemons_are_exchanged_while_nfs_runs(box, client):
    box.foresees("rpc.statd|rpc-statd")  # the first attempt finds the port in use
    box.share("data")
    box.allow("data", {"client": client.address})
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    box.advanced(custom_port_enable=True, statd_port=32803, nlm_port=32765)
    assert box.rpc_ports("status") == {32803}
    assert box.rpc_ports("nlockmgr") == {32765}
    assert client.mounts("/srv/data", version="3") and client.mounts("/srv/data")


def test_a_start_with_equal_ports_names_them_and_other_ports_mend_it(box, client):
    box.foresees("rpc.statd|rpc-statd|lockd|nfs-server|nfsd|^vornd: ")
    box.share("data")
    box.allow("data", {"client": client.address})
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    box.nfs(enable_nfs=False)
    settings = pathlib.Path("/etc/nfs.conf.d/vorn.conf")
    settings.write_text(settings.read_text(encoding="utf-8").replace("32803", "32765"), encoding="utf-8")
    with pytest.raises(api.Refused):
        box.nfs(enable_nfs=True)
    assert "statd_port = 32765, nlm_port = 32765" in box.journal.text()
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    assert box.rpc_ports("nlockmgr") == {32803}
    assert client.mounts("/srv/data", version="3")
