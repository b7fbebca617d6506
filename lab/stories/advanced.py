"""Each advanced setting, set through its own API and seen by the clients and the daemons."""

import pytest

from harness import api
from harness.mounts import admits_by_box, make_team_folder, negotiated
from harness.programs import run, wait_for


def rpc_transports(program):
    """Pairs of transport and port at which rpcbind announces the program."""
    lines = [line.split() for line in run("rpcinfo", "-p").splitlines()]
    return {(words[2], int(words[3])) for words in lines if words[-1] == program}


def test_the_transfer_sizes_reach_the_clients(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    box.advanced(read_size=16384, write_size=65536)
    box.restart()
    assert negotiated(client, "/srv/data", "4.2") == (65536, 65536)  # the kernel has one limit for both directions
    assert api.call("NFS", "get")["read_size"] == 16384
    assert api.call("NFS.AdvancedSetting", "get")["write_size"] == 65536


def test_the_unix_permission_switch_is_the_one_of_the_service(box, client):
    data = box.share("data")
    box.allow("data", {"client": client.address})
    make_team_folder(data)
    for box_decides in (True, False):
        box.advanced(unix_pri_enable=box_decides)
        assert api.call("NFS", "get")["unix_pri_enable"] == box_decides
        box.restart()
        with client.mounted("/srv/data") as mounted:
            assert admits_by_box(mounted) == box_decides


def test_fixed_ports_are_those_of_both_transports(box):
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    assert rpc_transports("status") == {("tcp", 32765), ("udp", 32765)}
    assert rpc_transports("nlockmgr") == {("tcp", 32803), ("udp", 32803)}


def test_fixed_ports_that_are_switched_off_are_free(box):
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    box.advanced(custom_port_enable=False)
    assert 32765 not in box.rpc_ports("status")
    assert 32803 not in box.rpc_ports("nlockmgr")
    rules = run("nft", "list", "table", "inet", "vorn")
    assert "32803" not in rules and "32765" not in rules


def test_ports_that_nobody_set_are_announced_and_not_fixed(box):
    settings = api.call("NFS.AdvancedSetting", "get")
    assert settings["custom_port_enable"] == 0
    box.advanced(read_size=settings["read_size"])
    assert box.rpc_ports("status") and box.rpc_ports("nlockmgr")


def test_equal_ports_are_refused_before_anything_is_written(box, client):
    box.foresees("^vornd: ")  # the reason of each refusal
    box.share("data")
    box.allow("data", {"client": client.address})
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    before = api.call("NFS.AdvancedSetting", "get")
    with pytest.raises(api.Refused):
        box.advanced(statd_port=32803)
    with pytest.raises(api.Refused):
        box.advanced(statd_port=32777, nlm_port=32777)
    assert api.call("NFS.AdvancedSetting", "get") == before
    box.restart()
    assert client.mounts("/srv/data", version="3")


def test_the_last_settings_are_in_force_when_everything_changes_in_one_call(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    api.call("NFS.AdvancedSetting", "set", enable_nfs=True, read_size=8192, write_size=8192, unix_pri_enable=True,
             custom_port_enable=True, statd_port=32770, nlm_port=32771)
    wait_for(lambda: box.rpc_ports("status") == {32770}, "the status daemon has not moved")
    assert box.rpc_ports("nlockmgr") == {32771}
    assert negotiated(client, "/srv/data", "4.2") == (8192, 8192)
