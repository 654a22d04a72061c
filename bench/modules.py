"""Measures modules as a whole: what one costs to import, to keep, to ship and to compile."""

import resource
import shlex
import shutil
import subprocess
import sys
import sysconfig
from pathlib import Path
from typing import Callable, Dict, List, NamedTuple

from calls import PeerMissing

ROOT = Path(__file__).resolve().parents[1]

IMPORT = """
import sys
from time import process_time_ns
sys.path.insert(0, sys.argv[1])
started = process_time_ns()
if len(sys.argv) > 2:
    __import__(sys.argv[2])
taken = process_time_ns() - started
private = 0
for line in open("/proc/self/smaps_rollup"):
    if line.startswith(("Private_Clean:", "Private_Dirty:")):
        private += int(line.split()[1])
print(taken, private)
"""

COMPILE = ["-O2", "-DNDEBUG", "-fPIC", "-fvisibility=hidden", "-w", "-c", "-o", "/dev/null"]

TITLES = {
    "import": "import, milliseconds",
    "memory": "private memory after it, KiB",
    "size": "size, KiB",
    "size_stripped": "size without symbols, KiB",
    "compile": "compiling the C, seconds",
}
"""The keys of all figures, with what reports call them."""


class Module(NamedTuple):
    """A module of the whole surface: where it is, its name, and the C it is made of, if any."""

    folder: Path
    name: str
    source: Path


def modules(build: Path) -> Dict[str, Module]:
    """The module and its peers."""
    bench, nothing = build / "bench", Path()
    surfaces = bench / "surfaces"
    ours = build / "interface" / "libvswitch_wrap.c"
    return {
        "ours": Module(build / "python", "_libvswitch", ours),
        "twin": Module(bench / "twin", "_libvswitch", ours),
        "handwritten": Module(surfaces, "handwritten_surface", bench / "handwritten_surface.c"),
        "stock": Module(surfaces, "_stock_surface", bench / "stock_surface_wrap.c"),
        "ctypes": Module(surfaces, "ctypes_surface", nothing),
    }


def staged(known: Dict[str, Module], folder: Path) -> Dict[str, Module]:
    """Copy all modules alike: how a file came to be decides how it lies in memory."""
    shutil.rmtree(folder, ignore_errors=True)
    copies = {}
    for key, module in known.items():
        copies[key] = module._replace(folder=folder / key)
        copies[key].folder.mkdir(parents=True)
        shutil.copy(_library(module), copies[key].folder)
    return copies


Values = Dict[str, Dict[str, List[float]]]
"""For each figure and module, what was measured, each time."""


def measure(
    build: Path, *, processes: int, compilations: int, progress: Callable[[str], None]
) -> Values:
    """Measure everything; modules take turns, and each import has a process of its own."""
    known = staged(modules(build), build / "bench" / "staged")
    values: Values = {figure: {} for figure in TITLES}
    for figure in ("import", "memory"):
        values[figure] = {key: [] for key in known}
    for turn in range(processes + 1):
        progress(f"imports, turn {turn + 1} of {processes + 1}")
        _, nothing = _import(build)
        for key, module in known.items():
            taken, private = _import(build, str(module.folder), module.name)
            # The first turn brings files into memory, and Python's own into its cache.
            if turn > 0:
                values["import"][key].append(taken / 1e6)
                values["memory"][key].append(private - nothing)
    for key, module in known.items():
        if key not in ("ctypes", "twin"):
            values["size"][key] = [_library(module).stat().st_size / 1024]
            values["size_stripped"][key] = [_stripped_size(build, _library(module)) / 1024]
            values["compile"][key] = []
    for turn in range(compilations):
        for key in values["compile"]:
            progress(f"compilations, turn {turn + 1} of {compilations}: {known[key].source.name}")
            values["compile"][key].append(_compilation(known[key].source))
    return values


def _import(build: Path, *arguments: str) -> List[int]:
    """Nanoseconds of an import and KiB of private memory after it; without one, what is left."""
    command = [sys.executable, "-IS", "-c", IMPORT, *(arguments or ("",))]
    host = str(build / "bench" / "null_host")
    answer = subprocess.run(
        command, env={"LD_LIBRARY_PATH": host}, stdout=subprocess.PIPE, text=True
    )
    if answer.returncode != 0:
        raise PeerMissing(f"{shlex.join(arguments)} cannot be imported")
    taken, private = map(int, answer.stdout.split())
    return [taken, private]


def _library(module: Module) -> Path:
    """The module's own file; stubs for type checkers may lie beside it."""
    (path,) = (p for p in module.folder.glob(f"{module.name}.*") if p.suffix != ".pyi")
    return path


def _stripped_size(build: Path, library: Path) -> int:
    stripped = build / "bench" / "stripped.so"
    subprocess.run(["strip", "-o", stripped, library], check=True)
    size = stripped.stat().st_size
    stripped.unlink()
    return size


def _compilation(source: Path) -> float:
    """Seconds of the processor that it takes to compile a file."""
    contract = ROOT / "bench" / "peers" / "handwritten"
    folders = [sysconfig.get_path("include"), ROOT / "include", ROOT, contract]
    before = resource.getrusage(resource.RUSAGE_CHILDREN)
    subprocess.run(["cc", *COMPILE, *(f"-I{folder}" for folder in folders), source], check=True)
    after = resource.getrusage(resource.RUSAGE_CHILDREN)
    return (after.ru_utime + after.ru_stime) - (before.ru_utime + before.ru_stime)
