"""Completions for shells, made from the parser."""

import argparse

SHELLS = ("bash", "zsh", "fish")


def script(shell):
    """The completions of all commands in the language of the shell."""
    from .parser import build  # pylint: disable=import-outside-toplevel # the parser has a command that calls this
    import shtab  # pylint: disable=import-outside-toplevel # needed by this command only
    parser = build()
    return _fish(parser) if shell == "fish" else shtab.complete(parser, shell) + "\n"


def _fish(parser):
    """complete(1) of fish: a line for each word, with the words before it as its condition."""
    lines = ["complete -c vorn -f"]
    _add_fish(parser, [], lines)
    return "\n".join(lines) + "\n"


def _add_fish(parser, words, lines):
    seen = " ".join(f"; and __fish_seen_subcommand_from {word}" for word in words)
    condition = f"-n 'true{seen}'" if words else "-n __fish_use_subcommand"
    for action in parser._actions:  # pylint: disable=protected-access # argparse has no public list of them
        if isinstance(action, argparse._SubParsersAction):  # pylint: disable=protected-access
            helps = {choice.dest: choice.help for choice in action._choices_actions}  # pylint: disable=protected-access
            for name, subparser in action.choices.items():
                lines.append(f"complete -c vorn {condition} -a {name} -d {_quoted(helps.get(name, ''))}")
                _add_fish(subparser, [*words, name], lines)
        for option in action.option_strings:
            kind = "-l" if option.startswith("--") else "-s"
            argument = "" if action.nargs == 0 else " -r"
            described = "" if action.help == argparse.SUPPRESS else f" -d {_quoted(action.help)}"
            lines.append(f"complete -c vorn {condition} {kind} {option.lstrip('-')}{argument}{described}")


def _quoted(text):
    return "'" + (text or "").replace("\\", "\\\\").replace("'", "\\'") + "'"
