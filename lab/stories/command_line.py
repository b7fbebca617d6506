"""The command line, on a box with a real kernel NFS server: what it shows is what the box does."""

import json
import pathlib

from harness.programs import run, succeeds

FILES = [pathlib.Path(path) for path in ("/etc/exports", "/etc/idmapd.conf", "/etc/nfs.conf.d/vorn.conf",
                                         "/etc/vorn/shares.conf")]


def vorn(*words):
    return run("vorn", *words)


def shown(*words):
    """The answer of a command as JSON."""
    return json.loads(vorn("--json", *words))


def contents():
    return {path: path.read_bytes() for path in FILES if path.exists()}


def test_a_rule_is_added_rehearsed_and_explained(box, client, other):
    box.share("data")
    assert shown("nfs", "show")["enable_nfs"]
    assert "/etc/exports" in vorn("exports", "add", "data", client.address, "--access", "rw", "--rehearse")
    assert not client.mounts("/srv/data")
    vorn("exports", "add", "data", client.address, "--access", "rw")
    assert client.mounts("/srv/data")
    assert shown("explain", "data", client.address)["write"] is True
    assert shown("explain", "data", other.address)["mountable"] is False
    assert not other.mounts("/srv/data")
    vorn("health")  # its exit status tells errors and warnings
    vorn("exports", "remove", "data", client.address)
    assert not client.mounts("/srv/data")


def test_a_dump_restores_the_box_and_changes_nothing_on_it(box, client):
    """A dump of a box describes it: applying it is no change, and applying it after changes undoes them."""
    box.share("data")
    box.allow("data", {"client": client.address, "root_squash": "admin", "crossmnt": True})
    box.nfs(nfs_v4_domain="dumped.example", read_size=32768)
    box.restart()
    kept, dump = contents(), pathlib.Path("/tmp/box.yaml")
    dump.write_text(vorn("dump"), encoding="utf-8")
    assert "wanted state" in vorn("apply", str(dump), "--check")
    assert "wanted state" in vorn("apply", str(dump), "--yes")
    assert contents() == kept

    vorn("exports", "remove", "data", "--all")
    vorn("nfs", "set", "--domain", "changed.example")
    assert not client.mounts("/srv/data")
    assert not succeeds("vorn", "apply", str(dump), "--check")  # the status of a difference
    vorn("apply", str(dump), "--yes")
    assert client.mounts("/srv/data")
    assert "wanted state" in vorn("apply", str(dump), "--check")
    assert vorn("dump") == dump.read_text(encoding="utf-8")


def test_the_help_and_the_manual_page_are_installed(box):
    del box
    assert "exports" in vorn("--help")
    assert "vorn exports add" in vorn("exports", "add", "--help")
