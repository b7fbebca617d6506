"""Client machines: network namespaces on a bridge, each with its own address and host name."""

import contextlib
import ctypes
import os
import pathlib
import signal
import subprocess
import time

from harness.programs import ProgramFailed, run, succeeds

BOX_ADDRESS = "10.9.0.1"

_libc = ctypes.CDLL(None, use_errno=True)
_CLONE_NEWUTS = 0x04000000
_CLONE_NEWNET = 0x40000000


def _check(result):
    if result != 0:
        raise OSError(ctypes.get_errno(), os.strerror(ctypes.get_errno()))


def build():
    """The box's own side of the network."""
    run("modprobe", "-q", "bridge")
    for command in ("link set lo up", "link add br0 type bridge", f"addr add {BOX_ADDRESS}/16 dev br0",
                    "link set br0 up"):
        run("ip", *command.split())


class MountFailed(Exception):
    """A mount that the server or the client did not do."""


class Client:
    """A machine with an address of its own. It has no files but those that it mounts."""

    def __init__(self, name, address):
        self.name = name
        self.address = address
        self._mounts = []
        short = name.split(".", maxsplit=1)[0]
        self._namespace = f"/run/netns/{short}"
        self._folder = f"/mnt/{short}"
        self._build(short)

    def run(self, *command, **options):
        """What a program prints that runs on this machine. The files are the box's, the network is not."""
        return run(*command, before=self._enter, **options)

    def succeeds(self, *command):
        """Whether a program on this machine does what it is asked to."""
        return succeeds(*command, before=self._enter)

    @contextlib.contextmanager
    def running(self, *command):
        """A program that runs on this machine for as long as the block lasts, and all that it started."""
        with subprocess.Popen(command, stdin=subprocess.DEVNULL, start_new_session=True,
                              preexec_fn=self._enter) as process:
            try:
                yield
            finally:
                os.killpg(process.pid, signal.SIGTERM)

    @contextlib.contextmanager
    def locking(self):
        """rpcbind(8) and rpc.statd(8) of this machine, without which it cannot lock over NFSv3."""
        daemons = ("mount -t tmpfs none /run && mkdir -p /run/rpcbind /run/state/sm /run/state/sm.bak && "
                   "rpcbind -f & sleep 1; exec rpc.statd -F --no-notify -P /run/state")
        with self.running("unshare", "--mount", "sh", "-c", daemons):
            for _ in range(100):
                if self.succeeds("rpcinfo", "-T", "tcp", "127.0.0.1", "status"):
                    break
                time.sleep(0.1)
            yield

    def mount(self, path, version="4.2", options="", server=BOX_ADDRESS, timeout=30):
        """Where the exported folder is now mounted. Raises MountFailed.

        Soft, so that a story that goes wrong ends. An NFSv3 mount does not lock unless it is told to: the lock
        managers of all machines are the one of this kernel, and a client's takes the box's out of rpcbind."""
        target = pathlib.Path(f"{self._folder}-{len(self._mounts)}")
        target.mkdir(exist_ok=True)
        words = [f"vers={version}", "soft", "timeo=50", "retrans=1", "retry=0", "noac"] + [options] * bool(options)
        if version == "3" and options != "lock":
            words.append("nolock")
        try:
            self.run("mount", "-t", "nfs", "-o", ",".join(words), f"{server}:{path}", str(target), timeout=timeout)
        except ProgramFailed as failure:
            raise MountFailed(str(failure)) from None
        self._mounts.append(target)
        return target

    @contextlib.contextmanager
    def mounted(self, path, **how):
        """mount(), for as long as the block lasts."""
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
        """At the end of a story, whatever happened in it."""
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
        run("ip", "-n", name, "link", "set", "eth0", "up")
        run("ip", "-n", name, "link", "set", "lo", "up")
