"""A box for demonstrations: NFS is on, and a client has mounted a share."""

from harness import fixture_data
from harness.box import Box

fixture_data.prepare()
box = Box()
client = fixture_data.machine("client")
box.nfs(enable_nfs=True)
box.share("data")
box.allow("data", {"client": "10.9.0.0/24"})
mounted = client.mount("/srv/data")
(mounted / "hello").write_text("Hello from a client.\n", encoding="ascii")

print(f"""
A running box. It shares /srv/data, which {client.name} ({client.address}) has mounted at {mounted}.

  curl -s --unix-socket /run/vorn/vornd.sock http://localhost/api
  cat /etc/exports; exportfs -v; nfsstat -s; ls -l /srv/data
  ip netns exec client ss -tn            what the client's own network sees
""")
