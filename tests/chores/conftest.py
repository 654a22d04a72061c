"""The commands of ./dev and what serves them, which are no part of what is built."""

import sys
from pathlib import Path

ROOT = Path(__file__).resolve().parents[2]
sys.path.append(str(ROOT / "chores"))
