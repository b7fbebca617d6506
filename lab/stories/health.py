"""What a check of the box's health says, compared with what the kernel's server, nftables and systemd really do."""

import pathlib

import pytest

from harness import api
from harness.programs import run

EXPORTS = pathlib.Path("/etc/exports")
SETTINGS = pathlib.Path("/etc/nfs.conf.d/vorn.conf")
CLOSED = """
table inet administrator {
  chain input {
    type filter hook input priority filter; policy drop;
    iifname "lo" accept
  }
}
"""


def check(kind=None):
    """The findings of a kind, or all but notices."""
    question = {"kind": kind} if kind else {"severity": "warning"}
    return api.call("NFS.Health", "check", **question)["findings"]


def not_checked():
    return {gap["kind"] for gap in api.call("NFS.Health", "check")["not_checked"]}


def append(path, text):
    path.write_text((path.read_text(encoding="utf-8") if path.exists() else "") + text, encoding="utf-8")


def test_a_box_that_works_has_nothing_to_tell(box, client, other):
    box.share("data")
    box.share("more")
    rules = [{"client": client.address}, {"client": "other.lab.test", "privilege": "ro"}, {"client": "*.lab.test"}]
    box.allow("data", *rules)
    box.allow("more", *rules)
    assert check() == []
    with client.mounted("/srv/data"), other.mounted("/srv/more", version="3"):
        assert check() == []
    run("exportfs", "-ra")  # writes the table in its own form
    assert check() == []
    assert not_checked() <= {"moved_host", "missing_host_key", "mapping_without_effect"}


def test_an_edit_that_is_not_in_force_is_found_until_it_is(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    EXPORTS.write_text(EXPORTS.read_text(encoding="utf-8").replace("rw", "ro"), encoding="utf-8")
    found = check("exports_not_in_force")
    assert [finding["subject"]["share"] for finding in found] == ["data"]
    with client.mounted("/srv/data") as mounted:
        (mounted / "file").touch()  # as the finding says: the old rule is in force
    run("exportfs", "-ra")
    assert check("exports_not_in_force") == []


def test_an_export_that_no_file_has_is_found(box, client):
    box.share("data")
    run("exportfs", "-o", "rw,no_subtree_check", f"{client.address}:/srv/data")
    assert len(check("exports_not_in_force")) == 1
    assert client.mounts("/srv/data")


def test_a_host_that_nobody_knows_is_found(box, client):
    box.foresees("no-such-host|^exportfs: ")
    box.share("data")
    box.allow("data", {"client": client.address})
    box.allow("data", {"client": client.address}, {"client": "no-such-host.lab.test"})
    found = check("unknown_host")
    assert [finding["subject"]["client"] for finding in found] == ["no-such-host.lab.test"]
    assert client.mounts("/srv/data")


def test_a_service_without_threads_is_found(box):
    assert check("not_serving") == []
    run("rpc.nfsd", "0")
    assert [finding["severity"] for finding in check("not_serving")] == ["error"]
    box.restart()
    assert check("not_serving") == []


def test_a_version_that_waits_for_a_restart_is_found(box, client):
    box.share("data")
    box.allow("data", {"client": client.address})
    append(SETTINGS, "[nfsd]\nvers3 = n\n")
    assert [finding["subject"]["setting"] for finding in check("version_not_in_force")] == ["nfsd vers3"]
    assert client.mounts("/srv/data", version="3")
    box.restart()
    assert check("version_not_in_force") == []
    assert not client.mounts("/srv/data", version="3")


@pytest.fixture
def closed_firewall(box):
    """The box's own rules drop everything from outside."""
    del box
    rules = pathlib.Path("/tmp/closed.nft")
    rules.write_text(CLOSED, encoding="ascii")
    run("nft", "-f", str(rules))
    yield
    run("nft", "delete", "table", "inet", "administrator")


def test_a_firewall_that_closes_the_ports_is_found(box, client, closed_firewall):
    del closed_firewall
    box.share("data")
    box.allow("data", {"client": client.address})
    assert "inet administrator" in check("closed_port")[0]["text"]
    assert not client.mounts("/srv/data")


def test_no_firewall_is_found_where_none_is(box):
    del box
    assert check("closed_port") == []
