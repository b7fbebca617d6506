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
        self._systems = pathlib.Path(os.environ.get("VORN_SYSTEMS") or PROJECT / "build/systems").absolute()
        self._build = self._systems / name / "build"  # the build folder of the minimal system

    def _run(self, log, *command, tree=PROJECT):
        system = [] if self.is_here else [str(tree / "scripts/system"), self.name]
        process.build([*system, *command], log, cwd=tree, env={**os.environ, "VORN_SYSTEMS": str(self._systems)})

    def packages(self, log, tree=PROJECT):
        """Builds the packages of the product in the folder `tree` for this release. Returns their paths."""
        if self.is_here:
            self._run(log, "packaging/build", tree=tree)
            return guest.packages_of(tree / "build")
        # Others may build in the same system as soon as the command has ended.
        made, kept = f"packages-{log.stem}", log.parent / f"{log.stem}-{self.name}"
        self._run(log, "sh", "-ec", f"packaging/build; rm -rf build/{made}; mkdir -p build/{made}/package; "
                  f"cp build/package/*.deb build/{made}/package", tree=tree)
        shutil.rmtree(kept, ignore_errors=True)
        shutil.copytree(self._build / made, kept)
        return guest.packages_of(kept)

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
