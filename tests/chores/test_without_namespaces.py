"""./dev test where namespaces cannot be made: it says so, and --no-frames leaves out all that makes
them."""

import os
import re
import subprocess
from pathlib import Path
from typing import List, Set

ROOT = Path(__file__).resolve().parents[2]
# Namespaces of mounts may be all that is allowed, or not even they are.
UNSHARE = ["unshare", *([] if os.geteuid() == 0 else ["--user", "--map-root-user"]), "--mount"]
FAILING = 'mount --bind /bin/false "$(command -v unshare)" && exec "$@"'


def where_unshare_fails() -> List[str]:
    """What a command begins with that sees an unshare(1) that does nothing but fail."""
    words = [*UNSHARE, "sh", "-c", FAILING, "sh"]
    if succeeds(*words, "true"):
        return words
    # Else nothing but a failure ends what looks for it.
    assert not succeeds("unshare", "--net", "true")
    assert not succeeds("unshare", "--user", "--map-root-user", "--net", "true")
    return []


def succeeds(*words: str) -> bool:
    return subprocess.run(words, stderr=subprocess.DEVNULL).returncode == 0


def test_it_says_first_what_is_missing_and_fails() -> None:
    done = subprocess.run(
        [*where_unshare_fails(), ROOT / "dev", "test"],
        stdout=subprocess.PIPE,
        stderr=subprocess.STDOUT,
        text=True,
    )
    assert done.returncode != 0
    assert done.stdout == (
        "dev: test: neither root nor user namespaces make a network namespace here;"
        " see --no-frames\n"
    )


def left_out(variable: str) -> str:
    program = (
        "summary= deselected=; summarize() { :; }; . ./chores/test.sh;"
        ' summarize() { summary="$summary$1\n"; }; leave_out_frames; printf %s "$' + variable + '"'
    )
    done = subprocess.run(["sh", "-euc", program], cwd=ROOT, check=True, stdout=subprocess.PIPE)
    return done.stdout.decode()


def test_the_summary_names_the_option_and_what_it_leaves_out() -> None:
    summary = left_out("summary").splitlines()
    assert all(line.startswith("Left out by --no-frames: ") for line in summary)
    for what in ("tests/simhostd", "tests/fabric", left_out("cxx_left_out")):
        assert any(what in line for line in summary), what


def cases_of(source: Path) -> Set[str]:
    found = re.findall(r"^TEST(?:_F|_P)?\((\w+), (\w+)\)", source.read_text("utf-8"), re.M)
    return {".".join(case) for case in found}


def test_what_makes_namespaces_is_left_out() -> None:
    """All of it, and nothing besides that."""
    needing: Set[str] = set()
    for source in (ROOT / "tests").rglob("*_test.cpp"):
        text = source.read_text("utf-8")
        if '#include "own_network.h"' in text or source.name.endswith("_as_root_test.cpp"):
            needing |= cases_of(source)
        elif "unshare" in text:
            # By the program, in some of its cases.
            some = {case for case in cases_of(source) if case.startswith("AProcessWithMany")}
            assert some, source
            needing |= some
    assert {case.split(".")[0] for case in needing} >= {"TheWires", "StateFileAsRoot"}
    assert listed() - listed("-E", left_out("cxx_left_out")) == needing


def listed(*words: str) -> Set[str]:
    command = ["ctest", "--test-dir", os.environ["BUILD_DIR"], "-N", *words]
    said = subprocess.run(command, check=True, stdout=subprocess.PIPE, text=True).stdout
    return set(re.findall(r"^ +Test +#\d+: (.*)$", said, re.M))
