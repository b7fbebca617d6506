"""A Kerberos realm with its KDC on the box, and the set-up of its clients."""

import contextlib
import os
import pathlib
import signal

from harness.network import BOX_ADDRESS
from harness.programs import run

REALM = "LAB.TEST"
SERVER = "box.lab.test"  # the host name of the NFS service's principal, nfs/box.lab.test

_CONFIGURATION = f"""[libdefaults]
 default_realm = {REALM}
 dns_lookup_kdc = false
 dns_canonicalize_hostname = false
 rdns = false
 default_ccache_name = FILE:/tmp/krb5cc_%{{uid}}
[realms]
 {REALM} = {{
  kdc = {BOX_ADDRESS}
 }}
[domain_realm]
 .lab.test = {REALM}
"""


def _kadmin(command):
    run("kadmin.local", "-q", command)


def found_realm():
    """The realm with its users, each with the password "secret"."""
    pathlib.Path("/etc/krb5.conf").write_text(_CONFIGURATION, encoding="ascii")
    pathlib.Path("/etc/krb5kdc/kdc.conf").write_text(
        f"[realms]\n {REALM} = {{\n  supported_enctypes = aes256-cts-hmac-sha1-96:normal\n }}\n", encoding="ascii")
    run("kdb5_util", "create", "-r", REALM, "-s", "-P", "master")
    for user in ("alice", "bob"):
        _kadmin(f"addprinc -pw secret {user}")
    run("systemctl", "start", "krb5-kdc")


def keytab(principal, former=b""):
    """Creates the principal. Returns a keytab with new keys of it, behind those of the keytab `former`."""
    path = pathlib.Path("/tmp/new.keytab")
    path.unlink(missing_ok=True)
    if former:
        path.write_bytes(former)
    _kadmin(f"addprinc -randkey {principal}")
    _kadmin(f"ktadd -k {path} {principal}")
    return path.read_bytes()


def sign_in(user, principal):
    """Gives the user Kerberos credentials of the principal."""
    run("sh", "-c", f"echo secret | kinit {principal}", user=user)


def sign_out(user):
    pathlib.Path(f"/tmp/krb5cc_{user.uid}").unlink(missing_ok=True)


# The service manager of a client starts rpc.gssd again when it ends, and so does this.
_GSSD = 'while :; do rpc.gssd -f -p "$1" -k "$2" & echo $! >"$3"; wait; done'


@contextlib.contextmanager
def joined(client):
    """Within the block, the machine is a client of the realm: its rpc.gssd(8) runs, with files of its own."""
    path = pathlib.Path(f"/tmp/{client.name}.keytab")
    path.write_bytes(keytab(f"host/{client.name}"))
    pipes = f"/run/pipes-{client.name}"
    os.makedirs(pipes, exist_ok=True)
    client.run("mount", "-t", "rpc_pipefs", "sunrpc", pipes)
    with client.running("sh", "-c", _GSSD, "gssd", pipes, str(path), _gssd_process(client)):
        yield
    run("umount", pipes)


def _gssd_process(client):
    return f"/run/gssd-{client.name}.pid"


def restart_gssd(client):
    """Restarts the machine's rpc.gssd(8), which keeps the ticket of the machine itself until the ticket expires."""
    os.kill(int(pathlib.Path(_gssd_process(client)).read_text(encoding="ascii")), signal.SIGTERM)
