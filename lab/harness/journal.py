"""The box's journal: what our programs and the kernel said during a story."""

import json
import re

from harness.programs import run

WARNING = 4  # syslog(3)

# Whatever else goes on in the box, these are ours to answer for.
_OURS = ("vornd", "S83nfsd", "S83nfsd.sh")
_KERNEL_TROUBLE = re.compile(r"BUG:|Oops|WARNING:|RPC fragment too large|hung task")


class Journal:
    """From now on."""

    def __init__(self):
        self._foreseen = []
        self._cursor = self._read("--lines=1")[-1]["__CURSOR"]

    def foresee(self, pattern):
        """A complaint that belongs to the story."""
        self._foreseen.append(re.compile(pattern))

    def complaints(self):
        """Warnings and worse of ours, and the kernel's troubles, that nobody foresaw."""
        lines = [line for line in map(self._complaint, self._since()) if line]
        return [line for line in lines if not any(pattern.search(line) for pattern in self._foreseen)]

    def text(self):
        """All messages, a line each."""
        return "\n".join(self._message(entry) for entry in self._since())

    def _since(self):
        return self._read(f"--after-cursor={self._cursor}")

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
        if identifier in _OURS and int(entry.get("PRIORITY", 6)) <= WARNING:
            return f"{identifier}: {message}"
        if identifier == "kernel" and _KERNEL_TROUBLE.search(message):
            return f"kernel: {message}"
        return None
