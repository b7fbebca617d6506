"""The token and the certificate's fingerprint of each box, as "vorn login" keeps them: one file, mode 0600."""

import json
import os
import pathlib
import tempfile

from .failure import Exit, Failure


def path():
    """$XDG_CONFIG_HOME/vorn/credentials.json, below ~/.config by default (XDG Base Directory Specification)."""
    base = os.environ.get("XDG_CONFIG_HOME") or pathlib.Path.home() / ".config"
    return pathlib.Path(base) / "vorn/credentials.json"


def load():
    """What is kept, by URL."""
    try:
        with open(path(), encoding="utf-8") as file:
            if os.fstat(file.fileno()).st_mode & 0o077:
                raise Failure(f"{path()} can be read by others; run: chmod 600 {path()}", Exit.NOT_PERMITTED)
            return json.load(file)
    except FileNotFoundError:
        return {}
    except ValueError as error:
        raise Failure(f"{path()} is damaged; remove it and run \"vorn login\" again.", Exit.NOT_PERMITTED) from error


def store(url, token, fingerprint):
    """Keeps a box."""
    _write({**load(), url: {"token": token, "fingerprint": fingerprint}})


def remove(url):
    """Forgets a box. Returns whether it was known."""
    known = load()
    found = known.pop(url, None) is not None
    _write(known)
    return found


def _write(known):
    folder = path().parent
    folder.mkdir(mode=0o700, parents=True, exist_ok=True)
    descriptor, temporary = tempfile.mkstemp(dir=folder)  # mode 0600
    with open(descriptor, "w", encoding="utf-8") as file:
        json.dump(known, file, indent=2)
    os.replace(temporary, path())
