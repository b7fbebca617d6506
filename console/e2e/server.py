"""server.py: serves a fresh trial root until its standard input is closed. Prints address, root and sign-in code as JSON."""

import json
import pathlib
import sys

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "scripts"))
from trial_server import TrialServer  # pylint: disable=wrong-import-position

with TrialServer() as server:
    (server.folder / "nfs.keytab").write_bytes(server.keytab())
    print(json.dumps({"address": server.address(), "root": str(server.root), "socket": str(server.socket),
                      "code": server.sign_in_code(), "process": server.process_id(),
                      "keytab": str(server.folder / "nfs.keytab")}), flush=True)
    sys.stdin.read()
