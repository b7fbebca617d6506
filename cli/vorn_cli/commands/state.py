"""vorn dump, vorn apply: the whole state of the box as one file."""

import dataclasses
import json
import sys

import yaml

from ..command import Command, argument, show_rehearsal
from ..failure import Exit, Failure
from ..files import read_text
from ..output import Output, count
from . import exports, idmap

_NFS = "VORN.Core.FileServ.NFS/v1"
_ADVANCED = "VORN.Core.FileServ.NFS.AdvancedSetting/v1"
_PRIVILEGE = "VORN.Core.FileServ.NFS.SharePrivilege/v1"
_SHARE = "VORN.Core.Share/v1"
_IDMAP = "VORN.Core.FileServ.NFS.IDMap/v1"
_PORTS = ("custom_port_enable", "statd_port", "nlm_port")
_SECTIONS = ("nfs", "ports", "shares", "idmap")


@dataclasses.dataclass
class State:
    """What the box has, or shall have. In a file a section may be absent: it is then left alone."""

    nfs: dict | None = None
    ports: dict | None = None
    shares: dict | None = None  # path and rules by name
    idmap: dict | None = None  # local users by principal


@dataclasses.dataclass
class Revisions:
    """The revisions of what was read, by section; those of the rules by share."""

    nfs: str | None = None
    ports: str | None = None
    idmap: str | None = None
    rules: dict = dataclasses.field(default_factory=dict)


@dataclasses.dataclass
class Step:
    """One call on the way from the present state to the wanted one."""

    text: str
    method: str
    parameters: dict
    revision: str | None = None


def read_state(context):
    """The present state, and its revisions."""
    nfs = context.read(f"{_NFS}/get")
    advanced = context.read(f"{_ADVANCED}/get")
    mappings = idmap.mappings(context)
    ports = {name: advanced.data[name] for name in _PORTS}
    ports["custom_port_enable"] = bool(ports["custom_port_enable"])
    state = State(nfs.data, ports, {}, {row["id"]: row["local_name"] for row in mappings.data["idmap"]})
    revisions = Revisions(nfs.revision, advanced.revision, mappings.revision)
    for share in context.read(f"{_SHARE}/list").data["shares"]:
        rules = exports.load(context, share["name"])
        state.shares[share["name"]] = {"path": share["path"], "rules": rules.data["rule"]}
        revisions.rules[share["name"]] = rules.revision
    return state, revisions


def dump(context, _arguments):
    """Prints the present state as YAML."""
    state = dataclasses.asdict(read_state(context)[0])
    if context.out.as_json:
        context.out.data(state)
    else:
        context.out.raw(yaml.safe_dump(state, sort_keys=False, allow_unicode=True))


def parse_state(text, name):
    """The wanted state of a YAML file."""
    try:
        sections = yaml.safe_load(text)
    except yaml.YAMLError as error:
        raise Failure(f"{name} is no YAML: {error}", Exit.USAGE) from error
    _require(isinstance(sections, dict), name, f"the file is a map with the sections {', '.join(_SECTIONS)}")
    unknown = sorted(str(section) for section in sections.keys() - set(_SECTIONS))
    _require(not unknown, name, f"there is no section \"{unknown[0] if unknown else ''}\"; there are: {', '.join(_SECTIONS)}")
    for section, content in sections.items():
        _require(content is None or isinstance(content, dict), name, f"the section {section} is a map")
    for share, folder in (sections.get("shares") or {}).items():
        is_whole = isinstance(folder, dict) and set(folder) <= {"path", "rules"} and isinstance(folder.get("path"), str)
        _require(is_whole, name, f"the share {share} has a path and rules")
        rules = folder.setdefault("rules", [])
        are_rules = isinstance(rules, list) and all(isinstance(rule, dict) and "client" in rule for rule in rules)
        _require(are_rules, name, f"the rules of {share} are a list, and each has a client")
        folder["rules"] = [exports.complete(rule) for rule in rules]
    return State(**sections)


def _require(met, name, text):
    if not met:
        raise Failure(f"{name}: {text}.", Exit.USAGE)


def plan(present, wanted, revisions):
    """The steps from one state to the other, in an order that the box accepts."""
    return [*_share_steps(present, wanted, revisions), *_idmap_steps(present, wanted, revisions),
            *_setting_steps(present, wanted, revisions)]


def _share_steps(present, wanted, revisions):
    if wanted.shares is None:
        return
    for name, share in present.shares.items():
        moved = name in wanted.shares and wanted.shares[name]["path"] != share["path"]
        if name in wanted.shares and not moved:
            continue
        if share["rules"]:
            yield Step(f"take away all access to {name}", f"{_PRIVILEGE}/save", {"share_name": name, "rule": []},
                       revisions.rules[name])
        yield Step(f"stop sharing {name} ({share['path']})", f"{_SHARE}/delete", {"name": name})
    for name, share in wanted.shares.items():
        before = present.shares.get(name)
        is_new = before is None or before["path"] != share["path"]
        if is_new:
            yield Step(f"share {share['path']} as {name}", f"{_SHARE}/create", {"name": name, "path": share["path"]})
        if not exports.are_same(share["rules"], [] if is_new else before["rules"]):
            yield Step(f"set the {len(share['rules'])} rules of {name}", f"{_PRIVILEGE}/save",
                       {"share_name": name, "rule": share["rules"]}, None if is_new else revisions.rules[name])


