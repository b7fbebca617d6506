"""An administrator's own firewall, and whether connections pass it."""

import contextlib
import socket

from harness.network import BOX_ADDRESS
from harness.programs import run

STRICT_RULES = "/tmp/strict.nft"

# Accepts only what is asked for, and packets that the NFS service has marked.
_STRICT = """
table inet administrator {
  chain input {
    type filter hook input priority filter; policy accept;
    ct state established,related accept
    iifname "br0" meta mark & 0x01000000 != 0 accept
    iifname "br0" tcp dport { 111, 2049 } accept
    iifname "br0" ip protocol { tcp, udp } reject
  }
}
"""


@contextlib.contextmanager
def strict_firewall():
    """Within the block, the box's own rules reject every port that no rule opens."""
    with open(STRICT_RULES, "w", encoding="ascii") as rules:
        rules.write(_STRICT)
    run("nft", "-f", STRICT_RULES)
    try:
        yield
    finally:
        run("nft", "delete", "table", "inet", "administrator")


def reaches(client, port):
    """Whether the client can connect to a program that listens at this port of the box."""
    with socket.socket() as program:
        program.setsockopt(socket.SOL_SOCKET, socket.SO_REUSEADDR, 1)
        with contextlib.suppress(OSError):  # a daemon of the service listens there already
            program.bind(("0.0.0.0", port))
            program.listen()
        probe = f"import socket; socket.create_connection(({BOX_ADDRESS!r}, {port}), 5)"
        return client.succeeds("python3", "-S", "-c", probe)
