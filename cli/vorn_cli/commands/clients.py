"""vorn clients."""

from ..command import Command, argument
from ..failure import Exit, Failure
from ..output import time_of

_API = "VORN.Core.FileServ.NFS.Client/v1"
_PAGE = 1000  # the most that the API lists


def _pages(context, text, offset=0, limit=None):
    """The clients from the index `offset` on, at most `limit`, and the number of all that match."""
    clients, total = [], None
    while total is None or (offset + len(clients) < total and (limit is None or len(clients) < limit)):
        wanted = _PAGE if limit is None else min(_PAGE, limit - len(clients))
        data = context.read(f"{_API}/list", {"filter": text, "offset": offset + len(clients), "limit": wanted}).data
        clients, total = clients + data["clients"], data["total"]
        if not data["clients"]:
            break
    return clients, total


def list_clients(context, arguments):
    """Prints the clients."""
    if arguments.offset < 0 or (arguments.limit is not None and arguments.limit < 0):
        raise Failure("--offset and --limit are not negative.", Exit.USAGE)
    clients, total = _pages(context, arguments.filter or "", arguments.offset, arguments.limit)
    context.out.table(clients, {
        "ADDRESS": lambda client: client["address"], "VERSION": lambda client: client["version"],
        "STATE": lambda client: client["state"], "SINCE": _since, "FILES": lambda client: client["open_files"],
        "LOCKS": lambda client: client["locks"],
        "EXPORTS": lambda client: [used["path"] for used in client["exports"]],
        "REFUSED": lambda client: [refusal["path"] or "all" for refusal in client["refusals"]],
        "ID": lambda client: client["id"], "NAME": lambda client: client["name"]})
    if len(clients) < total:
        context.out.text(f"{len(clients)} of {total}")


def _since(client):
    return None if client["since"] is None else time_of(client["since"])


def disconnect(context, arguments):
    """Ends the state of the NFSv4 clients of an address, or of one client."""
    clients, _ = _pages(context, "")
    found = [client for client in clients
             if client["id"] is not None and arguments.client in (client["address"], str(client["id"]))]
    if not found:
        raise Failure(f"There is no client of NFSv4 with the address or number {arguments.client}.")
    if len(found) > 1:
        numbers = ", ".join(str(client["id"]) for client in found)
        raise Failure(f"{arguments.client} has several clients of NFSv4: name one of {numbers}.", Exit.USAGE)
    client, = found
    context.change(f"{_API}/disconnect", {"id": client["id"], "client_id": client["client_id"]},
                   f"The state of {client['address']} (\"{client['name']}\") has ended.")


COMMANDS = (
    Command("clients list", "list who uses the NFS service, and who was turned away", list_clients, arguments=(
        argument("--filter", metavar="TEXT", help="only clients with this text in their address, name, version or paths"),
        argument("--offset", metavar="N", type=int, default=0, help="number of clients to skip; default 0"),
        argument("--limit", metavar="N", type=int, help="number of clients; default all")),
            description="The server keeps rights by export rule: the exports are those of all clients of the same rule. "
                        "What the box cannot see is \"-\"; \"vorn explain\" tells what a client may do.",
            examples=(("Everybody", "vorn clients list"), ("Who uses a folder", "vorn clients list --filter /volume1/data"))),
    Command("clients disconnect", "end the open files and locks of a client of NFSv4", disconnect, changes=True,
            arguments=(argument("client", metavar="CLIENT", help="its address, or its ID as \"clients list\" prints it"),),
            description="A client that lives comes back and gets its files and locks again if nobody else has them. To keep "
                        "it out, change the export rules.",
            examples=(("Free the locks of a client that hangs", "vorn clients disconnect 10.0.0.5"),
                      ("See first what it would do", "vorn clients disconnect 10.0.0.5 --rehearse"))),
)
