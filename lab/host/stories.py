"""The stories: where they are, how many boots each takes, and which guest runs which."""

import ast
import dataclasses

from host.cache import PROJECT
from host.log import LabError

FOLDER = PROJECT / "lab/stories"
_TIMES = PROJECT / "lab/times"
_DEFAULT_SECONDS = 40  # of a story that lab/times does not have
_BOOT_SECONDS = 15


@dataclasses.dataclass(frozen=True)
class Story:
    """A file of stories. It is run in `boots` boots of one disk, and in `guests` guests one after the other."""

    name: str
    boots: int = 1
    guests: int = 1
    seconds: float = _DEFAULT_SECONDS  # measured in a guest without other stories

    @property
    def needs_own_guest(self):
        return self.boots > 1 or self.guests > 1


@dataclasses.dataclass
class Job:
    """The job of one guest: these stories, in `boots` boots of a disk of its own."""

    name: str
    stories: list
    boots: int = 1

    @property
    def seconds(self):
        return self.boots * _BOOT_SECONDS + sum(story.seconds for story in self.stories)


def measured_times():
    """Story name to seconds, as the last recorded run measured them."""
    if not _TIMES.exists():
        return {}
    rows = [line.split() for line in _TIMES.read_text(encoding="ascii").splitlines() if not line.startswith("#")]
    return {name: float(seconds) for seconds, name in rows}


def record_times(times):
    rows = "".join(f"{seconds:6.0f} {name}\n" for name, seconds in sorted({**measured_times(), **times}.items()))
    _TIMES.write_text(f"# Seconds that each story took; written by lab/run --record.\n{rows}", encoding="ascii")


def _constants(path):
    """The module's constants BOOTS and GUESTS."""
    found = {}
    for node in ast.parse(path.read_text(encoding="utf-8")).body:
        if isinstance(node, ast.Assign) and isinstance(node.value, ast.Constant):
            found[node.targets[0].id] = node.value.value
    return {field: found[name] for name, field in (("BOOTS", "boots"), ("GUESTS", "guests")) if name in found}


def find(names):
    """The named stories, or all of them. Raises LabError for an unknown name."""
    times = measured_times()
    known = {path.stem: path for path in sorted(FOLDER.glob("*.py"))}
    for name in names:
        if name not in known:
            raise LabError(f"there is no story \"{name}\"; there are: {' '.join(known)}", status=2)
    return [Story(name, **_constants(known[name]), seconds=times.get(name, _DEFAULT_SECONDS))
            for name in names or known]


def _jobs_of_their_own(story):
    numbers = range(1, story.guests + 1)
    return [Job(story.name if story.guests == 1 else f"{story.name}-{number}", [story], story.boots)
            for number in numbers]


def plan(stories, lanes):
    """Jobs for guests of which `lanes` run at a time, the longest first. Single-boot stories share a guest per lane.

    >>> told = [Story("a", seconds=90), Story("b", seconds=50), Story("c", boots=2, guests=2, seconds=10)]
    >>> [(job.name, [story.name for story in job.stories], job.boots) for job in plan(told, lanes=2)]
    [('guest1', ['a'], 1), ('guest2', ['b'], 1), ('c-1', ['c'], 2), ('c-2', ['c'], 2)]
    """
    jobs = [job for story in stories if story.needs_own_guest for job in _jobs_of_their_own(story)]
    shared = [Job(f"guest{number}", []) for number in range(1, lanes + 1)]
    loads = {id(job): job.seconds for job in shared}
    for job in sorted(jobs, key=lambda job: -job.seconds):  # the jobs of the lanes besides their shared guest
        loads[min(loads, key=loads.get)] += job.seconds
    for story in sorted(stories, key=lambda story: (-story.seconds, story.name)):
        if not story.needs_own_guest:
            job = min(shared, key=lambda job: loads[id(job)])
            job.stories.append(story)
            loads[id(job)] += story.seconds
    return sorted((job for job in jobs + shared if job.stories), key=lambda job: -job.seconds)


def share_of(stories, budget, turn):
    """The stories of turn number `turn` (any integer) and the number of turns. Together the turns reach every story;
    each takes at most `budget` seconds of guests, unless one story alone takes more.

    >>> told = [Story(name, seconds=seconds) for name, seconds in (("a", 500), ("b", 60), ("c", 70), ("d", 80))]
    >>> [[story.name for story in share_of(told, 200, turn)[0]] for turn in (0, 1, 2, 3)]
    [['a'], ['d', 'c'], ['b'], ['a']]
    """
    turns = []
    for story in sorted(stories, key=lambda story: (-_cost(story), story.name)):
        fitting = [group for group in turns if sum(map(_cost, group)) + _cost(story) <= budget]
        if fitting:
            min(fitting, key=lambda group: sum(map(_cost, group))).append(story)
        else:
            turns.append([story])
    return turns[turn % len(turns)], len(turns)


def _cost(story):
    boots = story.guests * story.boots * _BOOT_SECONDS if story.needs_own_guest else 0
    return boots + story.guests * story.seconds
