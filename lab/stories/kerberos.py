"""A keytab, and what it opens: mounts with each flavour, and files that belong to whom the ID map says."""

import itertools
import os
import pathlib
import re
import time

import pytest

from harness import api, kerberos, users
from harness.programs import as_user, wait_for

FLAVOURS = {"sys": "sys", "krb5": "kerberos", "krb5i": "kerberos_integrity", "krb5p": "kerberos_privacy"}

CHOICES = [set(choice) for size in (1, 2) for choice in itertools.combinations(FLAVOURS, size)]


@pytest.fixture
def keytab(realm):
    """A keytab with new keys of the box. The KDC no longer issues tickets for former keys."""
    del realm
    return kerberos.keytab(f"nfs/{kerberos.SERVER}")


def rule(client, *flavours):
    return {"client": client.address, "security_flavor": {FLAVOURS[flavour]: True for flavour in flavours}}


def mounts(client, flavour):
    return client.mounts("/srv/data", server=kerberos.SERVER, options=f"sec={flavour}")


def import_keytab(keytab):
    api.upload("NFS.Kerberos", "upload_key", "keytab_file", keytab)


def test_an_imported_keytab_opens_kerberos_mounts_at_once(box, kerberos_client, keytab):
    box.share("data")
    import_keytab(keytab)
    box.allow("data", rule(kerberos_client, "krb5"))
    assert mounts(kerberos_client, "krb5")
    settings = api.call("NFS.Kerberos", "get")
    assert settings["kerberos_principal"] == f"nfs/{kerberos.SERVER}@{kerberos.REALM}"
    entries = api.call("NFS.Kerberos", "list")["keytab"]
    assert {entry["kerberos_principal"] for entry in entries} == {settings["kerberos_principal"]}


def keys_that_the_kdc_has_replaced():
    """The findings of a check. The KDC is asked in the background."""
    found = {}

    def is_answered():
        found.update(api.call("NFS.Health", "check", kind="outdated_key"))
        return not found["not_checked"]

    wait_for(is_answered, "the KDC has not answered")
    return found["findings"]


def test_a_keytab_whose_key_the_kdc_has_replaced_is_found(box, kerberos_client, keytab):
    box.foresees("rpc.svcgssd")
    box.foresees("the new keytab has no key of version")
    box.share("data")
    box.allow("data", rule(kerberos_client, "krb5"))
    present = kerberos.keytab(f"nfs/{kerberos.SERVER}")
    import_keytab(keytab)
    assert [finding["severity"] for finding in keys_that_the_kdc_has_replaced()] == ["error"]
    assert not mounts(kerberos_client, "krb5")
    assert api.call("NFS.Health", "check", kind="refused_ticket")["total"] > 0
    import_keytab(present)
    assert keys_that_the_kdc_has_replaced() == []
    assert mounts(kerberos_client, "krb5")


def test_a_rule_opens_the_flavours_that_it_names_and_no_others(box, kerberos_client, keytab):
    box.share("data")
    import_keytab(keytab)
    for flavours in CHOICES:
        box.allow("data", rule(kerberos_client, *flavours))
        assert {flavour for flavour in FLAVOURS if mounts(kerberos_client, flavour)} == flavours


def owner_of_a_new_file(mounted, name, user):
    as_user(user, lambda: (mounted / name).touch())
    return os.stat(pathlib.Path("/srv/data") / name).st_uid


def may_look(mounted, user):
    try:
        as_user(user, lambda: os.listdir(mounted))
    except OSError:
        return False
    return True


def test_only_a_user_with_a_ticket_gets_in(box, kerberos_client, keytab):
    box.share("data")
    import_keytab(keytab)
    kerberos.sign_in(users.ALICE, "alice")
    for flavour in ("krb5", "krb5i", "krb5p"):
        box.allow("data", rule(kerberos_client, flavour))
        with kerberos_client.mounted("/srv/data", server=kerberos.SERVER, options=f"sec={flavour}") as mounted:
            assert owner_of_a_new_file(mounted, f"by-{flavour}", users.ALICE) == users.ALICE.uid
            assert not may_look(mounted, users.BOB)


