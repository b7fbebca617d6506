"""A program on a client that writes continuously."""

import os
import threading
import time

from harness.programs import wait_for


class Writer(threading.Thread):
    """Writes and syncs continuously until it is finished, and measures the gaps between completed writes."""

    def __init__(self, path):
        super().__init__()
        self._path = path
        self._finished = threading.Event()
        self._last = time.monotonic()
        self._longest = 0.0
        self.written = 0
        self.failure = None

    def run(self):
        try:
            with open(self._path, "wb", buffering=0) as file:
                while not self._finished.is_set():
                    file.write(b"x" * 1024)
                    os.fsync(file.fileno())
                    now = time.monotonic()
                    self._longest = max(self._longest, now - self._last)
                    self._last = now
                    self.written += 1
        except OSError as failure:
            self.failure = failure

    def longest_gap_while(self, action):
        """The longest time without a completed write while the action runs and until three more writes are done."""
        self._longest = 0.0
        action()
        written = self.written
        wait_for(lambda: self.written >= written + 3 or not self.is_alive(), "the writer stands still")
        return self._longest

    def finish(self):
        self._finished.set()
        self.join()
