"""Whom a client's user becomes on the box: root, users that no longer exist, and users in many groups."""

import os
import pathlib
import time

import pytest

from harness import api, kerberos, users
from harness.programs import as_user, run

PRINCIPAL = f"alice@{kerberos.REALM}"


@pytest.fixture
def kerberos_share(box, kerberos_client):
    """A share that the client mounts with Kerberos; carol is signed in as the principal alice."""
    box.share("data")
    api.upload("NFS.Kerberos", "upload_key", "keytab_file", kerberos.keytab(f"nfs/{kerberos.SERVER}"))
    box.allow("data", {"client": kerberos_client.address, "security_flavor": {"kerberos": True}})
    kerberos.sign_in(users.CAROL, "alice")
    with kerberos_client.mounted("/srv/data", server=kerberos.SERVER, options="sec=krb5") as mounted:
        yield mounted


def owner_of_a_new_file(mounted, name):
    as_user(users.CAROL, lambda: (mounted / name).touch())
    return os.stat(pathlib.Path("/srv/data") / name).st_uid


def map_to(name):
    api.call("NFS.IDMap", "create", idmap=[{"kerberos_principal": PRINCIPAL, "local_name": name}])


@pytest.fixture
def dave():
    """A local user who is removed by the story."""
    run("useradd", "--uid", "2050", "--no-create-home", "dave")
    yield
    run("sh", "-c", "userdel dave 2>/dev/null || true")


def test_a_principal_that_is_mapped_to_root_is_squashed(box, kerberos_share):
    """The rule of this share squashes root. A mapping must not be a way around it."""
    box.allow("data", {"client": "*", "root_squash": "guest", "security_flavor": {"kerberos": True}})
    try:
        map_to("root")
    except api.Refused:
        box.foresees("Request: |idmap|root")
        return
    assert owner_of_a_new_file(kerberos_share, "by-root") != 0


def test_a_principal_that_is_mapped_to_a_removed_user_is_nobody_else(box, kerberos_share, dave):
    del dave
    map_to("dave")
    assert owner_of_a_new_file(kerberos_share, "by-dave") == 2050
    run("userdel", "dave")
    box.foresees("dave|nss|libnfsidmap|idmap")
    assert api.call("NFS.IDMap", "list")["idmap"]


def test_a_principal_of_a_removed_user_does_not_become_the_user_of_its_own_name(box, kerberos_share, dave):
    del dave
    box.foresees("dave|nss|libnfsidmap|idmap")
    map_to("dave")
    assert owner_of_a_new_file(kerberos_share, "by-dave") == 2050
    run("userdel", "dave")
    api.call("NFS.IDMap", "create", idmap=[{"kerberos_principal": f"bob@{kerberos.REALM}", "local_name": "bob"}])
    with pytest.raises(OSError):
        owner_of_a_new_file(kerberos_share, "after")
    said = box.journal.text()
    assert f"{PRINCIPAL} is mapped to dave, who is not in /etc/passwd" in said
    assert f"{PRINCIPAL} is mapped to the user dave, who does not exist" in said


def test_a_user_in_more_than_16_groups_has_them_all_where_the_box_decides(box, client):
    data = box.share("data")
    box.allow("data", {"client": client.address})
    groups = [4000 + number for number in range(40)]
    for group in groups:
        run("groupadd", "-f", "-g", str(group), f"group{group}")
    run("usermod", "-G", ",".join(f"group{group}" for group in groups), "bob")
    for group in groups:
        (data / str(group)).mkdir(mode=0o770)
        os.chown(data / str(group), 0, group)
    bob = users.User("bob", users.BOB.uid, users.BOB.gid, tuple(groups))
    box.nfs(unix_pri_enable=True)
    box.restart()
    with client.mounted("/srv/data") as mounted:
        assert [group for group in groups if not may_enter(mounted / str(group), bob)] == []


def may_enter(folder, user):
    try:
        as_user(user, lambda: os.listdir(folder))
    except PermissionError:
        return False
    return True


MAPPINGS = 10000


def seconds_of(action):
    begun = time.monotonic()
    action()
    return time.monotonic() - begun


def daemons():
    """The start (InvocationID) of each daemon that maps identities, and its computing in nanoseconds."""
    return {unit: tuple(run("systemctl", "show", "--value", f"--property={name}", unit).strip()
                        for name in ("InvocationID", "CPUUsageNSec"))
            for unit in ("nfs-idmapd", "rpc-svcgssd")}


def create(numbers):
    api.call("NFS.IDMap", "create", idmap=[
        {"kerberos_principal": f"user{number}@{kerberos.REALM}", "local_name": "bob"} for number in numbers])


@pytest.mark.timeout(1800)
def test_each_of_ten_thousand_mappings_is_in_force_at_once_and_no_daemon_restarts(box, kerberos_share):
    map_to("bob")
    assert owner_of_a_new_file(kerberos_share, "by-bob") == users.BOB.uid
    before = daemons()
    taken = [seconds_of(lambda first=first: create(range(first, first + 100))) for first in range(0, MAPPINGS, 100)]
    change = seconds_of(lambda: api.call("NFS.IDMap", "set", id=PRINCIPAL, kerberos_principal=PRINCIPAL,
                                         local_name="carol"))
    assert owner_of_a_new_file(kerberos_share, "by-carol") == users.CAROL.uid
    after = daemons()
    assert {name: start for name, (start, _) in before.items()} == {name: start for name, (start, _) in after.items()}
    restart = seconds_of(lambda: run("systemctl", "restart", "nfs-idmapd", "rpc-svcgssd"))
    assert owner_of_a_new_file(kerberos_share, "after-a-restart") == users.CAROL.uid
    assert api.call("NFS.IDMap", "list", limit=1)["total"] == MAPPINGS + 1
    print(f"{MAPPINGS} mappings: the first hundred took {taken[0]:.2f} s, the last {taken[-1]:.2f} s, all "
          f"{sum(taken):.0f} s; one change {change:.2f} s; a restart of both daemons {restart:.2f} s; "
          f"computing before and after: {before}, {after}")
