"""The explanation of an access, and the clients of a folder with their rights, are what the kernel's server does."""

import collections
import dataclasses
import errno
import ipaddress
import os
import pathlib
import random
import subprocess
import sys

import pytest

from harness import api, users
from harness.network import BOX_ADDRESS, BOX_ADDRESS6, Client, MountFailed
from harness.programs import ProgramFailed, as_user, run

CLIENTS = ["client.lab.test", "other.lab.test", "10.9.0.11", "10.9.0.12", "10.9.7.13", "10.9.0.0/24", "10.9.0.8/30",
           "10.9.0.0/255.255.0.0", "fd00:9::b", "fd00:9:0::70d", "FD00:9::/64", "fd00:9::8/125", "fd00:9::/ffff:ffff::",
           "::ffff:10.9.0.11", "::ffff:10.9.0.0/112", "*.lab.test", "?lient.lab.test", "*.elsewhere.test", "10.9.0.1*",
           "fd00:9::?", "[co]*.lab.test", "[^c]*.lab.test", "[!c]*.test", "*.LAB.test", "[C-O]*", "*l?as*", "[b-d]*",
           "**", "@trusted", "@all", "*"]
NETGROUPS = "trusted (other.lab.test,,) (third,,)\nall (client.lab.test,,) (10.9.0.12,,) (third.elsewhere.test,,)\n"
USERS = [users.ROOT, users.ALICE, users.BOB, users.NOBODY]
SHARES = {"first": "/srv/first", "inner": "/srv/first/inner", "second": "/srv/second", "deep": "/srv/way/to/deep"}
RIGHTS = ("mountable", "read", "write")
CASES_OF_A_SET = 6

# Answers for the reverse names of two addresses. The first name has another address, and the second has none.
NAME_SERVER = r"""
import socket, struct
REVERSE = {"12.0.9.10.in-addr.arpa": "alien.corp.test", "11.0.9.10.in-addr.arpa": "nowhere.corp.test"}
FORWARD = {"alien.corp.test": "10.9.0.99"}
def encoded(name):
    return b"".join(bytes([len(label)]) + label.encode() for label in name.split(".")) + b"\0"
server = socket.socket(socket.AF_INET, socket.SOCK_DGRAM)
server.bind(("127.0.0.1", 53))
print("ready", flush=True)
while True:
    query, client = server.recvfrom(512)
    at, labels = 12, []
    while query[at]:
        labels.append(query[at + 1:at + 1 + query[at]].decode())
        at += query[at] + 1
    name, (kind,), end = ".".join(labels).lower(), struct.unpack(">H", query[at + 1:at + 3]), at + 5
    data = encoded(REVERSE[name]) if kind == 12 and name in REVERSE else b""
    data = socket.inet_aton(FORWARD[name]) if kind == 1 and name in FORWARD else data
    flags = 0x8580 if name in REVERSE or name in FORWARD else 0x8583  # an answer, or no such name (RFC 1035)
    answer = query[:2] + struct.pack(">HHHHH", flags, 1, 1 if data else 0, 0, 0) + query[12:end]
    if data:
        answer += b"\xc0\x0c" + struct.pack(">HHIH", kind, 1, 60, len(data)) + data
    server.sendto(answer, client)
"""


@dataclasses.dataclass(frozen=True)
class Access:
    """Who asks the box for what, and how."""

    share: str
    machine: Client
    is_ipv6: bool
    version: str
    port: int | None
    user: users.User

    @property
    def address(self):
        return self.machine.address6 if self.is_ipv6 else self.machine.address

    @property
    def question(self):
        """The parameters of a question about this access, except for the share and the client."""
        return {"version": self.version, "port": self.port, "user": str(self.user.uid), "groups": [str(self.user.gid)]}

    def __str__(self):
        return f"{self.share} {self.address} {self.user.name} version {self.version} port {self.port}"


def network(choose, address):
    """A network of any size and in any spelling, with the address in it or missed by one bit."""
    host = ipaddress.ip_address(address)
    length = choose.choice([0, *(choose.randint(0, host.max_prefixlen) for _ in range(7))])
    number = int(host)
    bit = choose.choice([None, length, length + 1, choose.randint(1, host.max_prefixlen)])
    if bit and bit <= host.max_prefixlen:
        number ^= 1 << (host.max_prefixlen - bit)
    ones = (1 << host.max_prefixlen) - (1 << (host.max_prefixlen - length))
    gap = 1 << choose.randrange(host.max_prefixlen)
    size = choose.choice([length, length, f"0{length}", type(host)(ones), type(host)(ones & ~gap)])
    return f"{type(host)(number)}/{size}"


