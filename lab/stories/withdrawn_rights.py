"""A right that is withdrawn ends at once, for clients that have the share mounted and files open, too."""

import contextlib
import errno
import os
import pathlib

import pytest

from harness.programs import run, wait_for

VERSIONS = pytest.mark.parametrize("version", ["3", "4.0", "4.2"])
REFUSED = {errno.EACCES, errno.EPERM, errno.ESTALE, errno.EROFS}


def write_error(file):
    """The error with which the server refuses a write to an open file; 0 for a write that reached the disk."""
    try:
        os.pwrite(file.fileno(), b"x", 0)
        os.fsync(file.fileno())
    except OSError as error:
        return error.errno
    return 0


def open_file(mounted, name="file"):
    file = open(mounted / name, "wb", buffering=0)  # pylint: disable=consider-using-with
    assert write_error(file) == 0
    return file


@VERSIONS
def test_a_client_without_a_rule_can_use_its_open_files_no_more(box, client, other, version):
    box.share("data")
    box.allow("data", {"client": client.address}, {"client": other.address})
    with client.mounted("/srv/data", version=version) as mine, other.mounted("/srv/data", version=version) as theirs:
        with open_file(mine, "mine") as file, open_file(theirs, "theirs") as kept:
            box.allow("data", {"client": other.address})
            assert write_error(file) in REFUSED
            assert write_error(kept) == 0
            with pytest.raises(OSError):
                os.listdir(mine)
            box.allow("data", {"client": client.address}, {"client": other.address})
            assert write_error(file) == 0


@contextlib.contextmanager
def moved(folder):
    """The kernel follows the folder, and the share's path leads to another one."""
    old = folder.rename(f"{folder}.old")
    folder.mkdir(mode=0o777)
    try:
        yield
    finally:
        folder.rmdir()
        old.rename(folder)


@contextlib.contextmanager
def covered(folder):
    """The kernel looks for the folder by its path, and finds what is mounted there now."""
    run("mount", "-t", "tmpfs", "tmpfs", str(folder))
    try:
        yield
    finally:
        run("umount", str(folder))


@VERSIONS
@pytest.mark.parametrize("displaced", [moved, covered])
def test_a_right_in_a_displaced_folder_ends_too(box, client, other, version, displaced):
    """Also where the kernel goes on knowing the client, which keeps another share."""
    box.share("kept")
    box.allow("kept", {"client": client.address})
    folder = box.share("data")
    box.allow("data", {"client": client.address}, {"client": other.address})
    with client.mounted("/srv/data", version=version) as mounted, open_file(mounted) as file, displaced(folder):
        box.allow("data", {"client": other.address})
        assert write_error(file) in REFUSED


def test_a_right_ends_although_a_folder_of_the_share_was_deleted(box, client):
    """The kernel still lists the rights in the deleted folder, and does not find it by its path."""
    outer = box.share("outer")
    inner = outer / "inner"
    inner.mkdir(mode=0o777)
    box.share_at("inner", inner)
    box.allow("inner", {"client": client.address})
    box.allow("outer", {"client": client.address})
    with client.mounted("/srv/outer/inner", version="3"), client.mounted("/srv/outer") as mounted:
        inner.rmdir()
        with open_file(mounted) as file:
            box.allow("outer", {"client": client.address, "privilege": "ro"})
            assert write_error(file) in REFUSED


@VERSIONS
def test_a_rule_that_becomes_read_only_stops_writes_to_open_files(box, client, version):
    box.share("data")
    box.allow("data", {"client": client.address})
    with client.mounted("/srv/data", version=version) as mounted, open_file(mounted) as file:
        box.allow("data", {"client": client.address, "privilege": "ro"})
        assert write_error(file) in REFUSED
        assert (mounted / "file").read_bytes() == b"x"


def test_root_is_squashed_on_a_mounted_share(box, client):
    data = box.share("data")
    box.allow("data", {"client": client.address, "root_squash": "root"})
    with client.mounted("/srv/data") as mounted:
        (mounted / "before").touch()
        box.allow("data", {"client": client.address, "root_squash": "guest"})
        (mounted / "after").touch()
    assert (data / "before").stat().st_uid == 0
    assert (data / "after").stat().st_uid != 0


def test_a_share_without_rules_is_released(box, client):
    """A volume can be unmounted when its last rule is gone."""
    inner = box.share("volume")
    run("modprobe", "loop")
    run("mkfs.ext4", "-q", "-F", "/tmp/released", "4M")
    run("mount", "-o", "loop", "/tmp/released", str(inner))
    try:
        box.allow("volume", {"client": client.address, "root_squash": "root"})
        with client.mounted("/srv/volume") as mounted:
            (mounted / "file").touch()
        box.allow("volume")
    finally:
        wait_for(lambda: unmounted(inner), f"{inner} stays busy")


def unmounted(folder):
    run("sh", "-c", f"umount {folder} 2>/dev/null || true")
    return not os.path.ismount(folder)


def test_a_machine_that_leaves_a_netgroup_loses_its_right(box, client):
    netgroup = pathlib.Path("/etc/netgroup")
    netgroup.write_text("trusted (client.lab.test,,)\n", encoding="ascii")
    box.share("data")
    box.allow("data", {"client": "@trusted"})
    with client.mounted("/srv/data") as mounted, open_file(mounted) as file:
        netgroup.write_text("trusted (other.lab.test,,)\n", encoding="ascii")
        wait_for(lambda: write_error(file) in REFUSED, "the machine keeps its right")


def test_a_right_is_withdrawn_where_threads_run_without_the_unit(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    run("systemctl", "stop", "nfs-server")
    run("systemctl", "start", "nfs-mountd")
    run("systemctl", "stop", "nfs-server")
    run("sh", "-c", "rpc.mountd || true; exportfs -r; rpc.nfsd 4")
    box.foresees("rpc.nfsd|rpc.mountd|exportfs")
    try:
        assert client.mounts("/srv/data")
        box.allow("data")
        assert not client.mounts("/srv/data")
    finally:
        run("sh", "-c", "rpc.nfsd 0; pkill -x rpc.mountd; true")


def test_an_exported_path_that_is_no_share_is_named_in_the_log(box, client):
    box.share("data")
    box.share("left")
    box.allow("data", {"client": client.address})
    box.allow("left", {"client": client.address})
    shares = pathlib.Path("/etc/vorn/shares.conf")
    kept = [line for line in shares.read_text(encoding="utf-8").splitlines() if not line.startswith("left ")]
    shares.write_text("\n".join(kept) + "\n", encoding="utf-8")
    box.foresees("/srv/left")
    box.allow("data", {"client": client.address, "privilege": "ro"})
    assert "/srv/left" in box.journal.text()
