"""Processes of their own, for what cannot be shown in the process of the tests."""

import os
import subprocess
import sys
from pathlib import Path
from typing import Dict, Optional

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
