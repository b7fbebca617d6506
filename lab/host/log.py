"""Messages of the lab's host side, and the error that ends a run."""

import sys
import threading

_lock = threading.Lock()


class LabError(Exception):
    """Ends the run with this message and exit status."""

    def __init__(self, message, status=1):
        super().__init__(message)
        self.status = status


def say(message):
    """Prints a message in one piece; guests run at the same time."""
    with _lock:
        print(f"lab: {message}", file=sys.stderr, flush=True)


def show(text):
    """Prints a guest's output in one piece."""
    with _lock:
        print(text, end="", flush=True)
