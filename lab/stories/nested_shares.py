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


@pytest.mark.parametrize("version", ["3", "4.2"])
def test_each_share_obeys_its_own_rule_where_it_is_mounted(box, client, other, version):
    nested(box)
    box.allow("outer", {"client": client.address}, {"client": other.address, "privilege": "ro"})
    box.allow("inner", {"client": client.address, "privilege": "ro"}, {"client": other.address})
    for machine, outer_writes in ((client, True), (other, False)):
        with machine.mounted("/srv/outer", version=version) as outer:
            assert may_write(outer) == outer_writes
        with machine.mounted("/srv/outer/inner", version=version) as inner:
            assert may_write(inner) != outer_writes


def test_a_rule_of_an_inner_share_opens_nothing_of_the_outer_one(box, client, other):
    nested(box)
    box.allow("inner", {"client": client.address})
    assert client.mounts("/srv/outer/inner", version="3")
    assert not other.mounts("/srv/outer/inner", version="3")
    assert not client.mounts("/srv/outer", version="3")


@pytest.fixture
def inner_volume(box):
    """A share on a file system of its own, mounted below the share "outer"."""
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
    with client.mounted("/srv/outer", version="3") as outer:
        assert not (outer / "volume/file").exists()
    assert not client.mounts("/srv/outer/volume")
    assert other.mounts("/srv/outer/volume")


@pytest.mark.pending("nothing warns that crossmnt opens an inner volume whose own rule names another machine")
def test_a_save_warns_of_an_inner_volume_that_crossmnt_opens(box, client, other, inner_volume):
    box.allow("volume", {"client": other.address})
    answer = api.answer("NFS.SharePrivilege", "save", share_name="outer",
                        rule=[box.rule(client=client.address, crossmnt=True)])
    assert answer["success"]
    assert any(str(inner_volume) in warning for warning in answer.get("warnings", []))
