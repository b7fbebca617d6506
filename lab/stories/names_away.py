"""The name server is away while somebody saves: clients that are named by host keep what they have."""

import contextlib
import os
import pathlib

HOSTS = pathlib.Path("/etc/hosts")


@contextlib.contextmanager
def name_server_away():
    """No client's name has an address."""
    before = HOSTS.read_text(encoding="ascii")
    kept = [line for line in before.splitlines() if "client." not in line and "other." not in line]
    HOSTS.write_text("\n".join(kept) + "\n", encoding="ascii")
    try:
        yield
    finally:
        HOSTS.write_text(before, encoding="ascii")


def test_a_save_of_another_share_takes_nothing_from_a_client_with_a_name(box, client, other):
    box.foresees("Failed to resolve|^vornd: ")
    box.share("data")
    box.share("another")
    box.allow("data", {"client": "client.lab.test"})
    box.allow("another")
    with client.mounted("/srv/data") as mounted, open(mounted / "file", "wb", buffering=0) as file:
        with name_server_away():
            box.allow("another", {"client": other.address})
            os.write(file.fileno(), b"x")
            os.fsync(file.fileno())
        assert other.mounts("/srv/another")
    assert client.mounts("/srv/data")


def test_a_client_that_is_named_again_gets_in_at_the_next_save(box, client, other):
    box.foresees("Failed to resolve|^vornd: ")
    box.share("data")
    box.share("another")
    with name_server_away():
        box.allow("data", {"client": "client.lab.test"})
        assert not client.mounts("/srv/data")
    box.allow("data", {"client": "client.lab.test"})
    assert client.mounts("/srv/data")
    box.allow("another", {"client": other.address})
    assert client.mounts("/srv/data")
