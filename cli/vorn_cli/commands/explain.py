"""vorn explain."""

from ..command import Command, argument
from .exports import FLAVORS

_API = "VORN.Core.FileServ.NFS.Access/v1"


def explain(context, arguments):
    """Prints what a client may do in a shared folder, and why."""
    wanted = {"user": arguments.user, "groups": arguments.groups.split(",") if arguments.groups else None,
              "flavor": arguments.security, "version": arguments.nfs_version, "port": arguments.port}
    question = {name: value for name, value in wanted.items() if value is not None}
    answer = context.read(f"{_API}/explain", {"share": arguments.share, "client": arguments.client, **question}).data
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


COMMANDS = (
    Command("explain", "tell what a client may do in a shared folder, and why", explain, arguments=(
        argument("share", metavar="SHARE", help="name of the shared folder"),
        argument("client", metavar="CLIENT", help="an address, or a host name that the box can resolve"),
        argument("--user", metavar="USER", help="a user of the client: a name or a number, with Kerberos a principal"),
        argument("--groups", metavar="GROUPS", help="groups that the client sends, separated by commas, the user's first"),
        argument("--security", choices=tuple(FLAVORS), help="security flavour of the mount; default sys"),
        argument("--nfs-version", choices=("3", "4", "4.0", "4.1", "4.2"), help="version of NFS; default 4.2"),
        argument("--port", type=int, metavar="PORT", help="port of the client; default: a reserved one")),
            description="Names the export rule that decides and those that lose, the user as whom the box acts, and what "
                        "would have to change. Nothing is mounted.",
            examples=(("A client by its address", "vorn explain data 10.0.0.5"),
                      ("What alice may do there over NFSv3", "vorn explain data 10.0.0.5 --user alice --nfs-version 3"))),
)
