"""vorn history, undo, audit."""

import time

from ..command import Command, argument
from ..failure import Exit, Failure
from ..output import time_of

_API = "VORN.Core.FileServ.NFS.History/v1"
_SHORT = 12  # digits of an id in a table
_PAGE = 1000  # the most that the API lists
_DAY = 24 * 60 * 60


def _filter(arguments):
    """The conditions of the command line, as the API has them."""
    wanted = {"file": arguments.file, "method": arguments.method, "caller": arguments.caller, "limit": arguments.limit}
    if arguments.days is not None:
        wanted["since"] = max(0, int(time.time()) - arguments.days * _DAY)
    return {name: value for name, value in wanted.items() if value is not None}


def _who(change):
    return change["caller"] or change["kind"]


def history(context, arguments):
    """Prints the changes, or one of them with its differences."""
    if arguments.id is not None:
        show(context, _whole_id(context, arguments.id))
        return
    context.out.table(context.read(f"{_API}/list", _filter(arguments)).data["changes"], {
        "ID": lambda change: change["id"][:_SHORT], "TIME": lambda change: time_of(change["time"]), "BY": _who,
        "KIND": lambda change: change["kind"], "FILES": lambda change: change["files"],
        "SERVICE": lambda change: change["actions"]})


def show(context, change_id):
    """Prints one change."""
    change = context.read(f"{_API}/show", {"id": change_id}).data
    context.out.record(change, {
        "Change": lambda change: change["id"], "Time": lambda change: time_of(change["time"]),
        "Kind": lambda change: change["kind"], "By": lambda change: change["caller"],
        "From": lambda change: change["origin"], "Method": lambda change: change["method"],
        "Parameters": lambda change: change["parameters"], "Takes back": lambda change: change["undoes"],
        "Service": lambda change: change["actions"]})
    if not context.out.as_json:
        for file in change["differences"]:
            context.out.difference(file["difference"])


def _whole_id(context, begin):
    """The id that begins with these digits, as the tables print them."""
    if len(begin) >= 40:
        return begin
    offset, total = 0, 1
    while offset < total:
        data = context.read(f"{_API}/list", {"offset": offset, "limit": _PAGE}).data
        found = [change["id"] for change in data["changes"] if change["id"].startswith(begin)]
        if len(found) > 1:
            raise Failure(f"Several changes begin with {begin}: give more digits.", Exit.USAGE)
        if found:
            return found[0]
        offset, total = offset + _PAGE, data["total"]
    return begin  # the box says that there is none


def undo(context, arguments):
    """Takes a change back."""
    context.change(f"{_API}/undo", {"id": _whole_id(context, arguments.id)}, f"The change {arguments.id} was taken back.")


def audit(context, arguments):
    """Prints who changed the box, from where, and with which call."""
    context.out.table(context.read(f"{_API}/list", _filter(arguments)).data["changes"], {
        "TIME": lambda change: time_of(change["time"]), "BY": _who, "FROM": lambda change: change["origin"],
        "ID": lambda change: change["id"][:_SHORT], "METHOD": lambda change: change["method"],
        "PARAMETERS": lambda change: change["parameters"]})


_FILTERS = (
    argument("--file", metavar="PATH", help="only changes of this file, for example /etc/exports"),
    argument("--method", metavar="TEXT", help="only changes by methods whose name contains this text"),
    argument("--caller", metavar="NAME", help="only changes by this account or token"),
    argument("--days", metavar="N", type=int, help="only changes of the last N days"),
    argument("--limit", metavar="N", type=int, help="at most N changes; default 50"),
)

COMMANDS = (
    Command("history", "show the changes of the box's files, or one of them", history, arguments=(
        argument("id", metavar="ID", nargs="?", help="the change to show with its differences; its first digits do"),
        *_FILTERS),
            description="The newest change is the first one. Edits by hand are among them.",
            examples=(("The newest changes", "vorn history"), ("Who changed the rules", "vorn history --file /etc/exports"),
                      ("One change", "vorn history 9fceb02d0ae5"))),
    Command("undo", "take a change back", undo, changes=True,
            arguments=(argument("id", metavar="ID", help="the change; its first digits do"),),
            description="Later changes of other lines stay. A conflict is shown, and nothing is changed then.",
            examples=(("See first what it would do", "vorn undo 9fceb02d0ae5 --rehearse"),
                      ("Take it back", "vorn undo 9fceb02d0ae5"))),
    Command("audit", "show who changed the box, and with which calls", audit, arguments=_FILTERS,
            description="Only calls that changed something are listed. The log of vornd also has those that failed.",
            examples=(("The changes of one account in a week", "vorn audit --caller alice --days 7"),)),
)
