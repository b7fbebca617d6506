"""What the commands print: tables for people, JSON for programs, warnings on standard error."""

import json
import os
import sys
import threading
import time
import unicodedata

_COLOURS = {"red": "31", "green": "32", "yellow": "33", "bold": "1"}
_PROGRESS_AFTER = 1  # seconds


class Output:
    """Standard output in the chosen form, and standard error."""

    def __init__(self, as_json=False, stdout=None, stderr=None):
        self.as_json = as_json
        self._stdout = stdout or sys.stdout
        self._stderr = stderr or sys.stderr

    def data(self, value):
        """Prints JSON, and nothing in the form for people."""
        if self.as_json:
            print(json.dumps(value, indent=2, ensure_ascii=False), file=self._stdout)

    def table(self, data, columns):
        """Prints rows, a dictionary each, as a table; `columns` maps the heading to a function of the row."""
        if self.as_json:
            self.data(data)
            return
        if not data:
            self.text("There are no entries.")
            return
        lines = [list(columns)] + [[_text(value(row)) for value in columns.values()] for row in data]
        widths = [max(_width(line[at]) for line in lines) for at in range(len(columns))]
        for number, line in enumerate(lines):
            padded = "  ".join(cell + " " * (width - _width(cell)) for cell, width in zip(line, widths, strict=True))
            print(self._coloured(padded.rstrip(), "bold" if number == 0 else None, self._stdout), file=self._stdout)

    def record(self, data, names):
        """Prints one object as lines "name: value"; `names` maps the heading to a function of the object."""
        if self.as_json:
            self.data(data)
            return
        width = max(map(len, names))
        for name, value in names.items():
            print(f"{name + ':':<{width + 1}} {_text(value(data))}", file=self._stdout)

    def text(self, text):
        """Prints text for people."""
        if not self.as_json:
            print(_printable(text), file=self._stdout)

    def raw(self, text):
        """Prints a file (YAML, CSV) as it is, in both forms."""
        self._stdout.write(text)

    def difference(self, text):
        """Prints a unified diff."""
        for line in text.splitlines():
            colour = {"+": "green", "-": "red", "@": "bold"}.get(line[:1])
            print(self._coloured(_printable(line), colour, self._stdout), file=self._stdout)

    def warn(self, sentence):
        """Prints a warning to standard error."""
        print(self._coloured(f"warning: {_printable(sentence)}", "yellow", self._stderr), file=self._stderr)

    def error(self, failure):
        """Prints why the command failed to standard error."""
        print(self._coloured(f"vorn: {_printable(failure)}", "red", self._stderr), file=self._stderr)
        for line in failure.details:
            print(f"  {_printable(line)}", file=self._stderr)

    def progress(self, label):
        """A line on a terminal's standard error while the "with" block takes longer than a second."""
        return _Progress(label, self._stderr)

    @staticmethod
    def _coloured(text, colour, stream):
        if colour is None or not stream.isatty() or os.environ.get("NO_COLOR") or os.environ.get("TERM") == "dumb":
            return text
        return f"\x1b[{_COLOURS[colour]}m{text}\x1b[0m"


class _Progress:
    def __init__(self, label, stream):
        self._label = label
        self._stream = stream
        self._ended = threading.Event()
        self._thread = None

    def __enter__(self):
        if self._stream.isatty():
            self._thread = threading.Thread(target=self._show, daemon=True)
            self._thread.start()
        return self

    def __exit__(self, *_):
        self._ended.set()
        if self._thread:
            self._thread.join()

    def _show(self):
        begun = time.monotonic()
        shown = False
        while not self._ended.wait(_PROGRESS_AFTER):
            shown = True
            self._stream.write(f"\r{self._label} ... {time.monotonic() - begun:.0f} s")
            self._stream.flush()
        if shown:
            self._stream.write("\r\x1b[K")
            self._stream.flush()


def count(number, noun):
    """The number with the noun, which has an "s" in the plural."""
    return f"{number} {noun}" if number == 1 else f"{number} {noun}s"


def yes_no(value):
    """A switch in words."""
    return "yes" if value else "no"


def time_of(seconds):
    """A time of day in the local time zone; "never" for None."""
    return "never" if seconds is None else time.strftime("%Y-%m-%d %H:%M", time.localtime(seconds))


def _text(value):
    if isinstance(value, bool):
        return yes_no(value)
    if isinstance(value, (list, tuple)):
        value = ", ".join(map(str, value))
    return _printable(value) if value not in (None, "") else "-"


def _printable(value):
    """The text without characters that control a terminal."""
    return "".join(c if c in "\t" or unicodedata.category(c) not in ("Cc", "Cs") else "\ufffd" for c in str(value))


def _width(text):
    """The columns that a terminal uses."""
    wide = sum(unicodedata.east_asian_width(c) in "WF" for c in text)
    return len(text) + wide - sum(unicodedata.combining(c) != 0 for c in text)
