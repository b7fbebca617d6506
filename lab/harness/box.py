"""The box under test. Its settings are changed through the API alone; what became of them is seen from outside."""

import contextlib
import pathlib
import shutil
import time

from harness import api
from harness.journal import Journal
from harness.programs import run, succeeds

# What the product writes, or has others read. The first are read when the service starts, and not again.
SERVICE_FILES = [pathlib.Path(path) for path in (
    "/etc/idmapd.conf", "/etc/nfs.conf.d/vorn.conf", "/etc/nfs/krb5.conf", "/etc/nfs/krb5.keytab",
    "/etc/systemd/system/nfs-server.service.d/vorn.conf")]
FILES = SERVICE_FILES + [pathlib.Path(path) for path in (
    "/etc/exports", "/etc/netgroup", "/etc/vorn/shares.conf", "/var/lib/vorn/firewall.nft")]

RULE = {"privilege": "rw", "root_squash": "root", "async": False, "insecure": False, "crossmnt": False,
        "security_flavor": {"sys": True}}


def wait_for(condition, what, limit=30):
    """Waits until the condition holds; fails with `what` when it does not in `limit` seconds."""
    deadline = time.monotonic() + limit
    while not condition():
        assert time.monotonic() < deadline, what
        time.sleep(0.05)


class Box:
    """What an administrator does, and what can be seen of it."""

    def __init__(self):
        self._before = {path: self._content(path) for path in FILES}
        self.journal = Journal()

    # The service.

    def nfs(self, **settings):
        """Sets these settings of the service; it is to be on if nothing else is said."""
        api.call("NFS", "set", **{"enable_nfs": True, **settings})

    def advanced(self, **settings):
        """Sets these advanced settings, beside those that are."""
        present = api.call("NFS.AdvancedSetting", "get")
        present["custom_port_enable"] = bool(present["custom_port_enable"])
        api.call("NFS.AdvancedSetting", "set", **{**present, "enable_nfs": True, **settings})

    def restart(self):
        """Off and on again, as an administrator does it."""
        self.nfs(enable_nfs=False)
        self.nfs(enable_nfs=True)

    @staticmethod
    def threads():
        return int(pathlib.Path("/proc/fs/nfsd/threads").read_text(encoding="ascii"))

    @staticmethod
    def rpc_ports(program):
        """Where rpcbind says that the program ("status", "nlockmgr", ...) listens."""
        lines = [line.split() for line in run("rpcinfo", "-p").splitlines()]
        return {int(words[3]) for words in lines if words[-1] == program}

    # Shares.

    def share(self, name):
        """A shared folder that everybody may write into; its path."""
        path = pathlib.Path("/srv") / name
        path.mkdir(exist_ok=True)
        path.chmod(0o777)
        shares = pathlib.Path("/etc/vorn/shares.conf")
        shares.parent.mkdir(exist_ok=True)
        text = shares.read_text(encoding="utf-8") if shares.exists() else "[shares]\n"
        if f"{name} = " not in text:
            shares.write_text(f"{text}{name} = {path}\n", encoding="utf-8")
        return path

    @staticmethod
    def allow(share, *rules):
        """The share's rules are these from now on; what a rule does not say is as in RULE."""
        api.call("NFS.SharePrivilege", "save", share_name=share, rule=[{**RULE, **rule} for rule in rules])

    @staticmethod
    def rules(share):
        return api.call("NFS.SharePrivilege", "load", share_name=share)["rule"]

    @staticmethod
    def exported():
        """The kernel's and mountd's table, as exportfs(8) prints it: (path, client) to options."""
        table = {}
        for line in pathlib.Path("/var/lib/nfs/etab").read_text(encoding="utf-8").splitlines():
            path, rest = line.split("\t", 1)
            client, options = rest.split("(", 1)
            table[path, client] = options.rstrip(")").split(",")
        return table

    # The story's own business.

    def foresees(self, pattern):
        """A warning in the journal that belongs to this story."""
        self.journal.foresee(pattern)

    def set_up(self):
        """Serving, with nothing exported."""
        if self.threads() == 0:
            run("systemctl", "reset-failed")
            run("systemctl", "start", "nfs-server")

    def put_back(self):
        """All files as the story found them, and the services accordingly."""
        changed = [path for path in FILES if self._content(path) != self._before[path]]
        for path in changed:
            self._restore(path)
        if any(path in SERVICE_FILES for path in changed) or not succeeds("systemctl", "-q", "is-active", "nfs-server"):
            run("systemctl", "daemon-reload")
            run("systemctl", "reset-failed")
            run("systemctl", "stop", "rpc-statd")
            run("systemctl", "restart", "nfs-server")
        elif changed:
            run("exportfs", "-ra")
        run("exportfs", "-f")
        for share in pathlib.Path("/srv").iterdir():
            shutil.rmtree(share)

    @staticmethod
    def _content(path):
        try:
            return path.read_bytes()
        except FileNotFoundError:
            return None

    def _restore(self, path):
        if self._before[path] is None:
            with contextlib.suppress(FileNotFoundError):
                path.unlink()
        else:
            path.parent.mkdir(parents=True, exist_ok=True)
            path.write_bytes(self._before[path])
