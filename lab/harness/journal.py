"""The box's journal: the messages of the NFS service and the kernel during a story."""

import json
import re

from harness.programs import run

_WARNING = 4  # syslog(3)

# The log lines that count as complaints, by program. Our own programs and the daemons use priorities; exportfs(8) and
# rpc.nfsd(8) write to standard error, which the journal has at priority 6. The unit of Debian 13 runs the latter with sh(1).
_WARNINGS_OF = {"vornd", "S83nfsd", "S83nfsd.sh", "rpc.mountd", "rpc.statd", "rpc.idmapd", "rpc.svcgssd", "sm-notify",
                "nfsdcld", "rpcbind"}
_EVERY_LINE_OF = {"exportfs", "rpc.nfsd", "nft", "sh"}
_KERNEL_TROUBLE = re.compile(r"BUG:|Oops|WARNING:|RPC fragment too large|hung task|lockd: |nfsd: |"
                             r"NFSD: .*(fail|unable)|svc: failed")
_UNIT_TROUBLE = re.compile(r"^(nfs-|rpc|vorn|auth-rpcgss)\S*\.(service|socket|mount): "
                           r"(Failed|Start request repeated|State '.*' timed out)")

# Log lines that a healthy box writes as well.
_NORMAL = re.compile(r"refused (un)?mount request|"  # a client that no rule admits
                     r"exiting on signal 15|Setting log level to|Flags: TI-RPC|"
                     r"Failed to read /var/lib/nfs/state: Success|"  # the first start of all
                     r"Setting nobody's (user|group)|"
                     r"NFSD: (Using|starting|end of|all clients done|no clients)|"
                     r"nfsd: last server has exited|"
                     r"nfsdctl: lockd configuration failure")  # of nfs-utils 2.8.3; its unit then runs rpc.nfsd


class Journal:
    """Reads the journal from now on, or since the box booted."""

    def __init__(self, since_boot=False):
        self._foreseen = []
        self._from = "--boot" if since_boot else f"--after-cursor={self._read('--lines=1')[-1]['__CURSOR']}"

    def foresee(self, pattern):
        """Declares lines that the story expects, as a regular expression."""
        self._foreseen.append(re.compile(pattern))

    def complaints(self):
        """The complaints that the story does not expect."""
        lines = [line for line in map(self._complaint, self._since()) if line]
        return [line for line in lines if not any(pattern.search(line) for pattern in self._foreseen)]

    def text(self):
        """All messages, a line each."""
        return "\n".join(self._message(entry) for entry in self._since())

    def _since(self):
        return self._read(self._from)

    @staticmethod
    def _read(*arguments):
        output = run("journalctl", "--sync", "--quiet") + run("journalctl", "--quiet", "--output=json", *arguments)
        return [json.loads(line) for line in output.split("\n") if line.startswith("{")]

    @staticmethod
    def _message(entry):
        message = entry.get("MESSAGE") or ""
        return message if isinstance(message, str) else bytes(message).decode(errors="replace")

    def _complaint(self, entry):
        message = self._message(entry)
        identifier = entry.get("SYSLOG_IDENTIFIER", "")
        priority = int(entry.get("PRIORITY", 6))
        if _NORMAL.search(message):
            return None
        wrong = (identifier in _WARNINGS_OF and priority <= _WARNING or identifier in _EVERY_LINE_OF or
                 identifier == "kernel" and _KERNEL_TROUBLE.search(message) or
                 identifier == "systemd" and _UNIT_TROUBLE.search(message))
        return f"{identifier}: {message}" if wrong else None
