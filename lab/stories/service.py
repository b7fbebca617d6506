"""On, off, versions, sizes: what the service's settings do to those who mount."""

import os

import pytest

from harness import api


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
