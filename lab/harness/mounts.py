"""Observations of a mounted client: negotiated sizes, and who may enter a folder of a group."""

import os
import pathlib

from harness import users
from harness.programs import as_user, run

_TEAM = 3000


def negotiated(client, path, version):
    """The largest read and the largest write of a new mount."""
    with client.mounted(path, version=version) as target:
        for line in pathlib.Path("/proc/mounts").read_text(encoding="ascii").splitlines():
            words = line.split()
            if words[1] == str(target):
                options = dict(option.partition("=")[::2] for option in words[3].split(","))
                return int(options["rsize"]), int(options["wsize"])
    raise AssertionError(f"{target} is not mounted")


def may_enter(folder, user):
    """Whether the user can list the folder."""
    try:
        as_user(user, lambda: os.listdir(folder))
    except PermissionError:
        return False
    return True


def make_team_folder(share):
    """A folder below the share for the group "team". The box knows that alice is a member; her machine does not."""
    run("groupadd", "-f", "-g", str(_TEAM), "team")
    run("usermod", "-a", "-G", "team", "alice")
    (share / "team").mkdir(mode=0o770)
    os.chown(share / "team", 0, _TEAM)


def admits_by_box(mounted):
    """Returns true if the box's groups decide (alice may enter the folder), false if the client's groups decide (bob,
    a member on the client only, may enter it). Fails if neither is the case."""
    alice = may_enter(mounted / "team", users.ALICE)
    bob = may_enter(mounted / "team", users.User("bob", users.BOB.uid, users.BOB.gid, (_TEAM,)))
    assert alice != bob
    return alice
