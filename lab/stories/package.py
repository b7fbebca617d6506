"""The packages: upgraded over a running service, removed, purged, and installed again."""

import fcntl
import hashlib
import json
import os
import pathlib
import ssl

import pytest

from harness import api, kerberos
from harness.network import BOX_ADDRESS
from harness.programs import run, succeeds, wait_for

PACKAGES = sorted(map(str, pathlib.Path("/lab/packages").glob("*.deb")))
NAMES = ("vorn-cli", "vorn-nfs", "vorn-server", "vorn-platform-linux")
WRITTEN_BY_THE_PACKAGE = [pathlib.Path(path) for path in (
    "/etc/nfs.conf.d/vorn.conf", "/etc/systemd/system/nfs-server.service.d/vorn.conf", "/etc/nfs/krb5.keytab",
    "/etc/krb5.keytab", "/var/lib/vorn")]
PAM, SETTINGS = pathlib.Path("/etc/pam.d/vornd"), pathlib.Path("/etc/vorn/vornd.conf")
OUR_PAM = pathlib.Path("/usr/lib/pam.d/vornd")
SOCKET_ONLY = "# The configuration of a box that is managed at its socket\n[server]\n#listen =\n"
TLS_PORT = 8443
OF_THE_ADMINISTRATOR = {pathlib.Path(path): text for path, text in {
    "/etc/vorn/platform.conf": "[platform]\n# as the rack needs it\nkerberos = auto\n",
    "/etc/nfs/krb5.conf": "[libdefaults]\n default_realm = LAB.TEST\n",
    "/etc/nfs/notes": "keys are renewed in spring\n",
    "/etc/systemd/system/nfs-server.service.d/limits.conf": "[Service]\nLimitNOFILE=4096\n"}.items()}


def install(packages):
    run("dpkg", "--install", *packages)
    wait_for(api.answers, "vornd does not listen")


@pytest.fixture
def settings(box, client):
    """A box with settings of all kinds, that serves; and the product again when the story is over."""
    box.share("data")
    box.allow("data", {"client": client.address})
    box.nfs(read_size=32768, write_size=32768, nfs_v4_domain="kept.example")
    box.restart()
    yield api.call("NFS", "get")
    install(PACKAGES)


def next_version():
    """The same packages with a higher version, as the next release would come."""
    run("sh", "-ec", f"""rm -rf /tmp/next && mkdir /tmp/next
        for package in {" ".join(PACKAGES)}; do
          rm -rf /tmp/tree && dpkg-deb --raw-extract $package /tmp/tree
          sed -i -E 's/^Version: .*/&+1/; s/\\(= ([0-9.]+)\\)/(= \\1+1)/g' /tmp/tree/DEBIAN/control
          dpkg-deb -Znone --build /tmp/tree /tmp/next/
        done""")
    return sorted(map(str, pathlib.Path("/tmp/next").glob("*.deb")))


def single_package():
    """The package of before version 1.1.0, which had everything."""
    run("sh", "-ec", f"""rm -rf /tmp/single && mkdir -p /tmp/single/DEBIAN /tmp/single/etc/vorn /tmp/single/etc/pam.d
        for package in {" ".join(PACKAGES)}; do dpkg-deb --extract $package /tmp/single; done
        printf '%s' '{SOCKET_ONLY}' >/tmp/single{SETTINGS}
        mv /tmp/single{OUR_PAM} /tmp/single{PAM}
        printf '%s\\n' {PAM} {SETTINGS} >/tmp/single/DEBIAN/conffiles
        printf '%s\\n' 'Package: vorn-nfs' 'Version: 1.0.0' 'Architecture: all' 'Description: all in one' \\
          'Maintainer: The VORN NFS developers <nfs@vorn.example>' >/tmp/single/DEBIAN/control
        dpkg-deb -Znone --build /tmp/single /tmp/single.deb""")
    return "/tmp/single.deb"


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


def listens():
    """Whether a program listens at the port that a first installation opens."""
    return bool(run("ss", "--no-header", "--listening", "--tcp", f"sport = :{TLS_PORT}").strip())


def test_a_first_installation_serves_over_tls_and_at_the_socket(box, client):
    """Another machine logs in with a token and the fingerprint that the box prints."""
    del box
    purge()
    assert "over TLS" in run("dpkg", "--install", *PACKAGES)
    wait_for(api.answers, "vornd does not listen")
    presented = ssl.PEM_cert_to_DER_cert(ssl.get_server_certificate(("127.0.0.1", TLS_PORT)))
    digest = hashlib.sha256(presented).hexdigest().upper()
    fingerprint = ":".join(digest[i:i + 2] for i in range(0, len(digest), 2))
    assert fingerprint in run("vornd", "--check")
    token = run("vorn", "--json", "token", "create", "tool", "--role", "reader")
    url = f"https://{BOX_ADDRESS}:{TLS_PORT}"
    pathlib.Path("/tmp/token").write_text(json.loads(token)["token"] + "\n", encoding="ascii")
    assert "reader" in client.run("sh", "-c", f"vorn login {url} --fingerprint {fingerprint} </tmp/token")
    assert "NFSv4" in client.run("vorn", "--url", url, "nfs", "show")
    for path in ("/", "/api/VORN.Core.FileServ.NFS/v1/get"):
        assert not client.succeeds("curl", "--silent", "--fail", "--max-time", "60", url.replace("https", "http") + path)
    run("vorn", "logout", url)


