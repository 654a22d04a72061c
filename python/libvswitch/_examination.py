"""Looks at interpreter, module and host, and finds what is wrong with them.

At the files first: the module is loaded in a child process only, so that nothing which is wrong
with it or with the host's libraries can end the examination.
"""

import dataclasses
import json
import os
import platform
import subprocess
import sys
import sysconfig
import tempfile
from importlib.machinery import EXTENSION_SUFFIXES, PathFinder
from pathlib import Path
from typing import Any, Dict, List, Optional, Set

from libvswitch import _children, _elf, _examined, _frames_examined, _loader

MODULE = "_libvswitch"
HOST = ("libvswitch.so", "libnebPublic.so")
OK, NOTE, WARNING, ERROR = "ok", "note", "warning", "error"
_BUILD = "build one with ./dev build, or put its folder in PYTHONPATH"
_SHOWN_SYMBOLS = 5
_STATE, _SCENARIO = "SIMHOST_STATE", "SIMHOST_SCENARIO"


@dataclasses.dataclass
class Finding:
    level: str
    about: str
    text: str
    advice: str = ""


@dataclasses.dataclass
class Report:
    interpreter: Dict[str, str] = dataclasses.field(default_factory=dict)
    module: Optional[str] = None
    host: Dict[str, Optional[str]] = dataclasses.field(default_factory=dict)
    simulated: Optional[bool] = None
    simulation: Dict[str, Optional[str]] = dataclasses.field(default_factory=dict)
    missing_symbols: List[str] = dataclasses.field(default_factory=list)
    findings: List[Finding] = dataclasses.field(default_factory=list)

    def add(self, level: str, about: str, text: str, advice: str = "") -> None:
        self.findings.append(Finding(level, about, text, advice))

    @property
    def is_well(self) -> bool:
        return all(finding.level != ERROR for finding in self.findings)


def examine() -> Report:
    report = Report()
    _interpreter(report)
    module = _module(report)
    if module is None:
        return report
    libraries = _host(report, module)
    _symbols(report, module, libraries)
    _load(report)
    if report.simulated:
        _simulation(report)
        for found in _frames_examined.examine(report.simulation[_STATE]):
            report.add(*found)
    return report


def _interpreter(report: Report) -> None:
    report.interpreter = {
        "executable": sys.executable,
        "version": platform.python_version(),
        "interface": str(sysconfig.get_config_var("SOABI")),
        "machine": platform.machine(),
    }
    text = f"{sys.executable}, {platform.python_version()} ({report.interpreter['interface']})"
    report.add(OK, "interpreter", text)


def _module(report: Report) -> Optional[_elf.Elf]:
    spec = PathFinder.find_spec(MODULE)
    if spec is None or not spec.origin:
        others = _of_other_interpreters()
        if others:
            report.add(
                ERROR,
                "module",
                f"{others[0]} is for another interpreter than {sys.executable}, which loads "
                f"{' or '.join(EXTENSION_SUFFIXES)}",
                "run the interpreter it was built for, or ./dev build --python with this one",
            )
        else:
            report.add(ERROR, "module", f"no {MODULE} in {_shown(sys.path)}", _BUILD)
        return None
    report.module = spec.origin
    try:
        elf = _elf.read(Path(spec.origin))
    except (OSError, _elf.NotElf) as error:
        report.add(ERROR, "module", f"cannot be read: {error}", _BUILD)
        return None
    if elf.machine != platform.machine():
        report.add(
            ERROR,
            "module",
            f"{spec.origin} is for {elf.machine}, this machine is {platform.machine()}",
            "build it on this machine",
        )
        return None
    report.add(OK, "module", spec.origin)
    return elf


def _of_other_interpreters() -> List[Path]:
    return [
        file
        for folder in sys.path
        for file in sorted(Path(folder or ".").glob(f"{MODULE}*.so"))
        if file.is_file()
    ]


def _shown(folders: List[str]) -> str:
    return ", ".join(folder or "the current folder" for folder in folders)


