"""node(1) for the checks that use programs of npm packages."""

import os
import shutil
import subprocess

from trial_server import PROJECT

OLDEST_NODE = (20, 19)
OWN = PROJECT / "build/node/node_modules/.bin"  # where "scripts/setup console" puts a node, if the system's is too old


def environment():
    """The environment of a child process that uses node."""
    return {**os.environ, "PATH": f"{OWN}:{os.environ['PATH']}"} if OWN.is_dir() else dict(os.environ)


def version():
    """The version of node, or None."""
    try:
        text = subprocess.run(["node", "--version"], capture_output=True, text=True, check=True, env=environment()).stdout
    except FileNotFoundError:
        return None
    return tuple(int(number) for number in text.strip().lstrip("v").split(".")[:2])


def skip_reason():
    """Why programs of npm packages cannot run here, or None."""
    found = version()
    if found is None:
        return "node is not installed"
    if found < OLDEST_NODE:
        return f"node {'.'.join(map(str, found))} is too old; {'.'.join(map(str, OLDEST_NODE))} is needed"
    return None if shutil.which("npm", path=environment()["PATH"]) else "npm is not installed"
