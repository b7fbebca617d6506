"""vorn share."""

from ..command import Command, argument

_API = "VORN.Core.Share/v1"


def share_names(context):
    """The names of all shared folders."""
    return [share["name"] for share in context.read(f"{_API}/list").data["shares"]]


def list_shares(context, arguments):
    """Prints the shared folders."""
    parameters = {"filter": arguments.filter} if arguments.filter else {}
    context.out.table(context.read(f"{_API}/list", parameters).data["shares"], {
        "NAME": lambda share: share["name"], "PATH": lambda share: share["path"],
        "RULES": lambda share: share["rules"]})


def add(context, arguments):
    """Makes a folder a shared folder."""
    context.change(f"{_API}/create", {"name": arguments.name, "path": arguments.path},
                   f"{arguments.path} is the shared folder {arguments.name}. Nobody may mount it yet: see \"vorn exports\".")


def remove(context, arguments):
    """Removes the entry of a shared folder, never its data."""
    context.change(f"{_API}/delete", {"name": arguments.name},
                   f"{arguments.name} is no shared folder any more. Its data is where it was.")


COMMANDS = (
    Command("share list", "list the shared folders", list_shares,
            arguments=(argument("--filter", metavar="TEXT", help="only folders whose name or path contains this text"),),
            examples=(("All folders", "vorn share list"),)),
    Command("share add", "share a folder", add, changes=True, arguments=(
        argument("name", metavar="NAME", help="name of the shared folder"),
        argument("path", metavar="PATH", help="absolute path of an existing folder")),
            examples=(("A new shared folder", "vorn share add media /volume1/media"),)),
    Command("share remove", "stop sharing a folder", remove, changes=True,
            arguments=(argument("name", metavar="NAME", help="name of the shared folder"),),
            description="The data stays. A folder that still has export rules is refused.",
            examples=(("No longer shared", "vorn share remove media"),)),
)