def _host(report: Report, module: _elf.Elf) -> List[_elf.Elf]:
    """The host's libraries where the loader will find them."""
    found = []
    for name in HOST:
        report.host[name] = None
        if name not in module.needed:
            report.add(WARNING, "host", f"the module does not ask for {name}", _BUILD)
        library = _library(report, name, module)
        if library is not None:
            report.host[name] = str(library.path)
            report.add(OK, "host", f"{name}: {library.path}")
            found.append(library)
    return found


def _library(report: Report, name: str, module: _elf.Elf) -> Optional[_elf.Elf]:
    """The file that the loader takes: it passes over those that are for other machines or not to
    be read, and stops at one that is no library."""
    for path in _loader.candidates(name, module):
        try:
            machine = _elf.machine_of(path)
            if machine == module.machine:
                return _elf.read(path)
            why = f"is for {machine}, the module for {module.machine}"
        except PermissionError:
            why = "may not be read"
        except (OSError, _elf.NotElf) as error:
            what = f"{path} is a folder" if path.is_dir() else str(error)
            report.add(
                ERROR,
                "host",
                f"{name}: {what}",
                "put this host's own library there, or take its folder out of LD_LIBRARY_PATH",
            )
            return None
        report.add(NOTE, "host", f"{name}: {path} {why}: the loader passes over it")
    report.add(
        ERROR,
        "host",
        f"{name} is nowhere the loader looks",
        "point LD_LIBRARY_PATH at the folder that holds it, or get the simulated host: the "
        "package libvswitch-simhost, or ./dev build",
    )
    return None


def _symbols(report: Report, module: _elf.Elf, libraries: List[_elf.Elf]) -> None:
    """Whether the host has every call that the module makes."""
    if len(libraries) < len(HOST):
        return
    others = _offered_by_others(module)
    wanted = {name for name in module.wanted - others if not name.startswith(("Py", "_Py"))}
    offered: Set[str] = set()
    for library in libraries:
        offered |= library.defined
    report.missing_symbols = sorted(wanted - offered)
    if report.missing_symbols:
        report.add(
            ERROR,
            "symbols",
            f"the host lacks {len(report.missing_symbols)} of {len(wanted)} calls: "
            f"{_first(report.missing_symbols)}",
            "the host's libraries are older than this module: update the host, or build the module "
            "against them",
        )
    else:
        report.add(OK, "symbols", f"the host has all {len(wanted)} calls")


def _offered_by_others(module: _elf.Elf) -> Set[str]:
    """What the libraries define that the module asks for beside the host's: sanitizers, for one."""
    names: Set[str] = set()
    for needed in set(module.needed) - set(HOST):
        for path in _loader.candidates(needed, module):
            try:
                library = _elf.read(path)
            except (OSError, _elf.NotElf):
                continue
            if library.machine == module.machine:
                names |= library.defined
                break
    return names


def _first(names: List[str]) -> str:
    shown, more = ", ".join(names[:_SHOWN_SYMBOLS]), len(names) - _SHOWN_SYMBOLS
    return f"{shown} and {more} more, all of which --json names" if more > 0 else shown


def _load(report: Report) -> None:
    """What a child finds that loads the module as a tool would."""
    try:
        done = _children.run(_children.LOADING, dict(os.environ))
    except (OSError, subprocess.SubprocessError) as error:
        report.add(ERROR, "loading", f"no child process could load the module: {error}")
        return
    found: Dict[str, Any] = {}
    for line in done.stdout.decode("utf-8", "replace").splitlines():
        try:
            found = json.loads(line)
        except ValueError:
            continue  # what the libraries print on their own
    if done.returncode != 0 and "sizes" not in found:
        _not_loaded(report, done.returncode, done.stderr.decode("utf-8", "replace"), found)
    if found:
        _loaded(report, [Path(name) for name in found["files"]])
    if "sizes" in found:
        _sizes(report, found["sizes"])