def clients_of_a_folder(choose, machines):
    """Up to six clients in a random order: of the list, and networks around the machines' addresses."""
    near = [network(choose, choose.choice([machine.address, machine.address6, machine.address6]))
            for machine in choose.sample(machines, choose.randint(0, 2))]
    clients = list(dict.fromkeys(near + choose.sample(CLIENTS, choose.randint(1, 4))))
    choose.shuffle(clients)
    return clients


def options(choose):
    words = [choose.choice(["ro", "rw", "rw"]), choose.choice(["secure", "secure", "insecure"]), "no_subtree_check",
             choose.choice(["root_squash", "no_root_squash", "all_squash", "no_root_squash,all_squash"])]
    words += choose.choice([[], [], ["anonuid=2001"], ["anonuid=2002", "anongid=2003"]])
    words += choose.choice([[], [], [], ["crossmnt"], ["sec=sys"], ["sec=krb5:sys"], ["sec=krb5"]])
    return ",".join(words)


def write_names(choose, machines, names):
    """Gives some machines names of their IPv6 addresses and aliases, besides the names in /etc/hosts, or none. Returns
    whether a machine has two addresses now."""
    named = choose.choice([[], machines[:2], machines])
    lines = [f"{machine.address6} {machine.name}{choose.choice(['', ' alias6.elsewhere.test'])}\n" for machine in named]
    lines += [f"{machine.address} {machine.name} alias.elsewhere.test\n" for machine in choose.choice([[], machines[:1]])]
    pathlib.Path("/etc/hosts").write_text(names + "".join(lines), encoding="ascii")
    return bool(named)


def set_up(choose, machines):
    """Folders with owners and permissions, and rules for some of them."""
    lines = []
    for folder in ("/srv/way", "/srv/way/to"):
        os.chmod(folder, choose.choice([0o755, 0o755, 0o711, 0o700]))
    for path in SHARES.values():
        os.chmod(path, choose.choice([0o777, 0o777, 0o755, 0o750, 0o700]))
        os.chown(path, choose.choice([0, 2001, 65534]), choose.choice([0, 2002, 2003]))
        for _ in range(choose.choice([0, 1, 1, 2])):
            clients = clients_of_a_folder(choose, machines)
            lines.append(" ".join([path] + [f"{client}({options(choose)})" for client in clients]))
    choose.shuffle(lines)
    pathlib.Path("/etc/exports").write_text("\n".join(lines) + "\n", encoding="ascii")
    reload_exports()
    return lines


def reload_exports():
    """Of two rules of a folder for the same client, exportfs(8) takes the first, and reports a failure."""
    try:
        run("exportfs", "-ra")
    except ProgramFailed as failure:
        assert "duplicated export entries" in str(failure), failure


def attempt(user, action):
    try:
        as_user(user, action)
    except OSError as error:
        assert error.errno in (errno.EROFS, errno.EACCES, errno.EPERM), error
        return False
    return True


def observe(access):
    """What the kernel's server lets the user do."""
    path, machine = SHARES[access.share], access.machine
    try:
        target = machine.mount(path, version=access.version, options="sec=sys,noresvport" if access.port else "sec=sys",
                               server=BOX_ADDRESS6 if access.is_ipv6 else BOX_ADDRESS)
    except MountFailed:
        return {"mountable": False, "read": False, "write": False}
    try:
        probe = pathlib.Path(path) / "probe"
        seen = {"mountable": True, "read": attempt(access.user, lambda: os.listdir(target)),
                "write": attempt(access.user, (target / "probe").touch)}
        if seen["write"]:
            status = os.stat(probe)
            seen["identity"] = status.st_uid, status.st_gid
            probe.unlink()
        return seen
    finally:
        machine.unmount(target)


def explained(access, must_be_in_force):
    """The same as observe() from the explanation, and the explanation."""
    answer = api.call("NFS.Access", "explain", share=access.share, client=access.address, **access.question)
    if must_be_in_force:
        assert all(check["check"] != "reload" for check in answer["checks"]), "the rules are in force"
    told = {right: answer[right] for right in RIGHTS}
    if answer["write"]:
        told["identity"] = answer["identity"]["uid"], answer["identity"]["gid"]
    return told, answer


def listed(access):
    """The rights of the client in each row of the folder's clients that was explained for its address."""
    clients = api.call("NFS.Access", "matrix", share=access.share, **access.question)["clients"]
    found = [row["flavors"] for row in clients if row["address"] == access.address]
    assert all(len(flavors) == 1 and flavors[0]["flavor"] == "sys" for flavors in found), "a user belongs to one flavour"
    return [{right: flavors[0][right] for right in RIGHTS} for flavors in found]


def choose_access(choose, machines):
    return Access(choose.choice(list(SHARES)), choose.choice(machines), choose.random() < 0.6,
                  choose.choice(["3", "4.0", "4.2"]), choose.choice([None, None, 40000]), choose.choice(USERS))


