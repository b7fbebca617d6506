"""vorn idmap."""

import csv
import io

from ..command import Command, argument
from ..failure import Exit, Failure
from ..files import read_text
from ..output import count

_API = "VORN.Core.FileServ.NFS.IDMap/v1"
_COLUMNS = {"PRINCIPAL": lambda row: row["kerberos_principal"], "LOCAL USER": lambda row: row["local_name"]}
_HEADING = ["kerberos_principal", "local_name"]
_PAGE = (
    argument("--filter", metavar="TEXT", help="only entries that contain this text"),
    argument("--offset", metavar="N", type=int, default=0, help="index of the first entry; default 0"),
    argument("--limit", metavar="N", type=int, default=-1, help="number of entries; default all"),
)


def mappings(context):
    """All mappings, with their revision."""
    return context.read(f"{_API}/list")


def _list(context, arguments, suggestion):
    parameters = {"suggestion": suggestion, "offset": arguments.offset, "limit": arguments.limit}
    if arguments.filter:
        parameters["filter"] = arguments.filter
    data = context.read(f"{_API}/list", parameters).data
    context.out.table(data["idmap"], _COLUMNS)
    if len(data["idmap"]) < data["total"]:
        context.out.text(f"{len(data['idmap'])} of {data['total']}")


def list_mappings(context, arguments):
    """Prints the mappings."""
    _list(context, arguments, False)


def suggest(context, arguments):
    """Prints a suggestion for each local user."""
    _list(context, arguments, True)


def add(context, arguments):
    """Adds a mapping."""
    _create(context, [{"kerberos_principal": arguments.principal, "local_name": arguments.user}])


def _create(context, rows):
    context.change(f"{_API}/create", {"idmap": rows}, f"{count(len(rows), 'mapping')} added.")


def change(context, arguments):
    """Changes the principal or the user of a mapping."""
    present = mappings(context)
    found = [row for row in present.data["idmap"] if row["id"] == arguments.principal]
    if not found:
        raise Failure(f"There is no mapping of {arguments.principal}.")
    if arguments.user is None and arguments.new_principal is None:
        raise Failure("Nothing is to be changed: give --user or --new-principal.", Exit.USAGE)
    parameters = {"id": arguments.principal, "kerberos_principal": arguments.new_principal or arguments.principal,
                  "local_name": arguments.user or found[0]["local_name"]}
    context.change(f"{_API}/set", parameters, "The mapping was changed.", revision=present.revision)


def remove(context, arguments):
    """Removes mappings."""
    present = mappings(context)
    known = {row["id"] for row in present.data["idmap"]}
    unknown = [principal for principal in arguments.principal if principal not in known]
    if unknown:
        raise Failure(f"There is no mapping of {', '.join(unknown)}.")
    context.change(f"{_API}/delete", {"id": arguments.principal}, f"{count(len(arguments.principal), 'mapping')} removed.",
                   revision=present.revision)


def import_csv(context, arguments):
    """Adds all mappings of a file that the box does not have, or none."""
    present = {(row["kerberos_principal"], row["local_name"]) for row in mappings(context).data["idmap"]}
    rows = read_csv(arguments.file)
    new = [row for row in rows if (row["kerberos_principal"], row["local_name"]) not in present]
    if rows and not new:
        context.out.text("The box has all mappings of the file already.")
        context.out.data({"id": []})
        return
    if len(new) < len(rows):
        context.out.text(f"The box has {count(len(rows) - len(new), 'mapping')} of the file already.")
    _create(context, new)


def read_csv(path):
    """The mappings of a CSV file (RFC 4180): two columns, with a heading or without."""
    try:
        rows = [row for row in csv.reader(io.StringIO(read_text(path), newline="")) if row]
    except csv.Error as error:
        raise Failure(f"{path} is no CSV: {error}", Exit.USAGE) from error
    if rows and rows[0] == _HEADING:
        del rows[0]
    for number, row in enumerate(rows, 1):
        if len(row) != 2:
            raise Failure(f"{path}, mapping {number}: there are {len(row)} columns instead of 2.", Exit.USAGE)
    return [dict(zip(_HEADING, row, strict=True)) for row in rows]


def export_csv(context, _arguments):
    """Prints all mappings as CSV."""
    text = io.StringIO()
    writer = csv.writer(text)
    writer.writerow(_HEADING)
    writer.writerows([row[name] for name in _HEADING] for row in mappings(context).data["idmap"])
    context.out.raw(text.getvalue())


_PRINCIPAL = argument("principal", metavar="PRINCIPAL", help="Kerberos principal, for example alice@STORAGE.EXAMPLE")
_FILE = argument("file", metavar="FILE", help="CSV with the columns kerberos_principal and local_name; - is standard input")

COMMANDS = (
    Command("idmap list", "list the mappings", list_mappings, arguments=_PAGE,
            examples=(("The mappings of one realm", "vorn idmap list --filter @STORAGE.EXAMPLE"),)),
    Command("idmap add", "map a principal to a local user", add, changes=True, arguments=(
        _PRINCIPAL, argument("user", metavar="USER", help="local user, or root")),
            examples=(("One user", "vorn idmap add alice@STORAGE.EXAMPLE alice"),)),
    Command("idmap change", "change a mapping", change, changes=True, arguments=(
        _PRINCIPAL, argument("--user", metavar="USER", help="the new local user"),
        argument("--new-principal", metavar="PRINCIPAL", help="the new principal")),
            examples=(("Another user", "vorn idmap change alice@STORAGE.EXAMPLE --user bob"),)),
    Command("idmap remove", "remove mappings", remove, changes=True, arguments=(
        argument("principal", metavar="PRINCIPAL", nargs="+", help="as \"idmap list\" prints it"),),
            examples=(("Two mappings", "vorn idmap remove alice@STORAGE.EXAMPLE bob@STORAGE.EXAMPLE"),)),
    Command("idmap suggest", "suggest a mapping for each local user", suggest, arguments=_PAGE,
            examples=(("Suggestions to edit and import", "vorn idmap suggest"),)),
    Command("idmap import", "add the mappings of a CSV file", import_csv, changes=True, arguments=(_FILE,),
            description="All mappings of the file are added, or none. Those that the box has already are left out.",
            examples=(("Many mappings", "vorn idmap import people.csv"),)),
    Command("idmap export", "print all mappings as CSV", export_csv,
            examples=(("A copy", "vorn idmap export > people.csv"),)),
)
