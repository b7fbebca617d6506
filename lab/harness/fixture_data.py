"""The test data of every guest: users, host names, short times, and the clients' addresses."""

import pathlib
import re

from harness import api, network, users
from harness.programs import wait_for

ADDRESSES = {"client": 11, "other": 12, "third": 7 * 256 + 13}  # the host part, for IPv4 and IPv6
NAMES = {"client": "client.lab.test", "other": "other.lab.test", "third": "third.elsewhere.test"}

# Short grace and lease times; with the defaults, a story would wait 90 s after each restart.
_NFS_CONF = "[nfsd]\nthreads=4\ngrace-time=10\nlease-time=10\n[mountd]\nport=20048\n"


def prepare():
    """Writes the files after the first boot, and waits for the web API. Starts nothing."""
    if not pathlib.Path("/etc/nfs.conf.d/administrator.conf").exists():
        _write_files()
    pathlib.Path("/proc/sys/fs/nfs/nlm_grace_period").write_text("1", encoding="ascii")
    wait_for(api.answers, "vornd does not listen")


def machine(name):
    """Creates the client machine with this short name."""
    return network.Client(NAMES[name], ADDRESSES[name])


def _write_files():
    users.create()
    pathlib.Path("/etc/nfs.conf.d/administrator.conf").write_text(_NFS_CONF, encoding="ascii")
    with open("/etc/hosts", "a", encoding="ascii") as hosts:
        hosts.writelines(f"{network.ipv4(ADDRESSES[name])} {NAMES[name]}\n" for name in ADDRESSES)
    nsswitch = pathlib.Path("/etc/nsswitch.conf")
    text = nsswitch.read_text(encoding="ascii")
    nsswitch.write_text(re.sub("netgroup:.*", "netgroup: files", text), encoding="ascii")
