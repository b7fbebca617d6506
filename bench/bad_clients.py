#!/usr/bin/env python3
"""Misbehaving clients for load tests: runs many of one kind until it is killed.

Usage: bench/bad_clients.py SCENARIO PORT [COUNT]

A scenario is a subclass of BadClient: what one client sends at first, and what it does every second. A connection that
the server closes is opened again at the next second, as an attacker does. To add a scenario, add a class.
"""
import os
import resource
import selectors
import socket
import sys
import time

METHOD = os.environ.get("BENCH_METHOD", "/api/VORN.Core.FileServ.NFS/v1/get")
# Clients with a token get further than others, whose requests are refused after the head.
TOKEN = os.environ.get("BENCH_TOKEN", "")
HEADERS = "Host: localhost\r\n" + (f"Authorization: Bearer {TOKEN}\r\n" if TOKEN else "")


def post(length, path=METHOD, content_type="application/json"):
    return (f"POST {path} HTTP/1.1\r\n{HEADERS}Content-Type: {content_type}\r\n"
            f"Content-Length: {length}\r\n\r\n").encode()


class BadClient:
    """One connection, and how it misbehaves."""
    reads = True       # answers are read
    unsent = b""
    receive_buffer = None

    def first(self):
        """Bytes to send when the connection is open."""
        return b""

    def each_second(self):
        """Bytes to send every second from then on."""
        return b""


class Idle(BadClient):
    """Connects and says nothing."""


class IdleAfterRequest(BadClient):
    """Makes one request, and keeps the connection."""

    def first(self):
        return post(2) + b"{}"


class SlowHead(BadClient):
    """Sends a header line each second."""

    def first(self):
        return f"POST {METHOD} HTTP/1.1\r\n{HEADERS}".encode()

    def each_second(self):
        return b"X: y\r\n"


class SlowBody(BadClient):
    """Announces 1 MiB and sends a byte each second."""

    def first(self):
        return post(1048576) + b"{"

    def each_second(self):
        return b" "


class SlowSmallBody(BadClient):
    """Announces a body that is too small to be charged to the budget, and sends a byte each second."""

    def first(self):
        return post(8000) + b"{"

    def each_second(self):
        return b" "


class SlowRead(BadClient):
    """Asks for many answers and reads none."""
    reads = False
    receive_buffer = 2048

    def first(self):
        return (post(2) + b"{}") * 200


class Busy(BadClient):
    """Sends requests as fast as they are answered, a hundred at a time."""

    def first(self):
        return (post(2) + b"{}") * 100

    def each_second(self):
        return self.first()


class JsonBombs(BadClient):
    """Sends the most expensive parameters that are accepted, 99,000 empty arrays, again and again."""
    body = b'{"a":[[]' + b",[]" * 99000 + b"]}"

    def first(self):
        return post(len(self.body)) + self.body

    def each_second(self):
        return self.first()


class ManyParts(BadClient):
    """Sends forms of 900 files, again and again."""
    body = b"".join(b"--b\r\nContent-Disposition: form-data; name=f%d; filename=k\r\n\r\nx\r\n" % i
                    for i in range(900)) + b"--b--\r\n"

    def first(self):
        return post(len(self.body), "/api/Test.Echo/v1/upload", "multipart/form-data; boundary=b") + self.body

    def each_second(self):
        return self.first()


class HungMethod(BadClient):
    """Calls a method that never ends."""
    body = b'{"begun": "/nonexistent/begun", "release": "/nonexistent/release"}'

    def first(self):
        return post(len(self.body), "/api/Test.Echo/v1/wait") + self.body


class TwoHungMethods(HungMethod):
    """Half of the clients call another method that never ends: together they wait for more than one queue."""
    calls = 0

    def first(self):
        TwoHungMethods.calls += 1
        version = TwoHungMethods.calls % 2 + 1
        return post(len(self.body), f"/api/Test.Echo/v{version}/wait") + self.body


SCENARIOS = {name: kind for name, kind in sorted(globals().items())
             if isinstance(kind, type) and issubclass(kind, BadClient) and kind is not BadClient}


class Crowd:
    """`count` clients of one kind, driven by one loop."""

    def __init__(self, kind, port, count):
        self._kind, self._port = kind, port
        self._selector = selectors.DefaultSelector()
        self._clients = {}  # socket to client
        self._count = count

    def run(self):
        while True:
            until = time.monotonic() + 1
            while len(self._clients) < self._count:
                self._open()
            while (left := until - time.monotonic()) > 0:
                for key, events in self._selector.select(left):
                    self._handle(key.fileobj, events)
            for connection, client in list(self._clients.items()):
                self._send(connection, client.each_second())

    def _open(self):
        connection = socket.socket()
        client = self._kind()
        if client.receive_buffer:
            connection.setsockopt(socket.SOL_SOCKET, socket.SO_RCVBUF, client.receive_buffer)
        try:
            connection.connect(("127.0.0.1", self._port))
        except OSError:
            connection.close()
            time.sleep(0.01)
            return
        connection.setblocking(False)
        self._clients[connection] = client
        # Without reading, the end of a connection is noticed when sending fails.
        if client.reads:
            self._selector.register(connection, selectors.EVENT_READ)
        self._send(connection, client.first())

    def _handle(self, connection, _events):
        try:
            data = connection.recv(65536)
        except BlockingIOError:
            return
        except OSError:
            data = b""
        if not data:
            self._close(connection)

    def _send(self, connection, data):
        client = self._clients.get(connection)
        if client is None or not (data or client.unsent):
            return
        # The rest of a partly sent request is sent first; the next request waits for it.
        client.unsent = client.unsent or data
        try:
            client.unsent = client.unsent[connection.send(client.unsent):]
        except BlockingIOError:
            return
        except OSError:
            self._close(connection)

    def _close(self, connection):
        client = self._clients.pop(connection, None)
        if client is None:
            return
        if client.reads:
            self._selector.unregister(connection)
        connection.close()


if __name__ == "__main__":
    soft, hard = resource.getrlimit(resource.RLIMIT_NOFILE)
    resource.setrlimit(resource.RLIMIT_NOFILE, (min(hard, 8192), hard))
    Crowd(SCENARIOS[sys.argv[1]], int(sys.argv[2]), int(sys.argv[3]) if len(sys.argv) > 3 else 1000).run()
