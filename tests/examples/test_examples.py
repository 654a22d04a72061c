"""The programs of examples/ run to their end, say what they do, and leave nothing behind."""

import argparse
import ast
import io
import os
import subprocess
import sys
from pathlib import Path
from typing import Dict, List, Optional

import pytest
from programs import EXAMPLES
from simhost import SharedHost

# These show something. The others are tools, with a test file each.
SHOWS = ["first_steps", "records", "tour"]
TOOLS = ["apply", "compliance", "failover_drill", "find_mac", "inventory", "mirror"]
# What they share.
SHARED = ["private_host"]


def test_every_example_is_run() -> None:
    assert sorted(example.stem for example in EXAMPLES.glob("*.py")) == sorted(
        SHOWS + TOOLS + SHARED
    )
    for tool in TOOLS:
        assert Path(__file__).with_name(f"test_{tool}.py").exists()


def lines_without_imports(source: str) -> int:
    body = ast.parse(source).body
    imports = (one for one in body if isinstance(one, (ast.Import, ast.ImportFrom)))
    without = {line for one in imports for line in range(one.lineno, (one.end_lineno or 0) + 1)}
    lines = enumerate(source.splitlines(), 1)
    return len([line for number, line in lines if line.strip() and number not in without])


def test_lines_are_counted() -> None:
    source = (
        '"""What it is."""\n\nimport io\nfrom os import (\n    path,\n)\n\n# why\nprint(io, path)\n'
    )
    assert lines_without_imports(source) == 3


@pytest.mark.parametrize("name", TOOLS)
def test_a_tool_is_short_and_ends_in_words(name: str) -> None:
    source = (EXAMPLES / f"{name}.py").read_text(encoding="utf-8")
    assert lines_without_imports(source) <= 25
    end = f'if __name__ == "__main__":\n    with vswitch.exits("{name}"):\n        main()\n'
    assert source.endswith(f"\n\n\n{end}")


@pytest.mark.parametrize("name", SHOWS)
def test_a_show_runs(shared_host: SharedHost, name: str) -> None:
    simhost = os.path.join(os.environ["BUILD_DIR"], "simhost")
    shared_host.environment["PATH"] = f"{simhost}{os.pathsep}{os.environ['PATH']}"
    done = shared_host.run([sys.executable, EXAMPLES / f"{name}.py"])
    assert (done.returncode, done.stderr) == (0, "")
    assert "memory leak" not in done.stdout
    assert len(done.stdout.splitlines()) > 10


def start(name: str, *words: str) -> "subprocess.CompletedProcess[str]":
    command: List[str] = [sys.executable, str(EXAMPLES / f"{name}.py"), *words]
    return subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE, encoding="utf-8")


@pytest.mark.parametrize("name", SHOWS + TOOLS)
def test_an_example_explains_itself(name: str) -> None:
    done = start(name, "--help")
    assert (done.returncode, done.stderr) == (0, "")
    usage, description = done.stdout.split("\n\n")[:2]
    assert usage.startswith(f"usage: {name}.py [-h]")
    assert description.endswith(".")


@pytest.mark.parametrize("name", SHOWS + TOOLS)
def test_an_example_refuses_a_wrong_command_line(name: str) -> None:
    done = start(name, "--no-such-option")
    assert (done.returncode, done.stdout) == (2, "")
    assert done.stderr.startswith(f"usage: {name}.py [-h]")


@pytest.mark.parametrize(
    "name, words, why",
    [
        ("failover_drill", ["v\udcff"], "no {!r} among the switches"),
        ("find_mac", ["\udcff"], "mac: {!r} is not six bytes such as 02:00:00:00:00:01"),
        ("inventory", ["v\udcff"], "no {!r} among the switches"),
        ("mirror", ["v\udcff", "web-1", "web-2"], "no {!r} among the switches"),
        ("mirror", ["vswitch0", "web-\udcff", "web-2"], "no {!r} among the ports of vswitch0"),
        ("mirror", ["vswitch0", "web-1", "web-\udcff"], "no {!r} among the ports of vswitch0"),
    ],
)
def test_a_name_that_is_no_utf_8(name: str, words: List[str], why: str) -> None:
    (word,) = [word for word in words if "\udcff" in word]
    done = start(name, *words)
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr.endswith(f"\n{name}: {why.format(word)}\n")


WRITING = [
    ("apply", [str(Path(__file__).with_name("document.json"))]),
    ("compliance", ["--fix"]),
    ("failover_drill", ["vswitch0"]),
    ("find_mac", ["02:00:00:00:01:02"]),
    ("first_steps", []),
    ("first_steps", ["--help"]),
    ("inventory", []),
    ("inventory", ["--help"]),
    ("inventory", ["--json"]),
    ("mirror", ["vswitch0", "web-1", "web-2", "--for", "0"]),
    ("records", []),
    ("tour", []),
]


# Those of them that leave the host changed.
CHANGING = {"apply", "compliance"}


def test_all_examples_write() -> None:
    assert {name for name, _ in WRITING} == {*SHOWS, *TOOLS}


