"""vorn exports."""

import yaml

from ..command import Command, argument
from ..failure import Exit, Failure
from ..files import read_text
from .shares import share_names

_API = "VORN.Core.FileServ.NFS.SharePrivilege/v1"
FLAVORS = {"sys": "sys", "krb5": "kerberos", "krb5i": "kerberos_integrity", "krb5p": "kerberos_privacy"}
SQUASH = ("root", "admin", "guest", "all_admin")


def load(context, share):
    """The rules of a share, with their revision."""
    return context.read(f"{_API}/load", {"share_name": share})


def save(context, share, rules, done, revision):
    """Replaces the rules of a share if they are still those of the revision."""
    for rule in rules:
        _check_complete(share, rule)
    return context.change(f"{_API}/save", {"share_name": share, "rule": rules}, done, revision=revision)


def complete(rule):
    """A rule that a person wrote, with the defaults for what it leaves out."""
    return {"privilege": "ro", "root_squash": "guest", "async": False, "insecure": False, "crossmnt": False,
            "security_flavor": {"sys": True}, **rule}


def _check_complete(share, rule):
    """The box leaves out what it has no word for. Saving such a rule with a default could give or take access."""
    missing = [name for name in ("privilege", "root_squash", "async") if name not in rule]
    if missing:
        raise Failure(f"The rule of {rule['client']} for {share} was made by hand and has an option without a name "
                      f"({', '.join(missing)}). Replace it by \"vorn exports add {share} {rule['client']} ...\" first.")


def flavors_of(rule):
    """The security flavours of a rule in the words of exports(5)."""
    accepted = rule.get("security_flavor")
    return ["sys"] if accepted is None else [word for word, name in FLAVORS.items() if accepted.get(name)]


def are_same(rules, others):
    """Whether two lists of rules give the same access. A flavour that is left out is not accepted."""
    return [{**rule, "security_flavor": flavors_of(rule)} for rule in rules] == [
        {**rule, "security_flavor": flavors_of(rule)} for rule in others]


def security(words):
    """Parses "sys,krb5"."""
    chosen = words.split(",")
    unknown = [word for word in chosen if word not in FLAVORS]
    if unknown:
        raise Failure(f"\"{unknown[0]}\" is no security flavour; there are: {', '.join(FLAVORS)}", Exit.USAGE)
    return {name: word in chosen for word, name in FLAVORS.items()}


def list_exports(context, _arguments):
    """Prints each share with its number of rules and its clients."""
    rows = [{"share": name, "rules": load(context, name).data["rule"]} for name in share_names(context)]
    context.out.table(rows, {"SHARE": lambda row: row["share"], "RULES": lambda row: len(row["rules"]) or "0",
                             "CLIENTS": lambda row: [rule["client"] for rule in row["rules"]]})


def show(context, arguments):
    """Prints the rules of a share."""
    context.out.table(load(context, arguments.share).data["rule"], {
        "CLIENT": lambda rule: rule["client"], "ACCESS": lambda rule: rule.get("privilege"),
        "SQUASH": lambda rule: rule.get("root_squash"), "SECURITY": flavors_of,
        "ASYNC": lambda rule: rule.get("async", False), "INSECURE": lambda rule: rule["insecure"],
        "CROSSMNT": lambda rule: rule["crossmnt"]})


def replace(context, arguments):
    """Replaces all rules of a share by those of a file."""
    present = load(context, arguments.share)
    rules = read_rules(arguments.file)
    save(context, arguments.share, rules, f"{arguments.share} has {len(rules)} rules now.", present.revision)


def read_rules(path):
    """The rules of a YAML or JSON file ("-": standard input), as a list or as the answer of "exports show --json"."""
    try:
        rules = yaml.safe_load(read_text(path))
    except yaml.YAMLError as error:
        raise Failure(f"{path} is no YAML: {error}", Exit.USAGE) from error
    if not isinstance(rules, list) or not all(isinstance(rule, dict) and "client" in rule for rule in rules):
        raise Failure(f"{path} is no list of rules, each with a \"client\".", Exit.USAGE)
    return [complete(rule) for rule in rules]