def test_the_single_package_of_before_is_replaced(box, client, settings):
    """Settings, tokens and edited configuration files are kept, and clients are served on."""
    box.foresees("^vornd: ")
    run("dpkg", "--remove", *NAMES)
    before = SETTINGS.read_bytes()
    SETTINGS.unlink()
    run("dpkg", "--install", single_package())
    run("systemctl", "daemon-reload")
    run("systemctl", "enable", "--now", "vornd")
    wait_for(api.answers, "vornd does not listen")
    status, made = api.request("POST", "/api/VORN.Server.Token/v1/create", '{"name": "kept", "role": "reader"}')
    assert status == 200
    for file in (PAM, SETTINGS):
        file.write_text(file.read_text(encoding="ascii") + "# of the site\n", encoding="ascii")
    with client.mounted("/srv/data") as mounted:
        service = run("systemctl", "show", "--property=ActiveEnterTimestampMonotonic", "nfs-server")
        run("apt-get", "install", "--yes", *PACKAGES)
        wait_for(api.answers, "vornd does not listen")
        assert run("systemctl", "show", "--property=ActiveEnterTimestampMonotonic", "nfs-server") == service
        (mounted / "after").touch()
    assert api.call("NFS", "get") == settings
    assert len(box.rules("data")) == 1
    assert "kept" in run("vorn", "token", "list")
    assert made["data"]["token"]
    assert SETTINGS.read_text(encoding="ascii") == SOCKET_ONLY + "# of the site\n"
    assert not listens()
    SETTINGS.write_bytes(before)
    assert PAM.read_text(encoding="ascii") == OUR_PAM.read_text(encoding="ascii") + "# of the site\n"
    PAM.unlink()
    assert succeeds("systemctl", "is-enabled", "vornd")
    run("vorn", "token", "revoke", made["data"]["id"])


def accounts():
    return [line.split(":")[0] for line in pathlib.Path("/etc/passwd").read_text(encoding="ascii").splitlines()]


@pytest.fixture
def without_admin():
    """A box without the account of the squash modes, which gets it back afterwards."""
    passwd = pathlib.Path("/etc/passwd")
    before = passwd.read_text(encoding="ascii")
    passwd.write_text("".join(line + "\n" for line in before.splitlines() if not line.startswith("admin:")),
                      encoding="ascii")
    yield
    passwd.write_text(before, encoding="ascii")


def test_the_package_creates_the_accounts_of_the_squash_modes(box, client, without_admin):
    del without_admin
    box.foresees('no account "admin"; create it, or change the setting admin_account|^vornd: ')
    box.share("data")
    rule = {"client": client.address, "root_squash": "all_admin"}
    with pytest.raises(api.Refused):
        box.allow("data", rule)
    assert 'no account "admin"' in box.journal.text()
    assert "created the system account admin" in run("dpkg", "--install", *PACKAGES)
    wait_for(api.answers, "vornd does not listen")
    assert accounts().count("admin") == 1
    box.allow("data", rule)
    assert "created" not in run("dpkg", "--install", *PACKAGES)
    wait_for(api.answers, "vornd does not listen")


def test_a_lock_of_another_program_survives_a_restart(box):
    box.foresees("config.lock is locked by another process for too long")  # vornd looks for leftovers when it starts
    with open("/run/vorn/config.lock", "a", encoding="ascii") as held:
        fcntl.flock(held, fcntl.LOCK_EX)
        run("systemctl", "restart", "vornd")
        wait_for(api.answers, "vornd does not listen")
        assert os.path.samestat(os.fstat(held.fileno()), os.stat("/run/vorn/config.lock"))
        run("systemctl", "stop", "vornd")
        assert os.path.samestat(os.fstat(held.fileno()), os.stat("/run/vorn/config.lock"))
        run("systemctl", "start", "vornd")
        wait_for(api.answers, "vornd does not listen")


