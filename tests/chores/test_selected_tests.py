"""./dev check: which tests a change touches, and which clang-tidy looks at again."""

import json
import os
import subprocess
from pathlib import Path
from typing import Dict, Iterator, List, Set, Tuple

import pytest
from compile_commands import compile_commands
from ninja_files import touched
from select_tests import PYTHON_TESTS

ROOT = Path(__file__).resolve().parents[2]
PYTHON = "/usr/bin/python3"

# A library of two sources, one of which includes the header, and a test program for each.
RULES = """
rule cc
  command = g++ -MD -MF $out.d -c $in -o $out
  depfile = $out.d
  deps = gcc
rule link
  command = g++ $in -o $out

build one.o: cc ../one.cpp
build two.o: cc ../two.cpp
build one_test: link one.o
build two_test: link two.o
"""


@pytest.fixture
def tree(tmp_path: Path) -> Path:
    (tmp_path / "include").mkdir()
    (tmp_path / "include/seen.h").write_text("inline int seen() { return 0; }\n")
    (tmp_path / "include/unseen.h").write_text("inline int unseen() { return 0; }\n")
    (tmp_path / "one.cpp").write_text('#include "include/seen.h"\nint main() { return seen(); }\n')
    (tmp_path / "two.cpp").write_text("int main() { return 0; }\n")
    (tmp_path / ".clang-tidy").write_text("Checks: '-*'\n")
    folder = tmp_path / "build"
    folder.mkdir()
    (folder / "build.ninja").write_text(RULES)
    entries = [
        f'{{"directory": "{folder}", "file": "{tmp_path}/{name}.cpp",'
        f' "command": "g++ -c ../{name}.cpp -o {name}.o"}}'
        for name in ("one", "two")
    ]
    (folder / "compile_commands.json").write_text(f"[{', '.join(entries)}]")
    build(tmp_path)
    return tmp_path


def build(tree: Path) -> None:
    subprocess.run(["ninja", "-C", str(tree / "build")], check=True, stdout=subprocess.DEVNULL)


def run(program: str, *words: str, tree: Path, given: str = "") -> str:
    done = subprocess.run(
        [PYTHON, str(ROOT / "chores" / program), *words],
        cwd=tree,
        input=given,
        stdout=subprocess.PIPE,
        encoding="utf-8",
    )
    assert done.returncode == 0
    return done.stdout


def hashes(tree: Path) -> Dict[str, str]:
    printed = run("tidy_inputs.py", "build", "--", "one.cpp", "two.cpp", tree=tree)
    return {name: found for name, found in map(str.split, printed.splitlines())}


def changed_hashes(tree: Path, before: Dict[str, str]) -> Set[str]:
    after = hashes(tree)
    return {name for name in after if after[name] != before[name]}


@pytest.mark.parametrize(
    "file, again",
    [
        ("include/seen.h", {"one.cpp"}),
        ("include/unseen.h", set()),
        ("two.cpp", {"two.cpp"}),
        (".clang-tidy", {"one.cpp", "two.cpp"}),
    ],
)
def test_tidied_is_what_sees_a_change(tree: Path, file: str, again: Set[str]) -> None:
    before = hashes(tree)
    assert hashes(tree) == before
    with (tree / file).open("a") as changed:
        changed.write("\n// Another line.\n" if file.endswith((".h", ".cpp")) else "# more\n")
    build(tree)
    assert changed_hashes(tree, before) == again


def test_what_was_never_compiled_depends_on_every_header(tree: Path) -> None:
    (tree / "build/one.o").unlink()
    (tree / "build/.ninja_deps").unlink()
    before = hashes(tree)
    (tree / "include/unseen.h").write_text("// Another one.\n")
    assert changed_hashes(tree, before) == {"one.cpp", "two.cpp"}


@pytest.mark.parametrize(
    "file, targets",
    [("include/seen.h", ["one_test"]), ("include/unseen.h", []), ("two.cpp", ["two_test"])],
)
def test_a_program_is_touched_by_what_it_is_made_of(
    tree: Path, file: str, targets: List[str]
) -> None:
    programs = ["one_test", "two_test"]
    assert sorted(touched(tree / "build", tree, programs, {tree / file})) == targets


def selected(*files: str) -> List[str]:
    given = "".join(f"{file}\n" for file in files)
    printed = run(
        "select_tests.py", os.environ["BUILD_DIR"], "changed", tree=ROOT, given=given
    ).splitlines()
    return [line for line in printed if not line.startswith("ctest ")] + [
        name for number, name in cxx_names() if f"ctest {number}" in printed
    ]


def cxx_names() -> Iterator[Tuple[int, str]]:
    command = ["ctest", "--test-dir", os.environ["BUILD_DIR"], "-N"]
    listed = subprocess.run(command, stdout=subprocess.PIPE, encoding="utf-8", check=True).stdout
    for line in listed.splitlines():
        if line.strip().startswith("Test ") and "#" in line:
            number, _, name = line.partition("#")[2].partition(": ")
            yield int(number), name


def test_a_change_of_a_helper_touches_the_tests_of_helpers() -> None:
    found = selected("helpers/failures.h")
    assert "python tests/module" in found and "python tests/contract" in found
    assert any(name.startswith("Reports.") for name in found)
    assert not any(name.startswith("InC/BitFieldTest.") for name in found)


def test_a_change_of_a_helper_touches_what_valgrind_looks_at() -> None:
    assert "valgrind.helpers" in selected("helpers/failures.h")


def test_a_change_of_a_test_touches_that_test() -> None:
    assert selected("tests/module/test_readme.py") == ["python tests/module/test_readme.py"]
    assert "python tests/module/test_readme.py" in selected("tests/support/console.py")
    assert selected("tests/module/conftest.py") == ["python tests/module"]


def test_a_page_touches_no_program() -> None:
    assert selected("docs/guides/memory.md") == ["python tests/docs"]


def test_a_name_reaches_tests_in_c_plus_plus() -> None:
    printed = run(
        "select_tests.py", os.environ["BUILD_DIR"], "named", "reports and not count", tree=ROOT
    )
    names = [name for number, name in cxx_names() if f"ctest {number}\n" in printed]
    assert "Reports.AreMadeInTheModulesWords" in names
    assert all("reports" in name.lower() and "count" not in name.lower() for name in names)


def test_every_part_of_the_tree_says_what_it_touches() -> None:
    tops = {top.name for top in ROOT.iterdir() if not top.name.startswith(("build", "."))}
    assert tops - {"__pycache__"} <= set(PYTHON_TESTS)
    assert {name.split("/")[0] for name in PYTHON_TESTS} <= {*tops, ".ci"}
    for tests in PYTHON_TESTS.values():
        for test in tests:
            assert (ROOT / test).exists(), test


def test_each_source_has_a_command_where_several_are_one(tmp_path: Path) -> None:
    together = tmp_path / "made/Unity/unity_0_cxx.cxx"
    together.parent.mkdir(parents=True)
    together.write_text('#include "/tree/one.cpp"\n\n#include "/tree/two.cpp"\n')
    alone, made = "/tree/alone.cpp", "made/Unity/unity_0_cxx.cxx.o"
    commands = [
        {"directory": str(tmp_path), "file": file, "command": f"g++ -DX -o {made} -c {file}"}
        for file in (str(together), alone)
    ]
    (tmp_path / "compile_commands.json").write_text(json.dumps(commands))
    found = {one["file"]: one["command"] for one in compile_commands(tmp_path)}
    assert found == {
        file: f"g++ -DX -o {made} -c {file}" for file in ("/tree/one.cpp", "/tree/two.cpp", alone)
    }
