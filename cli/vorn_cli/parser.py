"""The parser of the command line, made from the commands."""

import argparse

from . import VERSION
from .commands import COMMANDS, GROUPS
from .connection import DEFAULT_SOCKET
from .failure import Exit

GLOBAL_OPTIONS = (
    (("--url",), {"metavar": "URL", "help": "a box on the network, with the token that \"vorn login\" keeps for it, or that "
                                          "the variable VORN_TOKEN has; default: the variable VORN_URL"}),
    (("--socket",), {"metavar": "PATH", "help": "the Unix socket of vornd; default: the variable VORN_SOCKET, or "
                                              + DEFAULT_SOCKET}),
    (("--json",), {"action": "store_true", "help": "print JSON, for programs"}),
)
VERSION_OPTION = (("--version",), {"action": "version", "version": f"vorn {VERSION}", "help": "print the version and end"})
_REHEARSE = (("--rehearse",), {"action": "store_true", "help": "change nothing; show what the command would do"})


class _Help(argparse.RawDescriptionHelpFormatter):
    """Fills the description to the width of the terminal, and leaves the lines of the examples as they are."""

    def _fill_text(self, text, width, indent):
        if "\n" in text:
            return super()._fill_text(text, width, indent)
        return argparse.HelpFormatter._fill_text(self, text, width, indent)


class Parser(argparse.ArgumentParser):
    """Ends with the exit status for usage errors, and names the help."""

    def error(self, message):
        self.exit(Exit.USAGE, f"vorn: {message}\n  \"{self.prog} --help\" has the usage.\n")

    def parse_args(self, args=None, namespace=None):
        """As argparse does, but words that a command does not know are an error of that command."""
        arguments, unknown = self.parse_known_args(args, namespace)
        if unknown:
            arguments.parser.error("unrecognized arguments: " + " ".join(unknown))
        return arguments


def build():
    """The parser of all commands."""
    parser = Parser(prog="vorn", description="Administers the NFS service of a storage box.",
                    epilog="\"vorn COMMAND --help\" describes a command and has examples. The options --url, --socket and "
                           "--json may also follow the command.",
                    formatter_class=_Help)
    for names, settings in (*GLOBAL_OPTIONS, VERSION_OPTION):
        parser.add_argument(*names, **settings)
    subparsers = parser.add_subparsers(metavar="COMMAND", required=True)
    groups = {}
    for command in COMMANDS:
        *group, name = command.words.split()
        if group and group[0] not in groups:
            groups[group[0]] = _add_group(subparsers, group[0])
        _add_command(groups[group[0]] if group else subparsers, name, command)
    return parser


def _add_group(subparsers, name):
    group = subparsers.add_parser(name, help=GROUPS[name], description=f"Commands about {GROUPS[name]}.")
    return group.add_subparsers(metavar="COMMAND", required=True)


def _add_command(subparsers, name, command):
    parser = subparsers.add_parser(name, help=command.help, description=describe(command), epilog=_examples(command),
                                   formatter_class=_Help)
    for one in command.arguments + rehearse_option(command):
        parser.add_argument(*one.names, **one.settings)
    if command.needs_box:
        _accept_global_options(parser)
    parser.set_defaults(command=command, parser=parser)


def _accept_global_options(parser):
    """Accepts the options of all commands behind the command, too. Its help does not repeat them."""
    for names, settings in GLOBAL_OPTIONS:
        parser.add_argument(*names, **{**settings, "help": argparse.SUPPRESS, "default": argparse.SUPPRESS})


def rehearse_option(command):
    """The option of the commands that change something."""
    from .command import Argument  # pylint: disable=import-outside-toplevel
    return (Argument(*_REHEARSE),) if command.changes else ()


def describe(command):
    """The sentences at the top of the help."""
    first = command.help[0].upper() + command.help[1:] + "."
    return f"{first} {command.description}".rstrip()


def _examples(command):
    lines = [f"  {line}\n      {text}" for text, line in command.examples]
    return "examples:\n" + "\n".join(lines) if lines else ""
