"""The client of what hosts share is tried on the databases and hosts of the tests of frames."""

import sys
from pathlib import Path

sys.path.append(str(Path(__file__).parents[1] / "simhostd"))
