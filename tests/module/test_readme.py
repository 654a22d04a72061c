"""The README's session is run as it stands, on a host of its own."""

import doctest
import os
import subprocess
import sys
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]


def test_the_tour_prints_what_it_says() -> None:
    program = (
        "import doctest, sys; result = doctest.testfile(sys.argv[1], module_relative=False, "
        "optionflags=doctest.ELLIPSIS | doctest.REPORT_NDIFF); "
        "print(result.attempted, 'attempted'); sys.exit(result.failed)"
    )
    environment = {name: os.environ[name] for name in os.environ if not name.startswith("SIMHOST_")}
    done = subprocess.run(
        [sys.executable, "-c", program, str(ROOT / "README.md")],
        env=environment,
        capture_output=True,
        text=True,
    )
    assert done.returncode == 0, done.stdout + done.stderr
    assert done.stdout == f"{examples()} attempted\n"


def examples() -> int:
    found = doctest.DocTestParser().get_examples((ROOT / "README.md").read_text(encoding="utf-8"))
    assert found
    return len(found)