def _not_loaded(report: Report, status: int, errors: str, found: Dict[str, Any]) -> None:
    what = f"{MODULE} loads, its classes do not" if found else f"{MODULE} does not load"
    if status < 0:
        report.add(
            ERROR,
            "loading",
            f"{what}: {_children.end(status, errors)}",
            "the host's libraries fail as they start: see what they log, or try the simulated host",
        )
        return
    advice = "" if any(one.level == ERROR for one in report.findings) else _BUILD
    report.add(ERROR, "loading", f"{what}: {_children.end(status, errors)}", advice or "see above")


def _loaded(report: Report, files: List[Path]) -> None:
    """Which libraries it really was, and whether they simulate."""
    simulated = False
    for file in files:
        if file.name in HOST:
            expected = report.host.get(file.name)
            if expected and not os.path.samefile(expected, file):
                report.add(WARNING, "host", f"{file.name} was loaded from {file} after all")
            report.host[file.name] = str(file)
        try:
            if not simulated and not file.name.startswith(("libc.", "libpython")):
                names = _elf.read(file).defined
                simulated = any(name.startswith("simhost_") for name in names)
        except (OSError, _elf.NotElf):
            continue  # gone since, or nothing to look into
    report.simulated = simulated
    report.add(OK, "host", "the host is simulated" if simulated else "the host is a real one")


def _sizes(report: Report, sizes: Dict[str, List[int]]) -> None:
    """Whether module and classes lay out records alike, as far as the allocator can tell."""
    wrong = sorted(name for name, (made, plain) in sizes.items() if made != plain)
    if wrong or not sizes:
        report.add(
            ERROR,
            "records",
            f"module and classes disagree on the size of {', '.join(wrong) or 'all records'}",
            "they are of different builds: install both from one",
        )
    else:
        report.add(OK, "records", f"module and classes agree on the size of {len(sizes)} records")


def _simulation(report: Report) -> None:
    """What the simulated host is told by its variables, and whether a call succeeds then."""
    state, scenario = (os.environ.get(name) or None for name in (_STATE, _SCENARIO))
    report.simulation = {_STATE: state, _SCENARIO: scenario}
    kept = f"is {state}: the host is kept there" if state else "is not set: the host is in memory"
    fresh = f"{scenario}, where it is described" if scenario else "not set: it is the usual one"
    report.add(OK, "simulation", f"{_STATE} {kept}")
    report.add(OK, "simulation", f"for a fresh host {_SCENARIO} is {fresh}")

    try:
        with tempfile.TemporaryDirectory() as folder:
            why = _first_call(state, scenario, Path(folder))
    except (_examined.NotExamined, OSError, subprocess.SubprocessError) as error:
        why = str(error)
    if not why:
        report.add(OK, "simulation", "a call of the host succeeds")
        return
    named = " and ".join(name for name, value in report.simulation.items() if value)
    advice = f"correct what {named} tells the host, or unset it" if named else _BUILD
    report.add(ERROR, "simulation", f"no call of the host succeeds: {why}", advice)


def _first_call(state: Optional[str], scenario: Optional[str], folder: Path) -> str:
    """Why no call succeeds on a host that is told so; empty if one does."""
    environment = dict(os.environ)
    if scenario and os.path.exists(scenario) and not os.path.isdir(scenario):
        _examined.require_plain(Path(scenario))
    copy = ""
    if state and _can_be_made(Path(state)):
        # A host that is examined in memory is not there afterwards.
        del environment[_STATE]
    elif state and os.path.exists(state) and not os.path.isdir(state):
        copy = str(_examined.copy_of_state(Path(state), folder))
        environment[_STATE] = copy
    done = _children.run(_children.CALLING, environment)
    if done.returncode == 0:
        return ""
    why = _children.end(done.returncode, done.stderr.decode("utf-8", "replace"))
    return why.replace(copy, str(state)) if copy else why


def _can_be_made(file: Path) -> bool:
    return not file.exists() and os.access(str(file.parent), os.W_OK | os.X_OK)
