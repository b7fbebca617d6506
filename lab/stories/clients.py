"""The list of clients is what the kernel's server and mountd know; a disconnected client loses its locks."""

import contextlib
import pathlib
import time

import pytest

from harness import api
from harness.locks import is_locked, lock
from harness.network import MountFailed
from harness.programs import wait_for

RMTAB = pathlib.Path("/var/lib/nfs/rmtab")


def clients(machine):
    """The rows of a machine."""
    return [row for row in api.call("NFS.Client", "list", limit=1000)["clients"] if row["address"] == machine.address]


def row_of(machine, version):
    """The only row of a machine for this version."""
    row, = [row for row in clients(machine) if row["version"] == version]
    return row


def exports(row):
    return {used["path"]: used for used in row["exports"]}


def attempt(machine, path, **how):
    with contextlib.suppress(MountFailed), machine.mounted(path, **how):
        pytest.fail(f"{machine.name} mounts {path}")


def test_a_client_is_listed_with_what_it_has_open(box, client, third):
    box.share("data")
    box.allow("data", {"client": client.address}, {"client": "10.9.7.0/24"})
    begun = time.time()
    with client.mounted("/srv/data", version="4.2") as mine, third.mounted("/srv/data", version="4.0") as theirs:
        with lock(mine / "locked"), open(mine / 'a"\n- 0x1: { type: lock, b', "w", encoding="ascii") as odd:
            odd.write("x" * 5000)
            odd.flush()
            row = row_of(client, "4.2")
            assert (row["open_files"], row["locks"], row["state"]) == (2, 1, "confirmed")
            assert "client.lab.test" in row["name"] and "Linux" in row["implementation"]
            assert begun - 5 <= row["since"] <= time.time()
        (theirs / "locked").read_text(encoding="ascii")
        written = exports(row_of(client, "4.2"))["/srv/data"]
        assert (written["rule"], written["mounted"]) == (client.address, False)
        assert written["bytes_written"] >= 5000 and begun - 5 <= written["since"] <= time.time()
        assert exports(row_of(third, "4.0"))["/srv/data"]["rule"] == "10.9.7.0/24"
    assert not [row for row in clients(client) if row["id"] is not None], "unmounted"


def test_a_mount_of_nfsv3_is_listed(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    with client.mounted("/srv/data", version="3") as mounted:
        (mounted / "file").write_text("x" * 100, encoding="ascii")
        row = row_of(client, "3")
        assert row["state"] == "connected" and row["id"] is None and row["locks"] is None
        used = exports(row)["/srv/data"]
        assert used["mounted"] and used["bytes_written"] >= 100


@pytest.mark.parametrize("version", ["3", "4.2"])
def test_a_client_that_is_turned_away_is_listed(box, client, other, version):
    box.share("data")
    box.share("more")
    box.allow("data", {"client": client.address})
    RMTAB.write_text("", encoding="ascii")  # rpc.mountd(8) may have refused to forget a mount of an earlier story
    attempt(other, "/srv/data", version=version)
    row, = clients(other)
    assert row["state"] == "refused" and {refusal["reason"] for refusal in row["refusals"]} == {"no_rule"}
    paths = {refusal["path"]: refusal for refusal in row["refusals"]}
    if version == "3":  # mountd has logged what was asked for, and when
        assert paths["/srv/data"]["count"] >= 1 and time.time() - 600 <= paths["/srv/data"]["last"] <= time.time()
    else:
        assert paths[None]["last"] is None


def test_a_rehearsal_names_the_client_that_will_lose_its_write_right(box, client, other):
    box.share("data")
    box.allow("data", {"client": client.address}, {"client": other.address})
    with client.mounted("/srv/data", version="4.2") as mounted, other.mounted("/srv/data", version="3"):
        rules = [box.rule(client=client.address, privilege="ro"), box.rule(client=other.address)]
        touched = api.rehearse("NFS.SharePrivilege", "save", share_name="data", rule=rules)["clients"]
        # The record of an earlier mount of NFSv3 by this machine may have stayed: then it is named twice.
        assert {(row["address"], row["path"], row["certain"]) for row in touched} == {(client.address, "/srv/data", True)}
        assert all([change["change"] for change in row["changes"]] == ["read_only"] for row in touched)
        assert "4.2" in {row["version"] for row in touched}
        (mounted / "file").touch()
        box.allow("data", {"client": client.address, "privilege": "ro"}, {"client": other.address})
        with pytest.raises(OSError):
            (mounted / "other").touch()


def test_a_disconnected_client_loses_its_locks(box, client, other):
    box.share("data")
    box.allow("data", {"client": "10.9.0.0/24"})
    box.foresees("There is no client|DisconnectClient|Request: ")
    with client.mounted("/srv/data", version="4.2") as mine, other.mounted("/srv/data", version="4.2") as theirs:
        held = lock(mine / "file")
        assert is_locked(theirs / "file")
        row = row_of(client, "4.2")
        with pytest.raises(api.Refused) as wrong:
            api.call("NFS.Client", "disconnect", id=row["id"], client_id=row_of(other, "4.2")["client_id"])
        assert wrong.value.code == 2395
        assert is_locked(theirs / "file")
        api.call("NFS.Client", "disconnect", id=row["id"], client_id=row["client_id"])
        assert row["id"] not in [left["id"] for left in clients(client)]
        wait_for(lambda: not is_locked(theirs / "file"), "the lock outlives its owner")
        with contextlib.suppress(OSError):
            held.close()
        assert client.mounts("/srv/data"), "a client that was disconnected may come back"
