"""On, off, versions, domain, sizes: what the service's settings do to those who mount."""

import contextlib
import os
import pathlib
import socket

from harness import api
from harness.mounts import admits_by_box, make_team_folder, negotiated


def test_an_export_is_mounted_while_the_service_is_on_and_not_while_it_is_off(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    assert client.mounts("/srv/data")
    box.nfs(enable_nfs=False)
    assert box.threads() == 0
    assert not api.call("NFS", "get")["enable_nfs"]
    assert not client.mounts("/srv/data")
    box.nfs(enable_nfs=True)
    assert box.threads() > 0
    assert api.call("NFS", "get")["enable_nfs"]
    assert client.mounts("/srv/data")


def test_nfsv4_is_gone_when_it_is_switched_off_and_nfsv3_stays(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    box.nfs(enable_nfs_v4=False)
    assert not client.mounts("/srv/data", version="4.2")
    assert client.mounts("/srv/data", version="3")
    box.nfs(enable_nfs_v4=True)
    assert client.mounts("/srv/data", version="4.2")
    assert client.mounts("/srv/data", version="3")


def test_a_mounted_client_goes_on_after_a_restart(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    with client.mounted("/srv/data", version="3") as data:
        (data / "before").touch()
        box.nfs(enable_nfs_v4=False)  # versions are fixed when the service starts: this restarts it
        (data / "after").touch()
        assert sorted(os.listdir(data)) == ["after", "before"]


def test_what_an_administrator_wrote_is_taken_up_by_the_next_reload(box, client, other):
    box.share("data")
    theirs = box.share("theirs")
    with open("/etc/exports", "a", encoding="utf-8") as exports:
        exports.write(f"{theirs} {client.address}(rw,no_subtree_check)\n")
    assert not client.mounts("/srv/theirs")
    box.allow("data", {"client": other.address})
    assert client.mounts("/srv/theirs")


@contextlib.contextmanager
def names_on_the_wire():
    """Has the kernel's server send owners by name: it sends numbers to clients without Kerberos."""
    switch = pathlib.Path("/sys/module/nfsd/parameters/nfs4_disable_idmapping")
    before = switch.read_text(encoding="ascii")
    switch.write_text("N", encoding="ascii")
    yield
    switch.write_text(before, encoding="ascii")


def sent_while(action):
    """The bytes that crossed the box's network meanwhile."""
    every_protocol = 0x0003
    with socket.socket(socket.AF_PACKET, socket.SOCK_RAW, socket.htons(every_protocol)) as wire:
        wire.bind(("br0", 0))
        wire.settimeout(1)
        action()
        packets = []
        with contextlib.suppress(TimeoutError):
            while True:
                packets.append(wire.recv(65536))
        return b"".join(packets)


def test_the_domain_reaches_the_daemon_that_names_owners(box, client):
    data = box.share("data")
    box.allow("data", {"client": client.address})
    (data / "file").touch()
    with names_on_the_wire():
        for domain in ("first.example", "second.example"):
            box.nfs(nfs_v4_domain=domain)
            box.restart()
            assert f"root@{domain}".encode() in sent_while(lambda: client.mounts("/srv/data"))


def test_clients_get_the_configured_transfer_sizes_once_nfs_has_started_anew(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    before = negotiated(client, "/srv/data", "4.2")
    box.nfs(read_size=32768, write_size=16384)
    assert "32768 bytes when it starts the next time" in box.journal.text()
    assert negotiated(client, "/srv/data", "4.2") == before
    box.restart()
    # The kernel has one limit for both directions: the larger of the two.
    assert negotiated(client, "/srv/data", "4.2") == (32768, 32768)
    assert negotiated(client, "/srv/data", "3") == (32768, 32768)


def test_the_unix_permission_switch_has_the_box_decide_who_is_in_a_group(box, client):
    data = box.share("data")
    box.allow("data", {"client": client.address})
    make_team_folder(data)
    for box_decides in (True, False):
        box.nfs(unix_pri_enable=box_decides)
        box.restart()
        with client.mounted("/srv/data") as mounted:
            assert admits_by_box(mounted) == box_decides
