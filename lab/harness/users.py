"""The users of the stories. All of them exist on the box."""

import dataclasses

from harness.programs import run


@dataclasses.dataclass(frozen=True)
class User:
    """A user with the numbers that a client's process sends to the server."""

    name: str
    uid: int
    gid: int
    groups: tuple = ()


ROOT = User("root", 0, 0)
ADMIN = User("admin", 1024, 1024)
NOBODY = User("nobody", 65534, 65534)
ALICE = User("alice", 2001, 2001)
BOB = User("bob", 2002, 2002)
CAROL = User("carol", 2003, 2003)


def create():
    """Adds the users to the box's files, once. The package has created an "admin" of its own."""
    run("userdel", ADMIN.name)
    with open("/etc/passwd", "a", encoding="ascii") as passwd, open("/etc/group", "a", encoding="ascii") as group:
        for user in (ADMIN, ALICE, BOB, CAROL):
            passwd.write(f"{user.name}:x:{user.uid}:{user.gid}::/tmp:/bin/sh\n")
            group.write(f"{user.name}:x:{user.gid}:\n")
