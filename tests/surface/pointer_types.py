"""Reads types.txt, the reference of the pointer types; the format is explained at its top."""

from pathlib import Path
from typing import FrozenSet, List

TABLE = Path(__file__).with_name("types.txt")


def read(path: Path = TABLE) -> List[FrozenSet[str]]:
    """For each type, all its spellings."""
    lines = path.read_text(encoding="ascii").splitlines()
    return [frozenset(line.split("|")) for line in lines if line and not line.startswith("#")]
