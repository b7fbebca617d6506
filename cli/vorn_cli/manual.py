"""The manual page vorn(1), in the language of man(7), made from the same commands as the help."""

import textwrap

from .commands import COMMANDS, GROUPS
from .failure import Exit
from .parser import GLOBAL_OPTIONS, VERSION_OPTION, describe, rehearse_option

_STATUS = {
    Exit.SUCCESS: "The command succeeded.",
    Exit.FAILED: "The box refused the call, or could not carry it out.",
    Exit.DIFFERS: "Only \"vorn apply --check\": the box differs from the file.",
    Exit.NOT_PERMITTED: "The credentials are missing or wrong, or do not permit the call.",
    Exit.NO_CONNECTION: "The box cannot be reached, or its certificate is not the known one.",
    Exit.CHANGED_MEANWHILE: "Somebody else changed the same thing meanwhile. The call changed nothing.",
    Exit.HEALTH_WARNINGS: "Only \"vorn health\": the worst finding is a warning.",
    Exit.HEALTH_ERRORS: "Only \"vorn health\": the worst finding is an error.",
    Exit.USAGE: "The command line is wrong. Nothing was done.",
}

_HEAD = """.TH VORN 1 "" "vorn" "Storage box"
.SH NAME
vorn \\- administer the NFS service of a storage box
.SH SYNOPSIS
.B vorn
[\\fIOPTION\\fR]... \\fICOMMAND\\fR [\\fIARGUMENT\\fR]...
.SH DESCRIPTION
Each command is a call of the box's web API: over the Unix socket of vornd(8), which root and the members of the
administrators' group may use, or over the network with a token.
The options may also follow the command.
Commands print tables; with \\fB\\-\\-json\\fR they print JSON.
Warnings and errors go to standard error.
"""

_TAIL = """.SH ENVIRONMENT
.TP
.B VORN_URL
The box, if no option names one.
.TP
.B VORN_SOCKET
The Unix socket, if no option names one.
.TP
.B VORN_TOKEN
The token. It takes precedence over the one that \\fBvorn login\\fR keeps.
.TP
.B NO_COLOR
No colours, also on a terminal.
.SH FILES
.TP
.I ~/.config/vorn/credentials.json
The tokens and fingerprints that \\fBvorn login\\fR keeps; only its owner may read it.
.SH SEE ALSO
.BR vornd (8),
.BR exports (5),
.BR nfs.conf (5),
.BR idmapd.conf (5)
"""


def page():
    """The whole page."""
    return _HEAD + ".SH OPTIONS\n" + "".join(map(_global_option, (*GLOBAL_OPTIONS, VERSION_OPTION))) + _commands() + _statuses() + _TAIL


def _global_option(option):
    names, settings = option
    return _entry(_option_synopsis(names, settings), settings["help"])


def _commands():
    text = ".SH COMMANDS\n"
    group = None
    for command in COMMANDS:
        first = command.words.split()[0]
        if first != group and first in GROUPS:
            text += f".SS {_escaped(GROUPS[first][0].upper() + GROUPS[first][1:])}\n"
        elif first not in GROUPS and (group is None or group in GROUPS):
            text += ".SS Other commands\n"
        group = first
        text += _command(command)
    return text


def _command(command):
    arguments = command.arguments + rehearse_option(command)
    words = " ".join(_synopsis(one) for one in arguments)
    text = f".TP\n\\fBvorn {_escaped(command.words)}\\fR {words}\n{_paragraph(describe(command))}.RS\n"
    for one in arguments:
        text += _entry(_option_synopsis(one.names, one.settings), one.settings.get("help", ""))
    for explanation, line in command.examples:
        text += f".PP\n{_escaped(explanation)}:\n.PP\n.EX\n    {_escaped(line)}\n.EE\n"
    return text + ".RE\n"


def _synopsis(argument):
    synopsis = _option_synopsis(argument.names[-1:] if argument.names[0].startswith("-") else argument.names,
                                argument.settings)
    if argument.settings.get("nargs") in ("*", "+"):
        synopsis += "..."
    is_optional = argument.names[0].startswith("-") and not argument.settings.get("required")
    return f"[{synopsis}]" if is_optional or argument.settings.get("nargs") in ("*", "?") else synopsis


def _option_synopsis(names, settings):
    if not names[0].startswith("-"):
        return f"\\fI{_escaped(_value(names[0], settings))}\\fR"
    names = ", ".join(f"\\fB{_escaped(name)}\\fR" for name in names)
    return names if settings.get("action") in ("store_true", "version") else f"{names} \\fI{_escaped(_value('', settings))}\\fR"


def _value(name, settings):
    if settings.get("metavar"):
        return settings["metavar"]
    return "|".join(settings["choices"]) if settings.get("choices") else name.upper()


def _statuses():
    entries = "".join(_entry(f"\\fB{int(status)}\\fR", text) for status, text in _STATUS.items())
    return ".SH EXIT STATUS\n" + entries


def _entry(tag, text):
    return f".TP\n{tag}\n{_paragraph(text)}"


def _paragraph(text):
    return "\n".join(map(_escaped, textwrap.wrap(text, 100))) + "\n"


def _escaped(text):
    """The text for man(7): backslashes, hyphens that are to be typed, and control lines."""
    escaped = text.replace("\\", "\\e").replace("-", "\\-")
    return "\\&" + escaped if escaped[:1] in (".", "'") else escaped
