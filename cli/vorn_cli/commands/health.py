"""vorn health."""

import json
import shlex

from ..command import Command, argument
from ..failure import Exit, Failure

_METHOD = "VORN.Core.FileServ.NFS.Health/v1/check"
_SEVERITIES = ("error", "warning", "notice")
_STATUS = {"error": Exit.HEALTH_ERRORS, "warning": Exit.HEALTH_WARNINGS}


def health(context, arguments):
    """Prints what is wrong, and ends with a status for the worst finding."""
    wanted = {"severity": arguments.severity, "kind": arguments.kind, "share": arguments.share, "limit": arguments.limit}
    answer = context.read(_METHOD, {name: value for name, value in wanted.items() if value is not None}).data
    context.out.data(answer)
    for finding in answer["findings"]:
        _show(context.out, finding)
    for gap in answer["not_checked"]:
        context.out.text(f"not checked: {gap['kind']}: {gap['reason']}")
    _end(context.out, answer["counts"])


def _show(out, finding):
    subject = finding["subject"]
    place = f"{subject['file']}:{subject['line']}" if subject["line"] else subject["file"]
    about = [subject["share"], subject["client"], subject["setting"], subject["mapping"], place]
    out.text(f"{finding['severity']}: {finding['kind']}: {' '.join(word for word in about if word)}".rstrip(": "))
    out.text(f"    {finding['text']}")
    out.text(f"    {finding['remedy']}")
    if finding["call"]:
        call = finding["call"]
        parameters = shlex.quote(json.dumps(call["parameters"], ensure_ascii=False))
        out.text(f"    vorn call {call['api']} v{call['version']}/{call['method']} {parameters}")


def _end(out, counts):
    found = [f"{counts[severity]} {severity}{'' if counts[severity] == 1 else 's'}" for severity in _SEVERITIES
             if counts[severity]]
    worst = next((severity for severity in _SEVERITIES if counts[severity]), None)
    if worst in _STATUS:
        raise Failure(f"The box has {', '.join(found)}.", _STATUS[worst])
    out.text(f"The box has {found[0]}." if found else "Nothing is wrong as far as it was checked.")


COMMANDS = (
    Command("health", "tell what is wrong with the NFS service, and what to do", health, arguments=(
        argument("--severity", choices=_SEVERITIES, help="only findings that are at least so severe"),
        argument("--kind", metavar="KIND", help="only findings of this kind"),
        argument("--share", metavar="SHARE", help="only findings about this shared folder"),
        argument("--limit", type=int, metavar="N", help="at most N findings; default 1000")),
            description="The worst findings come first, each with what it means for clients and a remedy. Checks that "
                        "could not be made are listed at the end. The exit status tells the worst finding.",
            examples=(("All findings", "vorn health"),
                      ("In a script: is there an error?", "vorn health --severity error"))),
)
