"""Files that the caller names on the command line."""

import sys

from .failure import Exit, Failure


def read_text(path):
    """The text of a file in UTF-8, without a byte order mark; "-" is standard input."""
    try:
        if path == "-":
            return sys.stdin.read()
        with open(path, encoding="utf-8-sig", newline="") as file:
            return file.read()
    except (OSError, UnicodeDecodeError) as error:
        raise _unreadable(path, error) from error


def read_bytes(path):
    """The content of a file."""
    try:
        with open(path, "rb") as file:
            return file.read()
    except OSError as error:
        raise _unreadable(path, error) from error


def _unreadable(path, error):
    return Failure(f"{path} cannot be read: {getattr(error, 'strerror', None) or error}", Exit.USAGE)
