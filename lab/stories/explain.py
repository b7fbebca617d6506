"""The explanation of an access, and the clients of a folder with their rights, are what the kernel's server does."""

import collections
import errno
import os
import pathlib
import random

import pytest

from harness import api, users
from harness.network import MountFailed
from harness.programs import ProgramFailed, as_user, run

CLIENTS = ["client.lab.test", "other.lab.test", "10.9.0.11", "10.9.0.12", "10.9.7.13", "10.9.0.0/24", "10.9.0.8/30",
           "10.9.0.0/255.255.0.0", "*.lab.test", "?lient.lab.test", "*.elsewhere.test", "10.9.0.1*", "@trusted", "@all",
           "*"]
NETGROUPS = "trusted (other.lab.test,,) (third,,)\nall (client.lab.test,,) (10.9.0.12,,) (third.elsewhere.test,,)\n"
USERS = [users.ROOT, users.ALICE, users.BOB, users.NOBODY]
SHARES = {"first": "/srv/first", "inner": "/srv/first/inner", "second": "/srv/second", "deep": "/srv/way/to/deep"}
RIGHTS = ("mountable", "read", "write")
CASES_OF_A_SET = 6


def options(choose):
    words = [choose.choice(["ro", "rw", "rw"]), choose.choice(["secure", "secure", "insecure"]), "no_subtree_check",
             choose.choice(["root_squash", "no_root_squash", "all_squash", "no_root_squash,all_squash"])]
    words += choose.choice([[], [], ["anonuid=2001"], ["anonuid=2002", "anongid=2003"]])
    words += choose.choice([[], [], [], ["crossmnt"], ["sec=sys"], ["sec=krb5:sys"], ["sec=krb5"]])
    return ",".join(words)


def set_up(choose):
    """Folders with owners and permissions, and rules for some of them."""
    lines = []
    for folder in ("/srv/way", "/srv/way/to"):
        os.chmod(folder, choose.choice([0o755, 0o755, 0o711, 0o700]))
    for path in SHARES.values():
        os.chmod(path, choose.choice([0o777, 0o777, 0o755, 0o750, 0o700]))
        os.chown(path, choose.choice([0, 2001, 65534]), choose.choice([0, 2002, 2003]))
        for _ in range(choose.choice([0, 1, 1, 2])):
            clients = choose.sample(CLIENTS, choose.randint(1, 4))
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


def observe(machine, path, version, port, user):
    """What the kernel's server lets the user do."""
    try:
        target = machine.mount(path, version=version, options="sec=sys,noresvport" if port else "sec=sys")
    except MountFailed:
        return {"mountable": False, "read": False, "write": False}
    try:
        probe = pathlib.Path(path) / "probe"
        seen = {"mountable": True, "read": attempt(user, lambda: os.listdir(target)),
                "write": attempt(user, (target / "probe").touch)}
        if seen["write"]:
            status = os.stat(probe)
            seen["identity"] = status.st_uid, status.st_gid
            probe.unlink()
        return seen
    finally:
        machine.unmount(target)


def explained(share, machine, version, port, user):
    """The same as observe() from the explanation, and the explanation."""
    answer = api.call("NFS.Access", "explain", share=share, client=machine.address, version=version, port=port,
                      user=str(user.uid), groups=[str(user.gid)])
    assert all(check["check"] != "reload" for check in answer["checks"]), "the rules are in force"
    told = {right: answer[right] for right in RIGHTS}
    if answer["write"]:
        told["identity"] = answer["identity"]["uid"], answer["identity"]["gid"]
    return told, answer


def listed(share, machine, version, port, user):
    """The rights of the machine in each row of the folder's clients that was explained for its address."""
    clients = api.call("NFS.Access", "matrix", share=share, version=version, port=port, user=str(user.uid),
                       groups=[str(user.gid)])["clients"]
    found = [row["flavors"] for row in clients if row["address"] == machine.address]
    assert all(len(flavors) == 1 and flavors[0]["flavor"] == "sys" for flavors in found), "a user belongs to one flavour"
    return [{right: flavors[0][right] for right in RIGHTS} for flavors in found]


def compare(choose, machines):
    """One case: what was seen, how many rows of the matrix told it, and a text if something else was told."""
    share, machine, user = choose.choice(list(SHARES)), choose.choice(machines), choose.choice(USERS)
    version, port = choose.choice(["3", "4.0", "4.2"]), choose.choice([None, None, 40000])
    told, answer = explained(share, machine, version, port, user)
    rows = listed(share, machine, version, port, user)
    seen = observe(machine, SHARES[share], version, port, user)
    if told["mountable"] and answer["rule"] is None:
        seen["read"] = False  # the way to other exports: the list of their names, and nothing of the share
    case = f"{share} {machine.name} {user.name} version {version} port {port}: told {told}, {rows}, seen {seen}"
    is_same = told == seen and all(row == {right: seen[right] for right in RIGHTS} for row in rows)
    return seen, len(rows), None if is_same else f"{case}\n{answer}"


@pytest.mark.timeout(7200)
@pytest.mark.parametrize("cases", [60, pytest.param(2000, marks=pytest.mark.long)])
def test_an_explanation_is_what_the_kernel_does(box, client, other, third, cases, pytestconfig, record_property):
    box.foresees("rpc.mountd|exportfs|Request: |explain")
    seed, cases = pytestconfig.getoption("--seed"), pytestconfig.getoption("--cases") or cases
    choose = random.Random(seed)
    pathlib.Path("/etc/netgroup").write_text(NETGROUPS, encoding="ascii")
    for name, path in SHARES.items():
        pathlib.Path(path).mkdir(parents=True, exist_ok=True)
        box.share_at(name, pathlib.Path(path))
    differences, counts = [], collections.Counter()
    for _ in range(0, cases, CASES_OF_A_SET):
        lines = set_up(choose)
        table = pathlib.Path("/var/lib/nfs/etab").read_text(encoding="ascii")
        compared = [compare(choose, [client, other, third]) for _ in range(CASES_OF_A_SET)]
        counts.update(right for seen, _, _ in compared for right in RIGHTS if seen[right])
        counts["rows"] += sum(rows for _, rows, _ in compared)
        found = [text for _, _, text in compared if text]
        if found:
            differences += found + lines + [table]
    record_property(f"{cases} cases of seed {seed}", dict(counts))
    print(f"{cases} cases of seed {seed}: {dict(counts)}")
    assert not differences, f"seed {seed}:\n" + "\n".join(differences)
    assert all(cases // 60 <= counts[what] for what in (*RIGHTS, "rows")), "the cases show nearly nothing"
