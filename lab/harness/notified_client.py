"""The client machine with its status daemon, started at boot by a unit: it is there when the box notifies it."""

import pathlib
import signal

from harness import fixture_data
from harness.programs import run

_LOG = pathlib.Path("/tmp/notified")

_UNIT = """[Unit]
After=lab-network.service
Before=rpc-statd-notify.service
[Service]
Environment=PYTHONPATH=/lab
ExecStart=/usr/bin/python3 -B -m harness.notified_client
[Install]
WantedBy=multi-user.target
"""


def start_at_next_boot():
    """Installs the unit."""
    pathlib.Path("/etc/systemd/system/notified-client.service").write_text(_UNIT, encoding="ascii")
    run("systemctl", "enable", "notified-client")


def received():
    """What the client's status daemon has printed."""
    return _LOG.read_text(encoding="utf-8", errors="replace") if _LOG.exists() else ""


if __name__ == "__main__":
    with fixture_data.machine("client").locking(log=_LOG):
        signal.pause()
