"""The guides: what they show is run, and prints what they say."""

import doctest
import os
import re
import shutil
import subprocess
import sys
from pathlib import Path
from typing import Dict, Iterator, List, Tuple

import pytest

ROOT = Path(__file__).resolve().parents[2]
BUILD = Path(os.environ["BUILD_DIR"])
GUIDES = [ROOT / "docs/index.md", *sorted((ROOT / "docs/guides").glob("*.md"))]
FLAGS = doctest.ELLIPSIS | doctest.REPORT_NDIFF

# What is shown to be read: commands of this tree, which other tests run, and no sessions.
READ_ONLY = {
    "./dev build",
    "./dev demo",
    'eval "$(./dev env)"',
    "cmake -S . -B build -DCMAKE_BUILD_TYPE=Release -DHOST_LIBRARY_DIR=/usr/lib64",
    "cmake --build build",
}


def named(guide: Path) -> str:
    return guide.stem


def blocks(guide: Path) -> Iterator[Tuple[str, str]]:
    """The language of each block of a guide, and its text."""
    text = guide.read_text(encoding="utf-8")
    for match in re.finditer(r"^```(\S*)[^\n]*\n(.*?)^```$", text, re.MULTILINE | re.DOTALL):
        yield match[1], match[2]


def environment() -> Dict[str, str]:
    given = {
        name: value
        for name, value in os.environ.items()
        if not name.startswith(("SIMHOST_", "PYTEST_")) and name != "LD_LIBRARY_PATH"
    }
    # pytest finds the plug-in once, and only the module's folder is what a reader would have.
    given["PYTHONPATH"] = str(BUILD / "python")
    given["PATH"] = os.pathsep.join(
        [str(BUILD / "bin"), str(BUILD / "simhost"), "/usr/bin", given["PATH"]]
    )
    return given


@pytest.mark.parametrize("guide", GUIDES, ids=named)
def test_every_block_is_run_or_named_here(guide: Path) -> None:
    for language, text in blocks(guide):
        if language == "sh":
            assert set(text.splitlines()) <= READ_ONLY
        else:
            assert language in ("pycon", "console") or language.startswith("{"), language


@pytest.mark.parametrize("guide", GUIDES, ids=named)
def test_sessions_of_python(guide: Path, tmp_path: Path) -> None:
    sessions = "".join(f"{text}\n" for language, text in blocks(guide) if language == "pycon")
    (tmp_path / "session").write_text(sessions, encoding="utf-8")
    program = (
        "import doctest, sys; result = doctest.testfile(sys.argv[1], module_relative=False, "
        f"optionflags={FLAGS}); print(result.attempted); sys.exit(result.failed)"
    )
    done = subprocess.run(
        [sys.executable, "-c", program, str(tmp_path / "session")],
        env=environment(),
        capture_output=True,
        text=True,
    )
    assert done.returncode == 0, done.stdout + done.stderr
    assert int(done.stdout) == len(doctest.DocTestParser().get_examples(sessions))
    assert int(done.stdout) > 0 or guide.stem in (
        "command",
        "describing_a_host",
        "frames",
        "many_hosts",
        "performance",
        "rack",
        "record_once",
        "recording",
        "replaying",
        "testing",
        "tools",
    )


def commands(guide: Path) -> List[Tuple[str, str]]:
    """The commands of a guide's sessions of the shell, and what each prints."""
    found: List[Tuple[str, str]] = []
    for language, text in blocks(guide):
        for line in text.splitlines() if language == "console" else ():
            command, printed = found[-1] if found else ("", "")
            if line.startswith("$ "):
                found.append((line[2:], ""))
            elif line == ">" or line.startswith("> "):
                found[-1] = (f"{command}\n{line[2:]}", printed)
            else:
                found[-1] = (command, f"{printed}{line}\n")
    return found


@pytest.mark.parametrize("guide", [one for one in GUIDES if commands(one)], ids=named)
def test_sessions_of_the_shell(guide: Path, tmp_path: Path) -> None:
    for beside in guide.parent.glob("*.py"):
        shutil.copy(beside, tmp_path)
    (tmp_path / "examples").symlink_to(ROOT / "examples")
    end = "-- the end of a command --"
    script = "".join(f"{command}\necho '{end}'\n" for command, _ in commands(guide))
    done = subprocess.run(
        ["bash"],
        input=script,
        cwd=tmp_path,
        env=environment(),
        stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT,
        text=True,
    )
    printed = done.stdout.split(f"{end}\n")
    assert len(printed) == len(commands(guide)) + 1, done.stdout
    for (command, expected), got in zip(commands(guide), printed):
        assert doctest.OutputChecker().check_output(
            expected, got, FLAGS
        ), f"$ {command}\n{got}--- but the guide says ---\n{expected}"
