"""The box as it stands in the rack: on its network, with its users, serving."""

import pathlib
import re

from harness import api, network, users
from harness.box import wait_for
from harness.programs import run

ADDRESSES = {"client": "10.9.0.11", "other": "10.9.0.12", "third": "10.9.7.13"}
NAMES = {"client": "client.lab.test", "other": "other.lab.test", "third": "third.elsewhere.test"}

# Short times, so that no story waits a minute and a half after a restart.
_NFS_CONF = "[nfsd]\nthreads=4\ngrace-time=10\nlease-time=10\n[mountd]\nport=20048\n"


def furnish():
    """Once after the boot; a disk that has been booted before keeps what is in its files."""
    network.build()
    if not pathlib.Path("/etc/nfs.conf.d/administrator.conf").exists():
        _write_files()
    pathlib.Path("/proc/sys/fs/nfs/nlm_grace_period").write_text("1", encoding="ascii")
    wait_for(api.answers, "vornd does not listen")
    run("systemctl", "enable", "--now", "nfs-server")


def machine(name):
    """The client machine of this short name, new."""
    return network.Client(NAMES[name], ADDRESSES[name])


def _write_files():
    users.create()
    pathlib.Path("/etc/nfs.conf.d/administrator.conf").write_text(_NFS_CONF, encoding="ascii")
    with open("/etc/hosts", "a", encoding="ascii") as hosts:
        hosts.writelines(f"{address} {NAMES[name]}\n" for name, address in ADDRESSES.items())
    nsswitch = pathlib.Path("/etc/nsswitch.conf")
    nsswitch.write_text(re.sub("netgroup:.*", "netgroup: files", nsswitch.read_text(encoding="ascii")), encoding="ascii")
