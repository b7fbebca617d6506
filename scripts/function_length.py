#!/usr/bin/env python3
"""function_length.py FILE ...: prints each function of the C++ sources that has more than 60 lines, TEST bodies included
(clang-tidy does not count the lines of a body that a macro begins). Exit status 1 if there is one.

The sources are in the form that clang-format gives them: a function begins with a line that has a ")" and ends with
"{", and its last line begins with "}" and is not indented more than the first one.

>>> list(long_functions(["void F() {", "  a();", "}", "", "struct S {", "  int a;", "};"], 2))
[(1, 3)]
>>> list(long_functions(["TEST(A, B) {", "  if (x) {", "    a();", "  }", "}"], 5))
[]
"""
import re
import sys

LIMIT = 60
BEGINNING = re.compile(r"\s*(?!//).*\).*\{$")


def indentation(line):
    return len(line) - len(line.lstrip())


def long_functions(lines, limit):
    """The first line, from 1, and the number of lines of each function with more than `limit` lines."""
    for first, line in enumerate(lines):
        if not BEGINNING.match(line):
            continue
        for last in range(first + 1, len(lines)):
            if lines[last].lstrip().startswith("}") and indentation(lines[last]) <= indentation(line):
                if last - first + 1 > limit:
                    yield first + 1, last - first + 1
                break


def main():
    status = 0
    for path in sys.argv[1:]:
        with open(path, encoding="utf-8") as source:
            lines = source.read().split("\n")
        for first, count in long_functions(lines, LIMIT):
            print(f"{path}:{first}: a function of {count} lines; {LIMIT} are the limit", file=sys.stderr)
            status = 1
    return status


if __name__ == "__main__":
    sys.exit(main())
