"""The programs of examples/ run to their end, say what they do, and leave nothing behind."""

import os
import subprocess
import sys
from pathlib import Path

import pytest

ROOT = Path(__file__).resolve().parents[3]
EXAMPLES = sorted(ROOT.glob("examples/*.py"))


@pytest.mark.parametrize("example", EXAMPLES, ids=[example.stem for example in EXAMPLES])
def test_an_example_runs(example: Path) -> None:
    simhost = os.path.join(os.environ["BUILD_DIR"], "simhost")
    clean = {name: os.environ[name] for name in os.environ if not name.startswith("SIMHOST_")}
    environment = {
        **clean,
        "PATH": f"{simhost}{os.pathsep}{os.environ['PATH']}",
        "SIMHOST_LEDGER": "1",
    }
    done = subprocess.run(
        [sys.executable, str(example)], env=environment, capture_output=True, text=True
    )
    assert done.returncode == 0, done.stderr
    assert done.stderr == "", "the host got back what it gave out"
    assert "memory leak" not in done.stdout
    assert len(done.stdout.splitlines()) > 10