def test_a_removed_package_leaves_its_settings_and_a_service_that_serves(box, client, settings):
    run("dpkg", "--remove", *NAMES)
    assert not succeeds("systemctl", "-q", "is-active", "vornd")
    assert not pathlib.Path("/run/vorn").exists()
    assert client.mounts("/srv/data")
    run("systemctl", "restart", "nfs-server")  # as at the next boot
    assert client.mounts("/srv/data")
    install(PACKAGES)
    assert api.call("NFS", "get") == settings
    assert len(box.rules("data")) == 1


@pytest.fixture
def foreign_files(box):
    """Files of an administrator in the package's folders."""
    del box
    for path, text in OF_THE_ADMINISTRATOR.items():
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_text(text, encoding="ascii")
    yield
    for path in OF_THE_ADMINISTRATOR:
        path.unlink(missing_ok=True)


def test_the_server_follows_its_modules(box, settings):
    del box
    run("dpkg", "--remove", "vorn-nfs")
    assert not succeeds("systemctl", "-q", "is-active", "vornd")
    assert not succeeds("systemctl", "-q", "is-failed", "vornd")
    install([package for package in PACKAGES if "vorn-nfs" in package])
    assert api.call("NFS", "get") == settings


def purge():
    run("dpkg", "--purge", *NAMES)


def test_a_purged_package_takes_what_it_wrote_and_nothing_else(box, client, settings, foreign_files, realm):
    del settings, foreign_files, realm
    shares = pathlib.Path("/etc/vorn/shares.conf").read_bytes()
    api.upload("NFS.Kerberos", "upload_key", "keytab_file", kerberos.keytab(f"nfs/{kerberos.SERVER}"))
    purge()
    assert [path for path in WRITTEN_BY_THE_PACKAGE if path.exists()] == []
    assert {path: path.read_text(encoding="ascii") for path in OF_THE_ADMINISTRATOR} == OF_THE_ADMINISTRATOR
    assert pathlib.Path("/etc/vorn/shares.conf").read_bytes() == shares
    assert client.mounts("/srv/data")
    assert "/srv/data" in pathlib.Path("/etc/exports").read_text(encoding="utf-8")
    assert "kept.example" in pathlib.Path("/etc/idmapd.conf").read_text(encoding="utf-8")
    assert not succeeds("nft", "list", "table", "inet", "vorn")
    assert box.threads() > 0


def members(group):
    return run("getent", "group", group).strip().split(":")[-1].split(",")


def test_who_may_use_the_server_outlasts_an_upgrade_and_a_purge(box, settings):
    """The groups stay with their members, and the administrator's own PAM service stays."""
    del box, settings
    run("usermod", "--append", "--groups", "vorn-admin", "alice")
    PAM.write_text("auth required pam_deny.so\n", encoding="ascii")
    install(next_version())
    assert "alice" in members("vorn-admin")
    purge()
    assert PAM.read_text(encoding="ascii") == "auth required pam_deny.so\n"
    assert "alice" in members("vorn-admin")
    install(PACKAGES)
    assert members("vorn-readonly") == [""]
    PAM.unlink()
    run("gpasswd", "--delete", "alice", "vorn-admin")


def test_a_purge_keeps_an_administrators_lines_and_keytab(box, settings, realm):
    del box, settings, realm
    ours, keytab = pathlib.Path("/etc/nfs.conf.d/vorn.conf"), pathlib.Path("/etc/nfs/krb5.keytab")
    with open(ours, "a", encoding="ascii") as file:
        file.write("[gssd]\n# chatty\nverbosity = 1\n")
    keytab.parent.mkdir(exist_ok=True)
    keytab.write_bytes(kerberos.keytab("nfs/by-hand.lab.test"))
    purge()
    lines = ours.read_text(encoding="ascii").splitlines()
    assert lines[-3:] == ["[gssd]", "# chatty", "verbosity = 1"]
    assert not [line for line in lines[:-3] if "=" in line]
    assert keytab.exists()


def files_below(*folders):
    return {path for folder in folders for path in pathlib.Path(folder).rglob("*")}


def test_installing_using_and_purging_leaves_no_new_file(box, client):
    places = ("/etc", "/usr", "/var/lib", "/lib/systemd", "/run/vorn")
    purge()
    before = files_below(*places) - files_below("/var/lib/nfs", "/var/lib/dpkg", "/var/lib/krb5kdc")
    install(PACKAGES)
    box.share("data")
    box.allow("data", {"client": client.address})
    box.nfs(read_size=32768)
    box.advanced(custom_port_enable=True, statd_port=32765, nlm_port=32803)
    box.allow("data")
    box.nfs(enable_nfs=False)
    purge()
    new = files_below(*places) - files_below("/var/lib/nfs", "/var/lib/dpkg", "/var/lib/krb5kdc") - before
    install(PACKAGES)
    administrators = {pathlib.Path(path) for path in ("/etc/vorn", "/etc/vorn/shares.conf", "/etc/exports",
                                                      "/etc/idmapd.conf")}
    assert new - administrators == set()
