#!/usr/bin/env python3
"""Checks that nothing below linux/contract/ calls a function of it.

usage: contract_calls.py NM CONTRACT_OBJECT... -- LIBRARY...

A folder may include the records of platform/ and would then compile with a call of an operation, too. Such a call takes
a second configuration context, or renews what the first one remembers.
"""
import pathlib
import subprocess
import sys


def symbols(nm, option, kinds, files):
    """The names of these kinds (nm(1)), each with the file that has it."""
    output = subprocess.run([nm, "-A", option, *files], capture_output=True, text=True, check=True).stdout
    found = {}
    for line in output.splitlines():
        words = line.split()
        if len(words) > 1 and words[-2] in kinds:
            found[words[-1]] = pathlib.Path(line.split(":")[0]).name
    return found


def main():
    nm, *files = sys.argv[1:]
    split = files.index("--")
    operations = symbols(nm, "--defined-only", "T", files[:split])
    calls = symbols(nm, "--undefined-only", "U", files[split + 1:])
    wrong = sorted(operations.keys() & calls.keys())
    for name in wrong:
        print(f"contract_calls: {calls[name]} calls {name} of linux/contract/")
    print(f"contract_calls: {len(operations)} operations, {len(calls)} functions called, {len(wrong)} wrong calls")
    return 1 if wrong or len(operations) < 50 or len(calls) < 50 else 0


if __name__ == "__main__":
    sys.exit(main())
