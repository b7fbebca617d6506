"""server.py [tls]: serves a fresh trial root until its standard input is closed.

Prints address, root and sign-in code as JSON. With "tls" the address is one with TLS, where accounts have passwords.
"""

import json
import pathlib
import sys

sys.path.insert(0, str(pathlib.Path(__file__).resolve().parents[2] / "scripts"))
from trial_server import TrialServer  # pylint: disable=wrong-import-position

tls = sys.argv[1:] == ["tls"]
with TrialServer(tls) as server:
    (server.folder / "nfs.keytab").write_bytes(server.keytab())
    url = f"https://{server.tls_address()}/" if tls else f"http://{server.address()}/"
    print(json.dumps({"url": url, "root": str(server.root), "socket": str(server.socket),
                      "code": server.sign_in_code(), "process": server.process_id(),
                      "keytab": str(server.folder / "nfs.keytab")}), flush=True)
    sys.stdin.read()
