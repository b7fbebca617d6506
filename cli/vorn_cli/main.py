"""The entry point of the command line."""

import os
import sys

from . import credentials
from .api import Api
from .command import Context
from .connection import DEFAULT_SOCKET, check_url
from .failure import Exit, Failure
from .output import Output
from .parser import build


def main(words=None):
    """Runs one command and returns the exit status."""
    arguments = build().parse_args(words)
    out = Output(arguments.json)
    try:
        api = _box(arguments) if arguments.command.needs_box else None
        arguments.command.run(Context(api, out, getattr(arguments, "rehearse", False)), arguments)
        sys.stdout.flush()
    except Failure as failure:
        out.error(failure)
        return failure.status
    except BrokenPipeError:
        # The reader of the output has seen enough. Python would complain once more when it flushes at its end.
        os.dup2(os.open(os.devnull, os.O_WRONLY), sys.stdout.fileno())
    except KeyboardInterrupt:
        return 130  # as a shell reports SIGINT
    return Exit.SUCCESS


def _box(arguments):
    """The box that the options or the environment name."""
    if arguments.url and arguments.socket:
        raise Failure("--url and --socket name two boxes; give one of them.", Exit.USAGE)
    if arguments.socket or not (arguments.url or os.environ.get("VORN_URL")):
        path = arguments.socket or os.environ.get("VORN_SOCKET") or DEFAULT_SOCKET
        return Api(os.path.abspath(path), os.environ.get("VORN_TOKEN"))
    url = check_url(arguments.url or os.environ["VORN_URL"])
    kept = credentials.load().get(url, {})
    return Api(url, os.environ.get("VORN_TOKEN") or kept.get("token"), kept.get("fingerprint"))