def compare(access, must_be_in_force):
    """One case: what was seen, how many rows of the matrix told it, and a text if something else was told."""
    told, answer = explained(access, must_be_in_force)
    rows = listed(access)
    seen = observe(access)
    if told["mountable"] and answer["rule"] is None:
        seen["read"] = False  # the way to other exports: the list of their names, and nothing of the share
    is_same = told == seen and all(row == {right: seen[right] for right in RIGHTS} for row in rows)
    return seen, len(rows), None if is_same else f"{access}: told {told}, {rows}, seen {seen}\n{answer}"


@pytest.fixture
def names():
    """The box's host names, which the story may add to."""
    hosts = pathlib.Path("/etc/hosts")
    before = hosts.read_text(encoding="ascii")
    yield before
    hosts.write_text(before, encoding="ascii")


@pytest.mark.timeout(7200)
@pytest.mark.parametrize("cases", [60, pytest.param(2000, marks=pytest.mark.long)])
def test_an_explanation_is_what_the_kernel_does(box, client, other, third, names, cases, pytestconfig, record_property):
    box.foresees("rpc.mountd|exportfs|Request: |explain")
    seed, cases = pytestconfig.getoption("--seed"), pytestconfig.getoption("--cases") or cases
    choose, machines = random.Random(seed), [client, other, third]
    pathlib.Path("/etc/netgroup").write_text(NETGROUPS, encoding="ascii")
    for name, path in SHARES.items():
        pathlib.Path(path).mkdir(parents=True, exist_ok=True)
        box.share_at(name, pathlib.Path(path))
    differences, counts = [], collections.Counter()
    for _ in range(0, cases, CASES_OF_A_SET):
        # If rules name a host and one of its addresses, exportfs(8) may put only one of the two into its table. Then
        # the host's other addresses have other rights than the files give them.
        must_be_in_force = not write_names(choose, machines, names)
        lines = set_up(choose, machines)
        table = pathlib.Path("/var/lib/nfs/etab").read_text(encoding="ascii")
        accesses = [choose_access(choose, machines) for _ in range(CASES_OF_A_SET)]
        compared = [compare(access, must_be_in_force) for access in accesses]
        counts.update(right for seen, _, _ in compared for right in RIGHTS if seen[right])
        counts["rows"] += sum(rows for _, rows, _ in compared)
        counts["IPv6"] += sum(access.is_ipv6 and seen["mountable"] for access, (seen, _, _) in zip(accesses, compared))
        found = [text for _, _, text in compared if text]
        if found:
            differences += found + lines + [table, pathlib.Path("/etc/hosts").read_text(encoding="ascii")]
    record_property(f"{cases} cases of seed {seed}", dict(counts))
    print(f"{cases} cases of seed {seed}: {dict(counts)}")
    assert not differences, f"seed {seed}:\n" + "\n".join(differences)
    assert all(cases // 60 <= counts[what] for what in (*RIGHTS, "rows", "IPv6")), "the cases show nearly nothing"


@pytest.fixture
def name_server(names):
    """A name server with reverse names that do not lead back, for addresses that are not in /etc/hosts."""
    configuration = pathlib.Path("/etc/resolv.conf")
    before = configuration.read_text(encoding="ascii")
    kept = [line for line in names.splitlines(keepends=True) if not line.startswith("10.9.0.1")]
    pathlib.Path("/etc/hosts").write_text("".join(kept) + f"{BOX_ADDRESS} box.lab.test box\n", encoding="ascii")
    configuration.write_text("nameserver 127.0.0.1\n", encoding="ascii")
    with subprocess.Popen([sys.executable, "-c", NAME_SERVER], stdout=subprocess.PIPE, text=True) as server:
        assert server.stdout.readline() == "ready\n"
        yield
        server.kill()
    configuration.write_text(before, encoding="ascii")


@pytest.mark.usefixtures("name_server")
@pytest.mark.parametrize("rule", ["*.corp.test", "@corp", "@addresses", "10.9.0.1*"])
def test_a_name_that_does_not_lead_back_is_believed(box, client, other, rule):
    box.foresees("rpc.mountd|exportfs|Request: |explain")
    pathlib.Path("/etc/netgroup").write_text(
        "corp (alien.corp.test,,) (nowhere.corp.test,,)\naddresses (10.9.0.11,,) (10.9.0.12,,)\n", encoding="ascii")
    box.share("trusting")
    pathlib.Path("/etc/exports").write_text(f"/srv/trusting {rule}(rw,no_subtree_check)\n", encoding="ascii")
    reload_exports()
    for machine in (client, other):
        answer = api.call("NFS.Access", "explain", share="trusting", client=machine.address)
        assert answer["mountable"] == (rule != "10.9.0.1*"), answer
        assert machine.mounts("/srv/trusting") == answer["mountable"]
        [text] = [check["text"] for check in answer["checks"] if check["check"] == "name"]
        assert "does not lead back" in text
