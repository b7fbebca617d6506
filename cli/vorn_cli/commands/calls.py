"""vorn call, methods, completion."""

import json
import sys

from ..command import Command, argument, show_rehearsal
from ..completion import SHELLS, script
from ..failure import Exit, Failure


def call(context, arguments):
    """Calls any method and prints its data as JSON."""
    method, parameters = _method(arguments)
    try:
        parameters = json.loads(sys.stdin.read() if parameters == "-" else parameters)
    except ValueError as error:
        raise Failure(f"The parameters are no JSON: {error}", Exit.USAGE) from error
    if not isinstance(parameters, dict):
        raise Failure("The parameters are one JSON object.", Exit.USAGE)
    with context.out.progress("waiting for the box"):
        answer = context.api.call(method, parameters, revision=arguments.revision, rehearse=context.rehearse)
    context.report(answer)
    if context.rehearse:
        show_rehearsal(context.out, answer)
    else:
        context.out.raw(json.dumps(answer.data, indent=2, ensure_ascii=False) + "\n")


def _method(arguments):
    """The path of the method and the parameters. A path as "vorn methods" prints it is one word."""
    if "/" in arguments.api:
        if arguments.parameters is not None:
            raise Failure(f"\"{arguments.api}\" is followed by the parameters only.", Exit.USAGE)
        return arguments.api, arguments.method or "{}"
    if arguments.method is None:
        raise Failure(f"A method of {arguments.api} is missing; \"vorn methods\" lists them.", Exit.USAGE)
    method = arguments.method if "/" in arguments.method else f"v1/{arguments.method}"
    return f"{arguments.api}/{method}", arguments.parameters or "{}"


def methods(context, _arguments):
    """Prints all methods of the box."""
    found = [{"method": name, "reads": bool(described.get("x-read-only")), "summary": described.get("summary", "")}
             for name, described in context.api.methods().items()]
    context.out.table(found, {"METHOD": lambda row: row["method"], "KIND": lambda row: "reads" if row["reads"] else "changes",
                              "SUMMARY": lambda row: row["summary"]})


def completion(context, arguments):
    """Prints the completions for a shell."""
    context.out.raw(script(arguments.shell))


COMMANDS = (
    Command("call", "call any method of the web API", call, changes=True, arguments=(
        argument("api", metavar="API", help="for example VORN.Core.FileServ.NFS; with a version and a method, as \"vorn "
                                            "methods\" prints it, it is followed by the parameters"),
        argument("method", metavar="METHOD", nargs="?", help="\"get\" means version 1; \"v2/get\" names the version"),
        argument("parameters", metavar="JSON", nargs="?", help="the parameters; - is standard input"),
        argument("--revision", metavar="ETAG", help="only if the data with this revision is still there")),
            examples=(("Read", "vorn call VORN.Core.FileServ.NFS get"),
                      ("The same", "vorn call VORN.Core.FileServ.NFS/v1/get"),
                      ("Change", "vorn call VORN.Core.FileServ.NFS set '{\"enable_nfs\": true}'"))),
    Command("methods", "list the methods of the web API", methods, examples=(("What can be called", "vorn methods"),)),
    Command("completion", "print the completions for a shell", completion, needs_box=False,
            arguments=(argument("shell", choices=SHELLS, help="the shell"),),
            examples=(("For bash", "vorn completion bash > /etc/bash_completion.d/vorn"),)),
)
