"""The package: upgraded over a running service, removed, purged, and installed again."""

import pathlib

import pytest

from harness import api
from harness.box import wait_for
from harness.programs import run, succeeds

PACKAGE = "/lab/package.deb"
OURS = [pathlib.Path(path) for path in (
    "/etc/nfs.conf.d/vorn.conf", "/etc/systemd/system/nfs-server.service.d/vorn.conf", "/etc/vorn", "/var/lib/vorn")]


def install(package):
    run("dpkg", "--install", package)
    wait_for(api.answers, "vornd does not listen")


@pytest.fixture
def settings(box, client):
    """A box with settings of all kinds, that serves; and the product again when the story is over."""
    box.share("data")
    box.allow("data", {"client": client.address})
    box.nfs(read_size=32768, write_size=32768, nfs_v4_domain="kept.example")
    box.restart()
    yield api.call("NFS", "get")
    install(PACKAGE)


def next_version():
    """The same package with a higher version, as the next release would come."""
    run("sh", "-ec", f"""rm -rf /tmp/next && dpkg-deb --raw-extract {PACKAGE} /tmp/next &&
        sed -i 's/^Version: .*/&+1/' /tmp/next/DEBIAN/control && dpkg-deb -Znone --build /tmp/next /tmp/next.deb""")
    return "/tmp/next.deb"


def process():
    return run("systemctl", "show", "--value", "--property=MainPID", "vornd").strip()


def test_an_upgrade_restarts_the_server_and_leaves_nfs_alone(box, client, settings):
    with client.mounted("/srv/data") as mounted:
        (mounted / "before").touch()
        old, service = process(), run("systemctl", "show", "--property=ActiveEnterTimestampMonotonic", "nfs-server")
        install(next_version())
        assert process() not in (old, "0")
        assert run("systemctl", "show", "--property=ActiveEnterTimestampMonotonic", "nfs-server") == service
        (mounted / "after").touch()
    assert api.call("NFS", "get") == settings
    assert len(box.rules("data")) == 1


def test_a_removed_package_leaves_its_settings_and_a_service_that_serves(box, client, settings):
    run("dpkg", "--remove", "vorn-nfs")
    assert not succeeds("systemctl", "-q", "is-active", "vornd")
    assert not pathlib.Path("/run/vorn").exists()
    assert client.mounts("/srv/data")
    run("systemctl", "restart", "nfs-server")  # as at the next boot
    assert client.mounts("/srv/data")
    install(PACKAGE)
    assert api.call("NFS", "get") == settings
    assert len(box.rules("data")) == 1


def test_a_purged_package_takes_its_own_files_and_nobody_elses(box, client, settings):
    del settings
    run("dpkg", "--purge", "vorn-nfs")
    assert [path for path in OURS if path.exists()] == []
    assert client.mounts("/srv/data")
    assert "/srv/data" in pathlib.Path("/etc/exports").read_text(encoding="utf-8")
    assert "kept.example" in pathlib.Path("/etc/idmapd.conf").read_text(encoding="utf-8")
    assert not succeeds("nft", "list", "table", "inet", "vorn")
    assert box.threads() > 0
