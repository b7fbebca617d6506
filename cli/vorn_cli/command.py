"""Commands as data: the parser, the help, the manual page and the completions are made from the same objects."""

import dataclasses
from collections.abc import Callable

from .api import Answer, Api
from .failure import Exit, Failure
from .output import Output


@dataclasses.dataclass(frozen=True)
class Argument:
    """A positional argument or an option, with the settings of argparse.add_argument."""

    names: tuple
    settings: dict


def argument(*names, **settings):
    """Declares an argument of a command."""
    return Argument(names, settings)


@dataclasses.dataclass
class Context:
    """What a command works with."""

    api: Api
    out: Output
    rehearse: bool = False

    def read(self, method, parameters=None):
        """Calls a method that reads."""
        with self.out.progress("waiting for the box"):
            answer = self.api.call(method, parameters)
        self.report(answer)
        return answer

    def change(self, method, parameters, done, *, revision=None):
        """Calls a method that changes, or rehearses it, and says what was done."""
        with self.out.progress("waiting for the box"):
            answer = self.api.call(method, parameters, revision=revision, rehearse=self.rehearse)
        return self.finish(answer, done)

    def finish(self, answer, done):
        """Says what a change did, or what it would do."""
        self.report(answer)
        if self.rehearse:
            show_rehearsal(self.out, answer)
        else:
            self.out.text(done)
            self.out.data(answer.data)
        return answer

    def report(self, answer: Answer):
        """Prints the warnings of an answer."""
        for warning in answer.warnings:
            self.out.warn(warning)


@dataclasses.dataclass(frozen=True)
class Command:
    """One command. `run` gets the context and the parsed arguments."""

    words: str  # "nfs set"
    help: str  # a phrase for the list of commands
    run: Callable
    arguments: tuple = ()
    description: str = ""
    examples: tuple = ()  # pairs: what it does, the command line
    changes: bool = False  # has --rehearse
    needs_box: bool = True  # is run with a connection


def show_rehearsal(out, answer, heading="Nothing was changed. The command would do this:"):
    """Prints what a change would do."""
    rehearsal = answer.rehearsal
    if rehearsal is None:
        raise Failure("This box cannot rehearse changes.", Exit.FAILED)
    if out.as_json:
        out.data(rehearsal)
        return
    out.text(heading)
    for file in rehearsal.get("files", []):
        out.difference(file["difference"])
    for action in rehearsal.get("actions", []):
        out.text(f"- {action['action']}: {action['effect']}")
    for rule in rehearsal.get("rules", []):
        effects = ", ".join(change["text"] for change in rule["changes"])
        out.text(f"- {rule['client']} at {rule['directory']}: {effects}")
    for client in rehearsal.get("clients", []):
        effects = ", ".join(change["text"] for change in client["changes"])
        doubt = "" if client["certain"] else " (not certain: rules for host names may decide)"
        out.text(f"- connected: {client['address']} ({client['name']}) at {client['path']}: {effects}{doubt}")
    if not rehearsal.get("all_clients", True):
        out.text("- more clients may be connected: there are too many to compare.")
    findings = rehearsal.get("findings", {"added": [], "removed": []})
    for finding in findings["added"]:
        out.text(f"- new {finding['severity']}: {finding['text']} {finding['remedy']}")
    for finding in findings["removed"]:
        out.text(f"- no more {finding['severity']}: {finding['text']}")


def switch(text):
    """Parses "on" or "off"."""
    if text not in ("on", "off"):
        raise ValueError(text)
    return text == "on"


switch.__name__ = "switch (on or off)"  # argparse names it in its message


def merge(present, wanted):
    """The present values with those that the command line has."""
    return {**present, **{name: value for name, value in wanted.items() if value is not None}}


def require_change(wanted):
    """Fails if a command that sets something was given nothing to set."""
    if all(value is None for value in wanted.values()):
        raise Failure("Nothing is to be changed: give at least one option; --help lists them.", Exit.USAGE)
