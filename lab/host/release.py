"""The release of Debian that a guest runs. What a guest consists of is made in a system of its release: on this machine,
if that is its release, otherwise in a minimal system (scripts/system), which only root can use."""

import os
import pathlib
import platform
import shutil

from host import guest, process
from host.cache import PROJECT


class Release:
    """A release, by its code name."""

    def __init__(self, name):
        self.name = name
        self.is_here = platform.freedesktop_os_release().get("VERSION_CODENAME") == name
        systems = pathlib.Path(os.environ.get("VORN_SYSTEMS") or PROJECT / "build/systems").absolute()
        self._build = systems / name / "build"  # the build folder of the minimal system

    def _run(self, log, *command):
        system = [] if self.is_here else [str(PROJECT / "scripts/system"), self.name]
        process.build([*system, *command], log, cwd=PROJECT)

    def packages(self):
        """Builds the packages of the product for this release. Returns their paths."""
        self._run(guest.WORK / "package.log", "packaging/build")
        if self.is_here:
            return guest.packages_of(PROJECT / "build")
        # Other checkouts may build in the same system.
        kept = guest.WORK / f"packages-{self.name}"
        shutil.rmtree(kept, ignore_errors=True)
        kept.mkdir()
        return [pathlib.Path(shutil.copy(package, kept)) for package in guest.packages_of(self._build)]

    def fill(self, folder, program, jobs, log):
        """Runs a program that fills an empty folder and needs what these jobs of scripts/setup install."""
        if self.is_here:
            self._run(log, program, str(folder))
            return
        # The system sees its own build folder only, which may be on another file system.
        made = self._build / "lab"
        shutil.rmtree(made, ignore_errors=True)
        made.mkdir(parents=True)
        self._run(log, "sh", "-ec", f"apt-get -q update; scripts/setup {' '.join(jobs)}; {program} build/lab")
        process.output_of("cp", "--recursive", "--preserve", "--sparse=always", f"{made}/.", str(folder))
        shutil.rmtree(made)
