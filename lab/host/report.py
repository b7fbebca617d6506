"""The results and times of a run, as a table."""

import collections
import xml.etree.ElementTree

from host.guest import WORK


def _cases(job):
    for path in sorted((WORK / job.name).glob("results-*.xml")):
        try:
            yield from xml.etree.ElementTree.parse(path).getroot().iter("testcase")
        except xml.etree.ElementTree.ParseError:
            continue  # a guest that died while it wrote


def _state(case):
    for tag in ("failure", "error"):
        if case.find(tag) is not None:
            return "failed"
    skipped = case.find("skipped")
    if skipped is not None:
        return "pending" if "xfail" in skipped.get("type", "") else "skipped"
    return "passed"


def by_story(jobs):
    """Story name to a counter of states and seconds, over all guests that ran it."""
    result = {}
    for job in jobs:
        for case in _cases(job):
            counts = result.setdefault(case.get("classname").split(".")[-1], collections.Counter())
            counts[_state(case)] += 1
            counts["seconds"] += float(case.get("time"))
    return result


def table(jobs):
    """A line per story, the longest first."""
    rows = [f"{'story':24} {'seconds':>7} {'passed':>6} {'failed':>6} {'pending':>7} {'skipped':>7}"]
    for name, counts in sorted(by_story(jobs).items(), key=lambda item: -item[1]["seconds"]):
        rows.append(f"{name:24} {counts['seconds']:7.0f} {counts['passed']:6.0f} {counts['failed']:6.0f} "
                    f"{counts['pending']:7.0f} {counts['skipped']:7.0f}")
    return "\n".join(rows) + "\n"


def seconds(jobs):
    """Story name to the seconds that it took in one guest, for stories without a failure."""
    told = collections.Counter(name for job in jobs for name in {story.name for story in job.stories})
    return {name: counts["seconds"] / told[name] for name, counts in by_story(jobs).items() if not counts["failed"]}


def failed(job):
    """The names of the stories that failed in the job's guest."""
    return sorted({case.get("name") for case in _cases(job) if _state(case) == "failed"})