def add(context, arguments):
    """Adds a rule, or replaces the rule of the same client."""
    present = load(context, arguments.share)
    rule = {"client": arguments.client, "privilege": arguments.access, "root_squash": arguments.squash,
            "async": arguments.is_async, "insecure": arguments.insecure, "crossmnt": arguments.crossmnt,
            "security_flavor": security(arguments.security)}
    rules = present.data["rule"]
    same = [at for at, other in enumerate(rules) if other["client"] == arguments.client]
    if same:
        rules[same[0]] = rule
    else:
        rules.append(rule)
    save(context, arguments.share, rules, f"{arguments.client} has access to {arguments.share}.", present.revision)


def remove(context, arguments):
    """Removes the rules of some clients, or all rules."""
    if arguments.all == bool(arguments.client):
        raise Failure("Name the clients, or give --all.", Exit.USAGE)
    present = load(context, arguments.share)
    clients = {rule["client"] for rule in present.data["rule"]}
    unknown = [client for client in arguments.client if client not in clients]
    if unknown:
        raise Failure(f"{arguments.share} has no rule for {', '.join(unknown)}; it has rules for: "
                      f"{', '.join(sorted(clients)) or 'nobody'}")
    left = [] if arguments.all else [rule for rule in present.data["rule"] if rule["client"] not in arguments.client]
    removed = len(present.data["rule"]) - len(left)
    save(context, arguments.share, left, f"{removed} rules were removed, {len(left)} are left.", present.revision)


_SHARE = argument("share", metavar="SHARE", help="name of the shared folder")

COMMANDS = (
    Command("exports list", "list the shared folders and who may mount them", list_exports,
            examples=(("Who may mount what", "vorn exports list"),)),
    Command("exports show", "show the rules of a shared folder", show, arguments=(_SHARE,),
            examples=(("The rules of a folder", "vorn exports show data"),)),
    Command("exports set", "replace all rules of a shared folder", replace, changes=True, arguments=(
        _SHARE, argument("--file", "-f", metavar="FILE", required=True,
                         help="rules in YAML or JSON, as \"exports show --json\" prints them; - is standard input")),
            examples=(("Copy the rules of a folder to another one",
                       "vorn --json exports show data | vorn exports set media --file -"),)),
    Command("exports add", "give a client access to a shared folder", add, changes=True, arguments=(
        _SHARE, argument("client", metavar="CLIENT", help="host name, address, network, wildcard or @netgroup"),
        argument("--access", choices=("ro", "rw"), default="ro", help="read only (default), or read and write"),
        argument("--squash", choices=SQUASH, default="guest",
                 help="whom root of the client becomes: root stays root, admin, guest (default); "
                      "all_admin: everybody becomes admin"),
        argument("--security", metavar="FLAVOURS", default="sys",
                 help="comma-separated list of sys (default), krb5, krb5i, krb5p"),
        argument("--async", dest="is_async", action="store_true",
                 help="the server may answer a write before the data is on disk"),
        argument("--insecure", action="store_true", help="accept requests from ports above 1023"),
        argument("--crossmnt", action="store_true", help="clients may enter file systems mounted below the folder")),
            description="A rule that the client has already is replaced.",
            examples=(("A network may read and write", "vorn exports add data 10.0.0.0/24 --access rw --squash admin"),
                      ("See what it would change for whom", "vorn exports add data 10.0.0.7 --access ro --rehearse"))),
    Command("exports remove", "take access to a shared folder away", remove, changes=True, arguments=(
        _SHARE, argument("client", metavar="CLIENT", nargs="*", help="as \"exports show\" prints it"),
        argument("--all", action="store_true", help="remove all rules")),
            examples=(("One client", "vorn exports remove data 10.0.0.7"),
                      ("All clients", "vorn exports remove data --all"))),
)