@pytest.fixture(params=["", "1"], ids=["at once", "line by line"])
def writer(shared_host: SharedHost, request: pytest.FixtureRequest) -> Dict[str, str]:
    """The environment of a program, which writes what it prints at the end or as it prints."""
    simhost = os.path.join(os.environ["BUILD_DIR"], "simhost")
    path = f"{simhost}{os.pathsep}{os.environ['PATH']}"
    return {**shared_host.environment, "PATH": path, "PYTHONUNBUFFERED": request.param}


def parsers_hide_failures() -> bool:
    """Whether this interpreter's argparse tells nobody that a help could not be written."""

    class Unwritable(io.StringIO):
        def write(self, text: str) -> int:
            raise OSError(text)

    try:
        argparse.ArgumentParser().print_help(Unwritable())
    except OSError:
        return False
    return True


def is_unheard(writer: Dict[str, str], words: List[str]) -> bool:
    """Whether such a program is never told that it could not write."""
    return words == ["--help"] and bool(writer["PYTHONUNBUFFERED"]) and parsers_hide_failures()


@pytest.mark.parametrize("name, words", WRITING)
def test_a_reader_that_leaves_early(writer: Dict[str, str], name: str, words: List[str]) -> None:
    command = [sys.executable, str(EXAMPLES / f"{name}.py"), *words]
    # The reader has left before the program begins, so none of it can have reached the pipe.
    reader, pipe = os.pipe()
    os.close(reader)
    try:
        done = subprocess.run(command, env=writer, stdout=pipe, stderr=subprocess.PIPE)
    finally:
        os.close(pipe)
    # Who has read enough of a tool's output has what they want; a show is not at its end.
    is_well = name in TOOLS or is_unheard(writer, words)
    assert (done.returncode, done.stderr) == (0 if is_well else 1, b"")


@pytest.mark.parametrize("name, words", WRITING)
def test_a_full_disk(writer: Dict[str, str], name: str, words: List[str]) -> None:
    command = [sys.executable, str(EXAMPLES / f"{name}.py"), *words]
    with open("/dev/full", "w", encoding="ascii") as full:
        done = subprocess.run(
            command, env=writer, stdout=full, stderr=subprocess.PIPE, encoding="utf-8"
        )
    said = f"{name}: [Errno 28] No space left on device"
    told = (f"{said}\n", 1)
    if name in CHANGING:
        told = (f"{said}; what was changed stays changed\n", 3)
    # A show writes nothing once more at its end, and a full disk has no room even for that.
    is_untold = name in TOOLS and is_unheard(writer, words)
    assert (done.stderr, done.returncode) == (("", 0) if is_untold else told)


@pytest.mark.parametrize("state", [None, "", "host.db"])
@pytest.mark.parametrize("name, words", WRITING)
def test_a_host_that_nobody_else_sees_is_told(
    writer: Dict[str, str], tmp_path: Path, name: str, words: List[str], state: Optional[str]
) -> None:
    environment = {key: value for key, value in writer.items() if key != "SIMHOST_STATE"}
    if state is not None:
        environment["SIMHOST_STATE"] = state and str(tmp_path / state)
    done = subprocess.run(
        [sys.executable, str(EXAMPLES / f"{name}.py"), *words],
        env=environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        encoding="utf-8",
    )
    assert done.returncode == 0
    # Records touch no host, and the tour has a state file of its own.
    told = not state and name not in ("records", "tour") and words != ["--help"]
    said = f"{name}: this host is simulated and private to this process; set SIMHOST_STATE to"
    assert done.stderr.startswith(said) if told else done.stderr == ""


def test_a_host_that_is_not_simulated_is_none_of_these() -> None:
    program = "import private_host; private_host.tell('p'); print(private_host.is_simulated())"
    environment = {**os.environ, "PYTHONPATH": str(EXAMPLES)}
    environment.pop("SIMHOST_STATE", None)
    done = subprocess.run(
        [sys.executable, "-c", program],
        env=environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        encoding="utf-8",
    )
    assert (done.returncode, done.stdout, done.stderr) == (0, "False\n", "")


def test_the_first_steps_leave_no_switch(shared_host: SharedHost, writer: Dict[str, str]) -> None:
    before = shared_host.describe()["switches"]
    with open("/dev/full", "w", encoding="ascii") as full:
        command = [sys.executable, str(EXAMPLES / "first_steps.py")]
        subprocess.run(command, env=writer, stdout=full, stderr=subprocess.DEVNULL)
    assert shared_host.describe()["switches"] == before


def test_the_first_steps_touch_no_other_switch(shared_host: SharedHost) -> None:
    shared_host.apply({"switches": [{"alias": "demo-switch", "mtu": 4000}]})
    before = shared_host.describe()["switches"]
    done = shared_host.run([sys.executable, EXAMPLES / "first_steps.py"])
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr == "first_steps: no switch 'demo-switch' could be made: Exists\n"
    assert shared_host.describe()["switches"] == before


def test_a_tour_without_its_guide(shared_host: SharedHost, tmp_path: Path) -> None:
    shared_host.environment["PATH"] = str(tmp_path)
    done = shared_host.run([sys.executable, EXAMPLES / "tour.py"])
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr == (
        "tour: needs simhostctl of the simulated host: ./dev demo, or the package"
        " libvswitch-simhost\n"
    )
