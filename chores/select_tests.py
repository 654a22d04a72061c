"""Chooses the tests that a change touches, or those with a name.

    select_tests.py FOLDER changed <FILES     FILES has the path of a changed file in each line
    select_tests.py FOLDER named EXPRESSION   as for pytest's -k

Prints a word and what it is about in each line: `ctest` and the number of a C++ test, `python` and
a file or a folder of Python tests. FOLDER is the build folder, and everything is built in it.
"""

import json
import re
import subprocess
import sys
from pathlib import Path
from typing import Dict, Iterator, List, NamedTuple, Set

from _pytest.mark.expression import Expression
from ninja_files import touched

ROOT = Path.cwd()

# Which Python tests a change below a path may break; of several the longest path counts. What is
# tried at random or takes long is for ./dev test: sequences, fuzzers, sweeps, peers, packages.
PYTHON_TESTS: Dict[str, List[str]] = {
    ".ci": [],
    "CHANGELOG.md": ["tests/chores"],
    "CMakeLists.txt": ["tests/module", "tests/simhost", "tests/chores"],
    "CONTRIBUTING.md": ["tests/docs"],
    "README.md": ["tests/module/test_readme.py", "tests/docs", "tests/chores"],
    "VERSION": ["tests/chores", "tests/docs"],
    "bench": ["tests/docs/test_documents.py"],
    "chores": ["tests/chores"],
    "cmake": ["tests/frame", "tests/module", "tests/simhost"],
    "dev": ["tests/chores"],
    "docs": ["tests/docs"],
    "examples": ["tests/examples"],
    "helpers": ["tests/module", "tests/contract"],
    "include": ["tests/docs", "tests/module/test_surface.py", "tests/contract"],
    "interface": [
        "tests/frame",
        "tests/module",
        "tests/contract",
        "tests/classes",
        "tests/vswitch",
        "tests/recordings",
    ],
    "packaging": ["tests/docs/test_documents.py", "tests/command/test_manual_page.py"],
    "pyproject.toml": [],
    "python": ["tests/classes", "tests/vswitch", "tests/docs/test_catalogue.py"],
    "python/vswitch": ["tests/vswitch", "tests/command"],
    "python/vswitch/_replayer.py": ["tests/recordings"],
    "python/vswitch/documents.py": ["tests/vswitch", "tests/command", "tests/fabric"],
    "python/vswitch/fabric": ["tests/fabric"],
    "python/vswitch/watch.py": ["tests/vswitch", "tests/command", "tests/fabric"],
    "python/vswitch/allowing.py": ["tests/recordings"],
    "python/vswitch/command": ["tests/command"],
    "python/vswitch/command/changing.py": ["tests/command", "tests/fabric"],
    "python/vswitch/command/places.py": ["tests/command", "tests/fabric"],
    "python/vswitch/command/fabric": ["tests/fabric", "tests/command/test_manual_page.py"],
    "python/vswitch/likeness.py": ["tests/recordings"],
    "python/vswitch/_front.py": ["tests/recordings", "tests/command/test_playing.py"],
    "python/vswitch/playing.py": ["tests/recordings", "tests/command/test_playing.py"],
    "python/vswitch/recording.py": ["tests/recordings"],
    "python/vswitch/replay.py": ["tests/recordings"],
    "python/vswitch/trace.py": ["tests/recordings"],
    "recordings": ["tests/recordings"],
    "setup.py": ["tests/chores"],
    "simhost": ["tests/simhost", "tests/docs/test_statuses.py"],
    "simhost/python": ["tests/simhost", "tests/examples", "tests/plugin"],
    "tests": [],
    "tests/README.md": ["tests/docs/test_documents.py"],
}


class CxxTest(NamedTuple):
    number: int
    name: str
    program: str


def cxx_tests(folder: Path) -> List[CxxTest]:
    command = ["ctest", "--test-dir", str(folder), "--show-only=json-v1"]
    told = subprocess.run(command, stdout=subprocess.PIPE, check=True).stdout
    return [
        CxxTest(number, one["name"], program_of(one["command"], folder))
        for number, one in enumerate(json.loads(told)["tests"], start=1)
    ]


def program_of(command: List[str], folder: Path) -> str:
    """The target of the build that a test's command runs, by itself or under a tool."""
    ours = (Path(word) for word in command if Path(word).is_file())
    programs = [path for path in ours if folder in path.parents]
    return str(programs[0].relative_to(folder)) if programs else ""


def touched_cxx_tests(folder: Path, changed: Set[Path]) -> List[CxxTest]:
    tests = cxx_tests(folder)
    # The files that say how things are built are no inputs of what is built.
    if any(path.name == "CMakeLists.txt" or path.suffix == ".cmake" for path in changed):
        return tests
    programs = {one.program for one in tests} - {""}
    anew = touched(folder, ROOT, programs, changed)
    return [one for one in tests if one.program in anew]


def importers() -> Dict[str, Set[Path]]:
    """Who imports a module of the tests, by the module's name."""
    found: Dict[str, Set[Path]] = {}
    for path in (ROOT / "tests").rglob("*.py"):
        text = path.read_text(encoding="utf-8")
        for name in re.findall(r"^(?:import|from) (\w+)", text, re.MULTILINE):
            found.setdefault(name, set()).add(path)
    return found


def tests_that_use(changed: Path) -> Set[Path]:
    """The tests of a changed file of tests/: itself, or those that it serves."""
    if changed.name.startswith("test_"):
        return {changed} if changed.exists() else set()
    if changed.name == "conftest.py" or changed.suffix != ".py":
        return {changed.parent} if any(changed.parent.glob("test_*.py")) else set()
    by_module = importers()
    seen: Set[Path] = set()
    waiting = [changed]
    while waiting:
        module = waiting.pop()
        new = by_module.get(module.stem, set()) - seen
        seen |= new
        waiting += new
    return {path for path in seen if path.name.startswith("test_")}


def python_tests(changed: Path) -> Set[Path]:
    place = changed.relative_to(ROOT)
    found = set()
    for top in (str(place), *map(str, place.parents)):
        if top in PYTHON_TESTS:
            found = {ROOT / test for test in PYTHON_TESTS[top]}
            break
    if place.parts[0] == "tests":
        found |= tests_that_use(changed)
    return found


def without_parts(paths: Set[Path]) -> Iterator[Path]:
    """The paths, without those that lie in another one of them."""
    return (path for path in sorted(paths) if not paths & set(path.parents))


def main(folder: Path, chosen: str, words: List[str]) -> None:
    tests: List[CxxTest]
    if chosen == "named":
        expression = Expression.compile(words[0])
        tests = [
            one
            for one in cxx_tests(folder)
            if expression.evaluate(lambda part: part.lower() in one.name.lower())
        ]
    else:
        changed = {ROOT / line.rstrip("\n") for line in sys.stdin}
        tests = touched_cxx_tests(folder, changed)
        for path in without_parts({test for one in changed for test in python_tests(one)}):
            print("python", path.relative_to(ROOT))
    for test in tests:
        print("ctest", test.number)


if __name__ == "__main__":
    main(Path(sys.argv[1]).resolve(), sys.argv[2], sys.argv[3:])
