"""Fixed ports: rpcbind shows them, the firewall follows them, and locks work through them."""

import contextlib
import errno
import fcntl
import os
import socket

import pytest

from harness import api
from harness.network import BOX_ADDRESS
from harness.programs import run

# An administrator's own rules: nothing comes in but what is asked for, and what the NFS service has marked.
STRICT = """
table inet administrator {
  chain input {
    type filter hook input priority filter; policy accept;
    ct state established,related accept
    iifname "br0" meta mark & 0x01000000 != 0 accept
    iifname "br0" tcp dport { 111, 2049 } accept
    iifname "br0" ip protocol { tcp, udp } reject
  }
}
"""


@pytest.fixture
def strict_firewall(box):
    """The box's own rules refuse all ports that nobody opens."""
    del box
    with open("/tmp/strict.nft", "w", encoding="ascii") as rules:
        rules.write(STRICT)
    run("nft", "-f", "/tmp/strict.nft")
    yield
    run("nft", "delete", "table", "inet", "administrator")


def lock(path):
    """Locks the file for this process; raises OSError where somebody else has it."""
    file = open(path, "w", encoding="ascii")  # pylint: disable=consider-using-with
    fcntl.lockf(file, fcntl.LOCK_EX | fcntl.LOCK_NB)
    return file


def is_locked(path):
    try:
        lock(path).close()
    except OSError as failure:
        assert failure.errno in (errno.EAGAIN, errno.EACCES)
        return True
    return False


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
    box.foresees("conflict|Request: ")


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


def reaches(client, port):
    """Whether the client gets through to a program that listens at this port of the box."""
    with socket.socket() as program:
        program.setsockopt(socket.SOL_SOCKET, socket.SO_REUSEADDR, 1)
        with contextlib.suppress(OSError):  # one of the service's own daemons is there already
            program.bind(("0.0.0.0", port))
            program.listen()
        probe = f"import socket; socket.create_connection(({BOX_ADDRESS!r}, {port}), 5)"
        return client.succeeds("python3", "-S", "-c", probe)


def test_the_firewall_opens_the_new_ports_and_closes_the_old_ones(box, client, strict_firewall):
    del strict_firewall
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    assert reaches(client, 32765) and reaches(client, 32803)
    assert not reaches(client, 32766) and not reaches(client, 32804)
    box.advanced(custom_port_enable=True, statd_port=32766, nlm_port=32804)
    assert reaches(client, 32766) and reaches(client, 32804)
    assert not reaches(client, 32765) and not reaches(client, 32803)


def test_the_firewall_is_as_it_was_when_the_box_has_booted(box, client, strict_firewall):
    del strict_firewall
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    run("nft", "delete", "table", "inet", "vorn")  # as after a boot
    assert not reaches(client, 32765)
    run("systemctl", "restart", "vorn-firewall")
    assert reaches(client, 32765)
