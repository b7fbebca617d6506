"""Shares inside shares, on one file system and on several."""

import errno

import pytest

from harness import api
from harness.programs import run, succeeds, wait_for


def may_write(folder):
    try:
        (folder / "probe").touch()
        (folder / "probe").unlink()
    except OSError as error:
        assert error.errno in (errno.EROFS, errno.EACCES)
        return False
    return True


def nested(box, name="inner"):
    """A share in a folder of the share "outer"."""
    inner = box.share("outer") / name
    inner.mkdir(exist_ok=True)
    inner.chmod(0o777)
    box.share_at(name, inner)
    return inner


def test_each_share_obeys_its_own_rule_over_nfsv3(box, client, other):
    nested(box)
    box.allow("outer", {"client": client.address}, {"client": other.address, "privilege": "ro"})
    box.allow("inner", {"client": client.address, "privilege": "ro"}, {"client": other.address})
    for machine, outer_writes in ((client, True), (other, False)):
        with machine.mounted("/srv/outer", version="3") as outer:
            assert may_write(outer) == outer_writes
        with machine.mounted("/srv/outer/inner", version="3") as inner:
            assert may_write(inner) != outer_writes


def test_over_nfsv4_the_inner_rule_counts_for_clients_without_a_rule_of_the_outer_share(box, client, other):
    """A client of the outer share walks into the inner folder without leaving the outer export (on one file system)."""
    nested(box)
    box.allow("outer", {"client": client.address})
    box.allow("inner", {"client": "10.9.0.0/24", "privilege": "ro"})
    with other.mounted("/srv/outer/inner") as inner:
        assert not may_write(inner)
    with client.mounted("/srv/outer/inner") as inner:
        assert may_write(inner)


def test_a_rule_of_an_inner_share_opens_nothing_of_the_outer_one(box, client, other):
    nested(box)
    box.allow("inner", {"client": client.address})
    assert client.mounts("/srv/outer/inner", version="3")
    assert not other.mounts("/srv/outer/inner", version="3")
    assert not client.mounts("/srv/outer", version="3")


@pytest.fixture
def inner_volume(box):
    """A share on a file system of its own, mounted below the share "outer"."""
    box.foresees("the option crossmnt")
    inner = nested(box, "volume")
    run("modprobe", "loop")
    run("mkfs.ext4", "-q", "-F", "/tmp/nested", "4M")
    run("mount", "-o", "loop", "/tmp/nested", str(inner))
    inner.chmod(0o777)
    yield inner
    run("exportfs", "-au")
    run("exportfs", "-f")
    wait_for(lambda: succeeds("umount", str(inner)), f"{inner} stays busy")


def test_an_inner_volume_stays_closed_to_clients_of_the_outer_share_without_crossmnt(box, client, other, inner_volume):
    (inner_volume / "file").touch()
    box.allow("outer", {"client": client.address, "crossmnt": False})
    box.allow("volume", {"client": other.address})
    for version in ("3", "4.2"):
        with client.mounted("/srv/outer", version=version) as outer:
            assert not (outer / "volume/file").exists()  # the folder below the volume's mount point is seen
    with other.mounted("/srv/outer/volume") as volume:
        assert (volume / "file").exists()


def test_a_save_warns_of_an_inner_volume_that_crossmnt_opens(box, client, other, inner_volume):
    box.allow("volume", {"client": other.address})
    answer = api.answer("NFS.SharePrivilege", "save", share_name="outer",
                        rule=[box.rule(client=client.address, crossmnt=True)])
    assert answer["success"]
    assert any(str(inner_volume) in warning for warning in answer.get("warnings", []))
