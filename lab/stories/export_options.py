"""What each option of a rule does, both ways."""

import errno
import os
import pathlib

import pytest

from harness import api, users
from harness.programs import as_user, run, succeeds, wait_for


def owner_of_a_new_file(client, name, user):
    with client.mounted("/srv/data") as data:
        as_user(user, lambda: (data / name).touch())
    return os.stat(pathlib.Path("/srv/data") / name).st_uid


def test_a_read_only_rule_shows_everything_and_takes_nothing(box, client):
    data = box.share("data")
    (data / "file").write_text("text", encoding="ascii")
    box.allow("data", {"client": client.address, "privilege": "ro"})
    with client.mounted("/srv/data") as mounted:
        assert (mounted / "file").read_text(encoding="ascii") == "text"
        with pytest.raises(OSError) as refusal:
            (mounted / "new").touch()
        assert refusal.value.errno == errno.EROFS
    box.allow("data", {"client": client.address, "privilege": "rw"})
    with client.mounted("/srv/data") as mounted:
        (mounted / "new").touch()
    assert (data / "new").exists()


SQUASH_MODES = {  # whose a file is that root made, and one that alice made
    "root": (users.ROOT, users.ALICE),
    "admin": (users.ADMIN, users.ALICE),
    "guest": (users.NOBODY, users.ALICE),
    "all_admin": (users.ADMIN, users.ADMIN),
}


@pytest.mark.parametrize("mode", SQUASH_MODES)
def test_a_squash_mode_decides_who_owns_a_new_file(box, client, mode):
    box.share("data")
    box.allow("data", {"client": client.address, "root_squash": mode})
    by_root, by_alice = SQUASH_MODES[mode]
    assert owner_of_a_new_file(client, f"{mode}-by-root", users.ROOT) == by_root.uid
    assert owner_of_a_new_file(client, f"{mode}-by-alice", users.ALICE) == by_alice.uid


def kernels_options(path):
    """The options with which the kernel serves a path, as its own table has them."""
    for line in pathlib.Path("/proc/fs/nfsd/exports").read_text(encoding="ascii").splitlines():
        if line.startswith(f"{path}\t"):
            return line[line.index("(") + 1:line.rindex(")")].split(",")
    raise AssertionError(f"the kernel does not serve {path}")


@pytest.mark.parametrize("asynchronous, word", [(True, "async"), (False, "sync")])
def test_the_kernel_writes_as_the_rule_says(box, client, asynchronous, word):
    box.share("data")
    box.allow("data", {"client": client.address, "async": asynchronous})
    with client.mounted("/srv/data") as data:
        (data / "file").touch()
        assert word in kernels_options("/srv/data")


@pytest.mark.parametrize("insecure", [False, True])
def test_a_client_at_a_high_port_is_served_by_an_insecure_rule_alone(box, client, insecure):
    box.share("data")
    box.allow("data", {"client": client.address, "insecure": insecure})
    assert client.mounts("/srv/data", options="noresvport") == insecure
    assert client.mounts("/srv/data")


@pytest.fixture
def volume(box):
    """A file system of its own, mounted below the share, with a file in it."""
    inner = box.share("data") / "inner"
    inner.mkdir(exist_ok=True)
    run("modprobe", "loop")
    run("mkfs.ext4", "-q", "-F", "/tmp/volume", "4M")
    run("mount", "-o", "loop", "/tmp/volume", str(inner))
    (inner / "file").touch()
    yield inner
    run("exportfs", "-au")
    run("exportfs", "-f")
    # The kernel's server keeps files open for a while.
    wait_for(lambda: succeeds("umount", str(inner)), f"{inner} stays busy")


@pytest.mark.parametrize("crossmnt", [False, True])
@pytest.mark.parametrize("version", ["3", "4.2"])
def test_a_client_sees_a_file_system_below_the_share_where_the_rule_crosses_mounts(box, client, volume, crossmnt,
                                                                                  version):
    box.allow("data", {"client": client.address, "crossmnt": crossmnt})
    with client.mounted("/srv/data", version=version) as data:
        seen = os.path.exists(data / volume.name / "file")
        run("sh", "-c", f"umount {data}/{volume.name} 2>/dev/null || true")
    assert seen == crossmnt


def test_a_share_with_a_file_system_below_it_that_nobody_can_serve_gets_no_rules(box, client):
    foreign = box.share("data") / "foreign"
    foreign.mkdir()
    run("mount", "-t", "proc", "proc", str(foreign))
    try:
        with pytest.raises(api.Refused) as refusal:
            box.allow("data", {"client": client.address})
    finally:
        run("umount", str(foreign))
    assert refusal.value.code == 2371
    assert box.rules("data") == []
    box.foresees(r"Failed to VORNFSHasMountPointType|^vornd: \S+ Request: ")
