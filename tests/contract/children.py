"""Processes of their own, for what cannot be shown in the process of the tests."""

import faulthandler
import os
import resource
import subprocess
import sys
from pathlib import Path
from typing import Callable, Dict, Optional, Tuple

HERE = Path(__file__).parent
BUILD = Path(os.environ["BUILD_DIR"])


def run(*command: str, **environment: Optional[str]) -> "subprocess.CompletedProcess[str]":
    """Run Python, which finds the modules of this folder, with variables set or, by None, unset."""
    merged: Dict[str, Optional[str]] = {**os.environ, **environment}
    merged["PYTHONPATH"] = os.pathsep.join([os.environ["PYTHONPATH"], str(HERE)])
    found = {name: value for name, value in merged.items() if value is not None}
    return subprocess.run(
        [sys.executable, *command], env=found, capture_output=True, text=True, check=False
    )


def fork(action: Callable[[], object]) -> Tuple[int, str]:
    """Let a copy of this process act; return the signal that ended it, and its standard error."""
    reading, writing = os.pipe()
    child = os.fork()
    if child == 0:
        os.dup2(writing, 2)
        sys.stderr = open(2, "w", encoding="utf-8", closefd=False)
        faulthandler.disable()
        resource.setrlimit(resource.RLIMIT_CORE, (0, 0))
        try:
            action()
        finally:
            os._exit(0)
    os.close(writing)
    with open(reading, encoding="utf-8") as pipe:
        said = pipe.read()
    _, status = os.waitpid(child, 0)
    return os.WTERMSIG(status), said
