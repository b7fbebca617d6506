"""Client machines: network namespaces on a bridge, each with its own address and host name."""

import contextlib
import ctypes
import os
import pathlib
import signal
import subprocess

from harness.programs import ProgramFailed, run, succeeds, wait_for

BOX_ADDRESS = "10.9.0.1"
BOX_ADDRESS6 = "fd00:9::1"

_libc = ctypes.CDLL(None, use_errno=True)
_CLONE_NEWUTS = 0x04000000
_CLONE_NEWNET = 0x40000000


def _check(result):
    if result != 0:
        raise OSError(ctypes.get_errno(), os.strerror(ctypes.get_errno()))


def ipv4(host):
    """The IPv4 address of host number `host` on the box's network, a /16."""
    return f"10.9.{host // 256}.{host % 256}"


def ipv6(host):
    """The IPv6 address of host number `host` on the box's network, a /64."""
    return f"fd00:9::{host:x}"


def bracketed(server):
    """The server's address in the syntax of mount(8)."""
    return f"[{server}]" if ":" in server else server


class MountFailed(Exception):
    """A mount that the server or the client refused."""


class Client:
    """A machine with an address of its own. It has no files but those that it mounts."""

    def __init__(self, name, host):
        self.name = name
        self.address = ipv4(host)
        self.address6 = ipv6(host)
        self._mounts = []
        short = name.split(".", maxsplit=1)[0]
        self._namespace = f"/run/netns/{short}"
        self._folder = f"/mnt/{short}"
        if not os.path.exists(self._namespace):
            self._build(short)

    def run(self, *command, **options):
        """Runs a program on this machine and returns its output. It sees the box's files and the machine's network."""
        return run(*command, before=self._enter, **options)

    def succeeds(self, *command):
        """Whether a program on this machine succeeds."""
        return succeeds(*command, before=self._enter)

    @contextlib.contextmanager
    def running(self, *command):
        """Runs a program on this machine within the block, and then ends it with its child processes."""
        with subprocess.Popen(command, stdin=subprocess.DEVNULL, start_new_session=True,
                              preexec_fn=self._enter) as process:
            try:
                yield
            finally:
                os.killpg(process.pid, signal.SIGTERM)

    @contextlib.contextmanager
    def locking(self, log="/dev/null"):
        """rpcbind(8) and rpc.statd(8) of this machine, without which it cannot lock over NFSv3. The status daemon's
        debugging messages go to the file `log`."""
        daemons = ("mount -t tmpfs none /run && mkdir -p /run/rpcbind /run/state/sm /run/state/sm.bak && "
                   "rpcbind -f & until rpcinfo -T tcp 127.0.0.1 portmapper; do sleep 0.1; done >/dev/null 2>&1; "
                   f"exec rpc.statd -F -d --no-notify -P /run/state >{log} 2>&1")
        with self.running("unshare", "--mount", "sh", "-c", daemons):
            wait_for(lambda: self.succeeds("rpcinfo", "-T", "tcp", "127.0.0.1", "status"), f"{self.name}: no rpc.statd")
            yield

    def mount(self, path, version="4.2", options="", server=BOX_ADDRESS, timeout=300):
        """Where the exported folder is now mounted. Raises MountFailed.

        Soft, so that a story that goes wrong ends. An NFSv3 mount does not lock unless it is told to: the lock
        managers of all machines are the one of this kernel, and a client's takes the box's out of rpcbind."""
        target = pathlib.Path(f"{self._folder}-{len(self._mounts)}")
        target.mkdir(exist_ok=True)
        words = [f"vers={version}", "soft", "timeo=150", "retrans=2", "retry=0", "noac"] + [options] * bool(options)
        if version == "3" and options != "lock":
            words.append("nolock")
        source = f"{bracketed(server)}:{path}"
        try:
            self.run("mount", "-t", "nfs", "-o", ",".join(words), source, str(target), timeout=timeout)
        except ProgramFailed as failure:
            raise MountFailed(str(failure)) from None
        self._mounts.append(target)
        return target

    @contextlib.contextmanager
    def mounted(self, path, **how):
        """Mounts the folder within the block."""
        target = self.mount(path, **how)
        try:
            yield target
        finally:
            self.unmount(target)

    def mounts(self, path, **how):
        """Whether this machine can mount the exported folder and look into it."""
        try:
            with self.mounted(path, **how) as target:
                os.listdir(target)
        except (MountFailed, OSError) as failure:
            print(f"{self.name}: {failure}")
            return False
        return True

    def unmount(self, target):
        run("umount", str(target))
        self._mounts.remove(target)

    def unmount_all(self):
        """Unmounts everything at the end of a story, also after a failure."""
        for target in list(self._mounts):
            with contextlib.suppress(ProgramFailed):
                run("umount", "-f", "-l", str(target))
        self._mounts.clear()

    def _enter(self):
        with open(self._namespace, "rb") as namespace:
            _check(_libc.setns(namespace.fileno(), _CLONE_NEWNET))
        _check(_libc.unshare(_CLONE_NEWUTS))
        _check(_libc.sethostname(self.name.encode(), len(self.name)))

    def _build(self, name):
        run("ip", "netns", "add", name)
        run("ip", "link", "add", f"v{name}", "type", "veth", "peer", "name", "eth0", "netns", name)
        run("ip", "link", "set", f"v{name}", "master", "br0", "up")
        run("ip", "-n", name, "addr", "add", f"{self.address}/16", "dev", "eth0")
        run("ip", "-n", name, "addr", "add", f"{self.address6}/64", "dev", "eth0", "nodad")
        run("ip", "-n", name, "link", "set", "eth0", "up")
        run("ip", "-n", name, "link", "set", "lo", "up")
