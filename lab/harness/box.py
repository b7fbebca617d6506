"""The box under test. Stories change its settings through the API only, and observe the result from outside."""

import contextlib
import pathlib
import shutil

from harness import api
from harness.journal import Journal
from harness.programs import run, succeeds

# Files that the product or a story writes. The service reads the first ones only when it starts.
SERVICE_FILES = [pathlib.Path(path) for path in (
    "/etc/idmapd.conf", "/etc/nfs.conf.d/vorn.conf", "/etc/nfs/krb5.conf", "/etc/nfs/krb5.keytab",
    "/etc/systemd/system/nfs-server.service.d/vorn.conf")]
FILES = SERVICE_FILES + [pathlib.Path(path) for path in (
    "/etc/exports", "/etc/netgroup", "/etc/vorn/shares.conf", "/var/lib/vorn/firewall.nft")]

_RULE = {"privilege": "rw", "root_squash": "root", "async": False, "insecure": False, "crossmnt": False,
         "security_flavor": {"sys": True}}


class Box:
    """The operations of an administrator, and the state of the box that they result in."""

    def __init__(self, since_boot=False):
        self._before = {path: self._content(path) for path in FILES}
        self.journal = Journal(since_boot)

    # The service.

    def nfs(self, **settings):
        """Sets these settings of the service. Enables the service unless `enable_nfs` is given."""
        api.call("NFS", "set", **{"enable_nfs": True, **settings})

    def advanced(self, **settings):
        """Sets these advanced settings and keeps the others."""
        present = api.call("NFS.AdvancedSetting", "get")
        present["custom_port_enable"] = bool(present["custom_port_enable"])
        api.call("NFS.AdvancedSetting", "set", **{**present, "enable_nfs": True, **settings})

    def restart(self):
        """Switches the service off and on again, as an administrator does."""
        self.nfs(enable_nfs=False)
        self.nfs(enable_nfs=True)

    @staticmethod
    def threads():
        """The number of NFS server threads. Its file exists once the service was started."""
        threads = pathlib.Path("/proc/fs/nfsd/threads")
        return int(threads.read_text(encoding="ascii")) if threads.exists() else 0

    @staticmethod
    def rpc_ports(program):
        """The ports at which rpcbind has registered the program ("status", "nlockmgr", ...)."""
        lines = [line.split() for line in run("rpcinfo", "-p").splitlines()]
        return {int(words[3]) for words in lines if words[-1] == program}

    # Shares.

    def share(self, name):
        """Creates a share whose folder is writable for all users. Returns its path."""
        path = pathlib.Path("/srv") / name
        path.mkdir(exist_ok=True)
        path.chmod(0o777)
        self.share_at(name, path)
        return path

    @staticmethod
    def share_at(name, path):
        """Makes an existing folder a share."""
        shares = pathlib.Path("/etc/vorn/shares.conf")
        shares.parent.mkdir(exist_ok=True)
        text = shares.read_text(encoding="utf-8") if shares.exists() else "[shares]\n"
        if f"{name} = " not in text:
            shares.write_text(f"{text}{name} = {path}\n", encoding="utf-8")

    @staticmethod
    def rule(**fields):
        """A rule for the API; fields that are not given have the values of _RULE."""
        return {**_RULE, **fields}

    def allow(self, share, *rules):
        """Replaces the share's rules, each a dictionary of the fields that differ from _RULE."""
        api.call("NFS.SharePrivilege", "save", share_name=share, rule=[self.rule(**rule) for rule in rules])

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

    # The journal, and the state before and after a story.

    def foresees(self, pattern):
        """Declares a warning in the journal that this story expects."""
        self.journal.foresee(pattern)

    def set_up(self):
        """Starts the service without exports. An earlier story may have left it running and disabled, as it does with
        a package that was purged while the service was off; the API then reloads nothing."""
        if self.threads() == 0 or not succeeds("systemctl", "-q", "is-enabled", "nfs-server"):
            run("systemctl", "reset-failed")
            self.nfs(enable_nfs=True)

    def put_back(self):
        """Restores all files that the story changed, and the services accordingly."""
        changed = [path for path in FILES if self._content(path) != self._before[path]]
        for path in changed:
            self._restore(path)
        if any(path in SERVICE_FILES for path in changed) or not succeeds("systemctl", "-q", "is-active", "nfs-server"):
            run("systemctl", "daemon-reload")
            run("systemctl", "reset-failed")
            run("systemctl", "try-restart", "rpc-statd")
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
