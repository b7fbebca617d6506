#!/usr/bin/env python3
"""Tries to include every folder's headers from every other folder, with the compiler flags of that folder.

usage: forbidden_includes.py COMPILE_COMMANDS

An include that the table below allows must compile, any other one must fail: what a folder may use is decided by
the include directories of its CMake target, and this test notices a target that has gained one.
"""
import json
import pathlib
import shlex
import subprocess
import sys

PROJECT = pathlib.Path(__file__).resolve().parents[2]

# Each folder, and the folders whose headers it may include besides its own.
ALLOWED = {
    "src": {"src/frame", "include", "platform"},
    "src/frame": {"include", "platform"},
    "share": {"src/frame", "include", "platform"},
    "insight": {"src/frame", "include", "platform"},
    "linux/system": {"linux/status"},
    "linux/text": {"linux/status"},
    "linux/box": {"linux/status", "linux/system", "linux/text", "platform"},
    "linux/settings": {"linux/status", "linux/system", "linux/text", "linux/box", "platform"},
    "linux/host": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/settings", "platform"},
    "linux/exports": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/host", "platform"},
    "linux/idmap": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/host", "linux/idmap/plugin"},
    "linux/kerberos": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/settings", "platform"},
    "linux/service": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/exports", "linux/host",
        "linux/settings", "platform"},
    "linux/access": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/exports", "linux/host",
        "linux/idmap", "linux/kerberos", "linux/settings", "linux/service", "platform"},
    "linux/clients": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/access", "linux/exports",
        "linux/host", "linux/service", "platform"},
    "linux/health": {"linux/status", "linux/system", "linux/text", "linux/box", "linux/exports", "linux/host",
        "linux/idmap", "linux/kerberos", "linux/settings", "linux/service", "linux/access", "linux/clients", "platform"},
    "linux/history": {"linux/status", "linux/system", "linux/text", "linux/box", "platform"},
    "linux/contract": {
        "linux/status", "linux/system", "linux/text", "linux/box", "linux/settings", "linux/host", "linux/exports",
        "linux/access", "linux/clients", "linux/health", "linux/history", "linux/idmap", "linux/kerberos", "linux/service", "platform"},
}
HEADERS = sorted(set(ALLOWED) | {"include", "platform", "linux/status", "server", "tests/support"})


def is_within(path, folder):
    return pathlib.Path(path).resolve().parent == PROJECT / folder


def compiler_of(folder, commands):
    """The command that compiles a source of the folder's widest target, without its input and output."""
    compilers = []
    for command in commands:
        if is_within(command["file"], folder):
            words = shlex.split(command["command"])
            words = words[: words.index("-o")]
            compilers.append(words[1:] if words[0].endswith("ccache") else words)
    if not compilers:
        sys.exit(f"forbidden_includes: no source of {folder} is compiled")
    return max(compilers, key=len)


def header_of(folder):
    """A header of a folder whose name no other folder has."""
    for header in sorted((PROJECT / folder).glob("**/*.h")):
        if len([other for other in PROJECT.glob(f"*/**/{header.name}") if "build" not in other.parts]) == 1:
            return header.name
    sys.exit(f"forbidden_includes: no header of {folder} has a name of its own")


def compiles(compiler, header):
    source = f'#include "{header}"\n'
    result = subprocess.run(
        compiler + ["-fsyntax-only", "-x", "c++", "-"], input=source, capture_output=True, text=True, check=False)
    return result.returncode == 0


def main():
    commands = json.loads(pathlib.Path(sys.argv[1]).read_text())
    failures = 0
    tried = 0
    headers = {folder: header_of(folder) for folder in HEADERS if (PROJECT / folder).is_dir()}
    for folder, allowed in ALLOWED.items():
        compiler = compiler_of(folder, commands)
        for other, header in headers.items():
            if other == folder:
                continue
            tried += 1
            if compiles(compiler, header) != (other in allowed):
                verb = "cannot include" if other in allowed else "can include"
                print(f"forbidden_includes: {folder} {verb} {header} of {other}")
                failures += 1
    print(f"forbidden_includes: {tried} includes tried, {failures} wrong")
    return 1 if failures or tried < 50 else 0


if __name__ == "__main__":
    sys.exit(main())
