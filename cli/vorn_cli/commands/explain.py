"""vorn explain, vorn matrix."""

from ..command import Command, argument
from ..failure import Exit, Failure
from .exports import FLAVORS

_API = "VORN.Core.FileServ.NFS.Access/v1"


def _question(arguments):
    wanted = {"share": arguments.share, "client": arguments.client, "user": arguments.user,
              "groups": arguments.groups.split(",") if arguments.groups else None,
              "flavor": arguments.security, "version": arguments.nfs_version, "port": arguments.port}
    return {name: value for name, value in wanted.items() if value is not None}


def explain(context, arguments):
    """Prints what a client may do in a shared folder, and why."""
    answer = context.read(f"{_API}/explain", _question(arguments)).data
    if context.out.as_json:
        context.out.data(answer)
        return
    context.out.record(answer, {
        "Folder": lambda data: data["path"], "Client": lambda data: data["addresses"],
        "May mount": lambda data: data["mountable"], "May read": lambda data: data["read"],
        "May write": lambda data: data["write"]})
    context.out.text("")
    for sentence in _sentences(answer):
        context.out.text(sentence)


def _sentences(answer):
    """The reasons, those that keep the client out first."""
    for check in answer["checks"]:
        if check["result"] == "failed":
            yield f"- {check['text']} {check['remedy']}"
    for check in answer["checks"]:
        if check["result"] == "unknown":
            yield f"- {check['text']} (not known)"
    if answer["rule"] and answer["mountable"]:
        yield f"- {answer['rule']['text']}"
    for rule in answer["others"]:
        yield f"- {rule['text']}"
    if answer["identity"]:
        identity = answer["identity"]
        place = f" ({identity['file']}, line {identity['line']})" if identity["file"] else ""
        groups = f", other groups {', '.join(map(str, identity['groups']))}" if identity["groups"] else ""
        yield f"- {identity['text']}{place} User {identity['uid']}, group {identity['gid']}{groups}."


def matrix(context, arguments):
    """Prints the rights of a client in all shared folders, or those of all clients in one."""
    question = _question(arguments)
    if ("share" in question) == ("client" in question):
        raise Failure("Give either --client or --share.", Exit.USAGE)
    if "client" in question:
        context.out.table(context.read(f"{_API}/matrix", question).data["access"], {
            "SHARE": lambda row: row["share"], "RIGHTS": _rights, "RULE": lambda row: row["rule"]})
        return
    clients = _clients(context, question)
    context.out.table(clients, {
        "CLIENT": lambda row: row["client"], "STATE": lambda row: row["state"], "ADDRESS": lambda row: row["address"],
        "VERSION": lambda row: row["version"],
        "RIGHTS": lambda row: [f"{flavor['flavor']} {_rights(flavor)}" for flavor in row["flavors"]],
        "RULE": lambda row: row["rule"] and row["rule"]["client"]})
    for client in clients:
        if client["text"]:
            context.out.text(f"- {client['client']}: {client['text']}")


def _clients(context, question):
    """All pages of the clients of a shared folder."""
    clients, total = [], None
    while total is None or len(clients) < total:
        data = context.read(f"{_API}/matrix", {**question, "offset": len(clients)}).data
        clients, total = clients + data["clients"], data["total"]
        if not data["clients"]:
            break
    return clients


def _rights(row):
    if not row["mountable"]:
        return "none"
    if row["write"]:
        return "read and write" if row["read"] else "write"
    return "read" if row["read"] else "mount"


_MOUNT = (
    argument("--user", metavar="USER", help="a user of the client: a name or a number, with Kerberos a principal"),
    argument("--groups", metavar="GROUPS", help="groups that the client sends, separated by commas, the user's first"),
    argument("--security", choices=tuple(FLAVORS), help="security flavour of the mount; default sys"),
    argument("--nfs-version", choices=("3", "4", "4.0", "4.1", "4.2"), help="version of NFS; default 4.2"),
    argument("--port", type=int, metavar="PORT", help="port of the client; default: a reserved one"))

COMMANDS = (
    Command("explain", "tell what a client may do in a shared folder, and why", explain, arguments=(
        argument("share", metavar="SHARE", help="name of the shared folder"),
        argument("client", metavar="CLIENT", help="an address, or a host name that the box can resolve"), *_MOUNT),
            description="Names the export rule that decides and those that lose, the user as whom the box acts, and what "
                        "would have to change. Nothing is mounted.",
            examples=(("A client by its address", "vorn explain data 10.0.0.5"),
                      ("What alice may do there over NFSv3", "vorn explain data 10.0.0.5 --user alice --nfs-version 3"))),
    Command("matrix", "list the rights of a client in all shared folders, or of all clients in one", matrix, arguments=(
        argument("--client", metavar="CLIENT", help="an address, or a host name that the box can resolve"),
        argument("--share", metavar="SHARE", help="name of a shared folder"), *_MOUNT),
            description="With --share lists the clients of the export rules, then those that are connected or have mounted "
                        "something. Without --security all flavours are listed, and without --nfs-version the version "
                        "that a client uses counts. One address stands for a network, a pattern or a netgroup. \"vorn "
                        "explain\" tells the reasons.",
            examples=(("What a client may do", "vorn matrix --client 10.0.0.5"),
                      ("Who may do what in a folder", "vorn matrix --share data --security sys"))),
)