def test_the_id_map_decides_who_owns_a_file_and_changes_without_a_restart(box, kerberos_client, keytab):
    principal = f"alice@{kerberos.REALM}"
    box.share("data")
    import_keytab(keytab)
    box.nfs(nfs_v4_domain="lab.test")
    box.allow("data", rule(kerberos_client, "krb5"))
    kerberos.sign_in(users.CAROL, "alice")
    api.call("NFS.IDMap", "create", idmap=[{"kerberos_principal": principal, "local_name": "bob"}])
    with kerberos_client.mounted("/srv/data", server=kerberos.SERVER, options="sec=krb5") as mounted:
        assert owner_of_a_new_file(mounted, "created", users.CAROL) == users.BOB.uid
        api.call("NFS.IDMap", "set", id=principal, kerberos_principal=principal, local_name="admin")
        assert owner_of_a_new_file(mounted, "changed", users.CAROL) == users.ADMIN.uid
        api.call("NFS.IDMap", "delete", id=principal)
        assert owner_of_a_new_file(mounted, "deleted", users.CAROL) == users.ALICE.uid


def seconds_since_renewal():
    """The time since a client of NFSv4 has renewed its lease last."""
    clients = [info.read_text(encoding="utf-8") for info in pathlib.Path("/proc/fs/nfsd/clients").glob("*/info")]
    return min(int(re.search(r"seconds from last renew: (\d+)", info)[1]) for info in clients)


def lease():
    return int(pathlib.Path("/proc/fs/nfsd/nfsv4leasetime").read_text(encoding="ascii"))


@pytest.fixture
def mounted_share(box, kerberos_client, keytab):
    """A share that alice uses over Kerberos."""
    box.share("data")
    import_keytab(keytab)
    box.allow("data", rule(kerberos_client, "krb5"))
    kerberos.sign_in(users.ALICE, "alice")
    with kerberos_client.mounted("/srv/data", server=kerberos.SERVER, options="sec=krb5") as mounted:
        assert owner_of_a_new_file(mounted, "before", users.ALICE) == users.ALICE.uid
        yield mounted


def test_a_keytab_with_the_former_keys_interrupts_nobody(keytab, mounted_share):
    """Tickets for the former keys are accepted, those of the users and that of the machine, which renews the lease."""
    imported = time.monotonic()
    import_keytab(kerberos.keytab(f"nfs/{kerberos.SERVER}", former=keytab))
    assert may_create(mounted_share, users.ALICE)
    wait_for(lambda: seconds_since_renewal() < time.monotonic() - imported - lease(), "the lease is not renewed")
    assert may_create(mounted_share, users.ALICE)


def test_a_keytab_without_the_former_keys_serves_whoever_has_new_tickets(box, kerberos_client, mounted_share):
    """Until then the service refuses the user's ticket and that of the machine, whose lease therefore ends."""
    box.foresees("rpc.svcgssd: ERROR: GSS-API: error in handle_nullreq")  # tickets for the former keys
    box.foresees("NFS: state manager|NFSv4: state recovery")  # of the client
    box.foresees("the new keytab has no key of version")
    import_keytab(kerberos.keytab(f"nfs/{kerberos.SERVER}"))
    assert "tickets for it are refused until users sign in anew" in box.journal.text()
    assert not may_create(mounted_share, users.ALICE)
    wait_for(lambda: seconds_since_renewal() > lease(), "the machine's former ticket is accepted")
    kerberos.sign_out(users.ALICE)
    kerberos.sign_in(users.ALICE, "alice")
    kerberos.restart_gssd(kerberos_client)
    wait_for(lambda: may_create(mounted_share, users.ALICE), "a user with a new ticket is not let in")


def may_create(mounted, user):
    try:
        as_user(user, lambda: (mounted / "after").touch())
    except OSError:
        return False
    return True
