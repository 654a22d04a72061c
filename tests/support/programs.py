"""Where the programs of examples/ are."""

from pathlib import Path

EXAMPLES = Path(__file__).resolve().parents[2] / "examples"