def _idmap_steps(present, wanted, revisions):
    if wanted.idmap is None:
        return
    # A changed mapping is removed and added, so that two calls are enough for any number of them.
    removed = [name for name, user in present.idmap.items() if wanted.idmap.get(name) != user]
    added = [{"kerberos_principal": name, "local_name": user} for name, user in wanted.idmap.items()
             if present.idmap.get(name) != user]
    if removed:
        yield Step(f"remove {len(removed)} ID mappings: {_some(removed)}", f"{_IDMAP}/delete", {"id": removed},
                   revisions.idmap)
    if added:
        names = [row["kerberos_principal"] for row in added]
        yield Step(f"add {len(added)} ID mappings: {_some(names)}", f"{_IDMAP}/create", {"idmap": added},
                   None if removed else revisions.idmap)


def _setting_steps(present, wanted, revisions):
    nfs = {**present.nfs, **(wanted.nfs or {})}
    ports = {**present.ports, **(wanted.ports or {})}
    if ports != present.ports:
        common = {name: present.nfs[name] for name in ("read_size", "write_size", "unix_pri_enable", "enable_nfs")}
        yield Step(_changes(present.ports, ports), f"{_ADVANCED}/set", {**common, **ports}, revisions.ports)
    if nfs != present.nfs:
        yield Step(_changes(present.nfs, nfs), f"{_NFS}/set", nfs, revisions.nfs)


def _changes(before, after):
    """The changed settings, with their values as the file has them."""
    return ", ".join(f"{name}: {json.dumps(before.get(name))} -> {json.dumps(value)}"
                     for name, value in after.items() if before.get(name) != value)


def _some(names):
    return ", ".join(names[:5]) + (", ..." if len(names) > 5 else "")


def apply(context, arguments):
    """Makes the box what the file says."""
    wanted = parse_state(read_text(arguments.file), arguments.file)
    present, revisions = read_state(context)
    steps = plan(present, wanted, revisions)
    if context.out.as_json:
        context.out.data([{"step": step.text, "method": step.method} for step in steps])
    if not steps:
        context.out.text("The box is in the wanted state.")
        return
    for number, step in enumerate(steps, 1):
        context.out.text(f"{number}. {step.text}")
    if arguments.check or context.rehearse:
        _rehearse(context, steps)
        if arguments.check:
            raise Failure(f"The box differs from {arguments.file}: {count(len(steps), 'step')}.", Exit.DIFFERS)
        context.out.text("Nothing was changed.")
        return
    if not arguments.yes and not _agrees(context, steps):
        raise Failure("Nothing was changed.", Exit.FAILED)
    for number, step in enumerate(steps, 1):
        _carry_out(context, step, number, len(steps))


def _carry_out(context, step, number, total):
    try:
        with context.out.progress(step.text):
            context.report(context.api.call(step.method, step.parameters, revision=step.revision))
    except Failure as failure:
        failure.details += (f"This was step {number} of {total}: {step.text}. The steps before it are in force.",)
        raise
    context.out.text(f"done: {step.text}")


def _rehearse(context, steps):
    """Shows what the box says of each step, as if it were the first one."""
    out = Output(stdout=sys.stderr) if context.out.as_json else context.out
    for number, step in enumerate(steps, 1):
        try:
            with context.out.progress(f"rehearsing step {number}"):
                answer = context.api.call(step.method, step.parameters, revision=step.revision, rehearse=True)
        except Failure as failure:
            # A step that needs an earlier one, for example the rules of a new shared folder, fails without it.
            out.text(f"Step {number} fails as things are now: {failure}")
            continue
        show_rehearsal(out, answer, f"Step {number} would do this:")


def _agrees(context, steps):
    """Shows the rehearsal to the person at the terminal, and asks."""
    if not sys.stdin.isatty():
        raise Failure("There is nobody to ask: give --yes or --check.", Exit.USAGE)
    _rehearse(context, steps)
    return input("Carry this out? [y/N] ").strip().lower() in ("y", "yes")


COMMANDS = (
    Command("dump", "print the whole state of the box as YAML", dump,
            description="Settings, shared folders with their rules, and ID mappings. Keys and tokens are not included.",
            examples=(("A copy", "vorn dump > box.yaml"),)),
    Command("apply", "make the box what a file says", apply, changes=True, arguments=(
        argument("file", metavar="FILE", help="YAML, as \"vorn dump\" prints it; - is standard input"),
        argument("--check", action="store_true", help="change nothing; the exit status is 2 if the box differs"),
        argument("--yes", action="store_true", help="do not ask")),
            description="Shows the steps and what they would do, asks, and carries them out. A section that the file does not have is left "
                        "alone; a shared folder or a mapping that a section does not have is removed. If somebody else "
                        "changes the box in between, the command ends with status 5.",
            examples=(("Restore a copy", "vorn apply box.yaml"), ("In a script", "vorn apply --check box.yaml"))),
)
