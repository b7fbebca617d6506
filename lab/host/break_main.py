"""Breaks the product on purpose, one promise at a time, and checks that the story that guards the promise fails."""

import argparse
import concurrent.futures
import os
import shutil
import sys

from host import guest, report, stories
from host.breaks import BREAKS
from host.cache import PROJECT
from host.log import LabError, say, show
from host.main import prepare
from host.process import build, output_of
from host.release import Release

_WORK = PROJECT / "build/break"


def edited_sources(item):
    """The sources that the break's edit changes: their names and the edited texts."""
    text, expression = item.source
    edited = {}
    for path in PROJECT.glob("linux/**/*.cpp"):
        before = path.read_text(encoding="utf-8")
        after = output_of("sed", expression, str(path)) if text in before else before
        if after != before:
            edited[path.relative_to(PROJECT)] = after
    return edited


def broken_packages(item):
    """Builds the packages from sources with the break's edit. Raises LabError where the edit changes nothing."""
    edited = edited_sources(item)
    if not edited:
        raise LabError("no source has the text that is to be edited")
    tree = _WORK / item.name
    shutil.rmtree(tree, ignore_errors=True)
    for name in output_of("git", "ls-files", cwd=PROJECT).splitlines():
        (tree / name).parent.mkdir(parents=True, exist_ok=True)
        shutil.copy(PROJECT / name, tree / name)
    for name, text in edited.items():
        (tree / name).write_text(text, encoding="utf-8")
    return Release(item.release).packages(_WORK / f"{item.name}.log", tree)


def run_break(item, make_guest):
    """The names of the stories that failed with the break."""
    packages = broken_packages(item) if item.source else None
    (story,) = stories.find([item.story])

    def make(name):
        made = make_guest(name, packages=packages)
        shutil.copytree(PROJECT / "lab/breaks", made.share / "breaks")
        shutil.copy(_WORK / "preload.so", made.share / "breaks")
        (made.share / "break").write_text(f"{item.script}\n", encoding="utf-8")
        return made

    job = stories.Job(f"break-{item.name}", [story], story.boots)
    guest.tell(job, ["-k", item.select] if item.select else [], make, quiet=True)
    return report.failed(job)


def try_break(item, make_guests):
    """The names of the stories that failed with the break; None if it could not be tried, which the others survive."""
    try:
        return run_break(item, make_guests[item.release]) if item.release in make_guests else None
    except (LabError, OSError) as error:
        say(f"{item.name}: {error}")
        return None


def prepare_releases(items):
    """By release, for the releases that the breaks need and that can be prepared: what creates a guest."""
    make_guests = {}
    for release in dict.fromkeys(item.release for item in items):
        try:
            make_guests[release] = prepare("uml", release)
        except LabError as error:
            say(f"{release}: {error}")
    return make_guests


def table(results):
    rows = [f"{'break':22} {'promise':44} noticed by"]
    for item, failed in results:
        noticed = "not tried" if failed is None else ", ".join(failed) or "NONE"
        rows.append(f"{item.name:22} {item.promise:44} {noticed}")
    return "\n".join(rows) + "\n"


def chosen_breaks(names):
    known = {item.name: item for item in BREAKS}
    for name in names:
        if name not in known:
            raise LabError(f"there is no break \"{name}\"; there are: {' '.join(known)}", status=2)
    return [known[name] for name in names] or BREAKS


def main():
    parser = argparse.ArgumentParser(prog="lab/break", description=__doc__)
    parser.add_argument("breaks", nargs="*", metavar="BREAK", help="names in lab/host/breaks.py; default: all")
    parser.add_argument("--jobs", type=int, default=os.cpu_count(), help="guests at a time; default: one per core")
    options = parser.parse_args()
    try:
        guest.end_on_signals()
        items = chosen_breaks(options.breaks)
        for folder in (guest.WORK, _WORK):
            folder.mkdir(parents=True, exist_ok=True)
        make_guests = prepare_releases(items)
        library = ["gcc", "-shared", "-fPIC", "-o", str(_WORK / "preload.so"), str(PROJECT / "lab/breaks/preload.c")]
        build([*library, "-ldl"], _WORK / "preload.log")
        with concurrent.futures.ThreadPoolExecutor(options.jobs) as pool:
            failed = list(pool.map(lambda item: try_break(item, make_guests), items))
    except LabError as error:
        say(error)
        return error.status
    show(table(zip(items, failed)))
    return 0 if all(failed) else 1


if __name__ == "__main__":
    sys.exit(main())
