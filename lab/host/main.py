"""Boots virtual boxes, installs the packages of this checkout in them, and runs the stories of lab/stories/ there."""

import argparse
import concurrent.futures
import os
import sys
import time

from host import cache, guest, report, stories
from host.cache import PROJECT, RELEASES
from host.log import LabError, say, show
from host.process import build, output_of
from host.release import Release

DEFAULT_RELEASE = RELEASES[0]
_DAY = "86400"
_EPILOG = """Installs the packages that are missing, and builds what is missing of the kernel, the guest's disk and
the product. Results and journals are then in build/lab/GUEST/. Kernels and disks are kept in $VORN_LAB_CACHE
(~/.cache/vorn-lab). A guest has $LIMIT (3600) seconds. Arguments after "--" are pytest's."""


def parse(arguments):
    """The options, and pytest's arguments as `pytest`."""
    split = arguments.index("--") if "--" in arguments else len(arguments)
    parser = argparse.ArgumentParser(prog="lab/run", description=__doc__, epilog=_EPILOG)
    parser.add_argument("stories", nargs="*", metavar="STORY", help="names of files in lab/stories; default: all")
    parser.add_argument("--on", metavar="RELEASE", choices=RELEASES, default=DEFAULT_RELEASE,
                        help="the guest's release of Debian: %(choices)s; default: %(default)s. One that is not this "
                        "machine's needs root")
    parser.add_argument("--vm", action="store_true", help="stock kernel in QEMU: slower, but nothing is compiled")
    parser.add_argument("--shell", action="store_true", help="a signed-in console on a running box")
    parser.add_argument("--open", action="store_true", help="the box's web API at 127.0.0.1, port $PORT (8080)")
    parser.add_argument("--jobs", type=int, default=os.cpu_count(), help="guests at a time; default: one per core")
    parser.add_argument("--budget", type=float, metavar="MINUTES",
                        help="run as many stories as fit; --turn chooses which, and all turns together run every story")
    parser.add_argument("--turn", type=int, help="default: the number of commits")
    parser.add_argument("--long", action="store_true", help="run the long stories, too, whose time no budget plans")
    parser.add_argument("--record", action="store_true", help="write the measured times to lab/times")
    chosen = parser.parse_args(arguments[:split])
    chosen.pytest = ["--long"] * chosen.long + arguments[split + 1:]
    chosen.machine = "vm" if chosen.vm else "uml"
    return chosen


def select(options):
    """The stories of this run."""
    chosen = stories.find(options.stories)
    if options.budget is None:
        return chosen
    turn = options.turn if options.turn is not None else int(output_of("git", "rev-list", "--count", "HEAD",
                                                                       cwd=PROJECT))
    chosen, turns = stories.share_of(chosen, options.budget * 60 * options.jobs, turn)
    say(f"turn {turn % turns + 1} of {turns}: {' '.join(story.name for story in chosen)}")
    return chosen


def prepare(machine, release=DEFAULT_RELEASE):
    """Builds what is missing. Returns a function that creates a guest with a given name."""
    made_for = Release(release)
    build([str(PROJECT / "scripts/setup"), "lab", f"lab_{machine}"], guest.WORK / "setup.log")
    say("packing the product")
    built = made_for.packages(guest.WORK / "package.log")
    kept = cache.Cache(guest.WORK)
    kernel, disk = cache.kernel(kept, machine, made_for), cache.disk(kept, made_for)
    return lambda name, packages=None: guest.Guest(name, machine, kernel, disk, packages or built)


def run_stories(chosen, options, make_guest):
    """Runs the jobs. Returns the exit status of the worst guest; 5 if pytest's arguments select no story."""
    begun = time.monotonic()
    jobs = stories.plan(chosen, options.jobs)
    pool = concurrent.futures.ThreadPoolExecutor(options.jobs)
    try:
        verdicts = list(pool.map(lambda job: guest.tell(job, options.pytest, make_guest), jobs))
    finally:
        pool.shutdown(cancel_futures=True)
    show("\n" + report.table(jobs))
    say(f"{len(jobs)} guests took {time.monotonic() - begun:.0f} s")
    if options.record:
        stories.record_times(report.seconds(jobs))
    failures = [verdict for verdict in verdicts if verdict not in (0, guest.NO_STORY)]
    if failures:
        return failures[0]
    if min(verdicts) == guest.NO_STORY:
        say("no story was selected")
    return min(verdicts)


def look(options, make_guest):
    """Boots a box for demonstrations. Returns the exit status of its kernel."""
    if options.shell:
        return make_guest("shell").boot(["shell"], {"CONSOLE": "fd:0,fd:1", "LIMIT": _DAY})
    port = os.environ.get("PORT", "8080")
    box = make_guest("open")
    (box.share / "port").write_text(f"{port}\n", encoding="ascii")
    return box.boot(["serve"], {"PORT": port, "LIMIT": _DAY})


def main():
    options = parse(sys.argv[1:])
    try:
        guest.end_on_signals()
        chosen = select(options)  # a misspelt name is reported before anything is built
        guest.WORK.mkdir(parents=True, exist_ok=True)
        make_guest = prepare(options.machine, options.on)
        if options.open and not options.vm:
            build([str(PROJECT / "scripts/setup"), "lab_open"], guest.WORK / "setup.log")
        if options.shell or options.open:
            return look(options, make_guest)
        return run_stories(chosen, options, make_guest)
    except LabError as error:
        say(error)
        return error.status


if __name__ == "__main__":
    sys.exit(main())
