"""A hundred unusual or hostile client texts: none keeps the box from serving the other shares."""

import pathlib

from harness import api
from harness.programs import run

CLIENTS = [
    "", " ", "\t", "\n", "\r", "\0", "\x7f", "\x1b[31m", "\u2028", "\ufeff", "\u202e", "\u00a0",
    "*(rw)", "10.9.0.12(rw,no_root_squash)", "(rw)", "(", ")", "a(b", "a)b", "*(rw) *", "a b", " 10.9.0.12",
    "10.9.0.12 ", "10.9.0.12\n/ *(rw,no_root_squash)", "10.9.0.12\r\n/ *(rw)", "10.9.0.12\\\n", "10.9.0.12\\012/",
    "#", "a#b", "#10.9.0.12", "\\", "a\\", "\\040", "\\x", "\"", "\"10.9.0.12\"", "'", "'a'", "-", "-rw", "--", "-host",
    "host-", "host.", ".host", "host..x", "host_x", "@", "@@", "@nobody", "@trusted\n", "**", "?", "*.*.*", "?" * 64,
    "[a-z]*", "[", "[]", "]", "[!a]*", "[a-", "{a,b}", "10.0.0.0/33", "10.0.0.0/", "/24", "10.0.0.0/255.0.255.0",
    "10.9.0.0/24/24", "10.9.0.0/-1", "10.9.0.0/024", "0/0", "0.0.0.0/0", "256.1.1.1", "1.2.3", "1", "10.9.0.011",
    "0x0a.9.0.11", "167837707", "::1", "::/0", "2001:db8::/32", "2001:db8::/129", "fe80::1%eth0", ":::", "gss/krb5",
    "gss/krb5p", "no.such.host.invalid", "localhost", "/", "/srv/good", "~", "!", "%s%n", "$(reboot)", "`reboot`",
    "a;b", "a|b", "a&b", "a>b", "a,b", "10.9.0.11,10.9.0.12", "=", "=public", "sec=sys", "rw", "no_root_squash",
    "h\u00f6st", "\uff11\uff10.9.0.12", "a" * 255, "a" * 300, "a." * 120, "x" * 5000,
]


def test_no_rule_keeps_other_shares_from_being_served(box, client):
    assert len(CLIENTS) >= 100
    box.foresees("^vornd: ")  # each refusal has its lines
    box.foresees("exportfs: Failed to resolve ")
    box.share("odd")
    box.share("good")
    box.share("also good")
    good = [("/srv/good", client.address), ("/srv/also\\040good", client.address)]
    box.allow("odd", {"client": client.address})  # exportfs(8) ignores lines after a faulty one: the good ones follow
    box.allow("good", {"client": client.address})
    box.allow("also good", {"client": client.address})
    accepted, harmful = [], []
    for text in CLIENTS:
        try:
            box.allow("odd", {"client": text})
            accepted.append(text)
        except api.Refused:
            pass
        if not all(line in box.exported() for line in good):
            harmful.append(text)
    print(f"{len(accepted)} of {len(CLIENTS)} accepted: {accepted}")
    assert harmful == []
    assert {path for path, _ in box.exported()} <= {"/srv/odd", "/srv/good", "/srv/also\\040good"}
    lines = pathlib.Path("/etc/exports").read_text(encoding="utf-8").splitlines()
    assert len([line for line in lines if line.startswith(("/", "\""))]) == 3  # one for each share
    run("systemctl", "restart", "nfs-server")  # reads the whole file, as the next boot does
    assert client.mounts("/srv/good")
    assert client.mounts("/srv/also good")
