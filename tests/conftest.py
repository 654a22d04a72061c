"""Puts beside the module, for every suite, what the build made for tests, and the tables."""

import gc
import os
import signal
import sys
from pathlib import Path

import pytest

# For the tests of the plug-in; pytest takes this from the first conftest only.
pytest_plugins = ["pytester"]

_HERE = Path(__file__).parent
_BESIDE = [
    str(Path(os.environ["BUILD_DIR"], "tests", "python")),
    str(_HERE / "support"),
    str(_HERE / "surface"),
]
sys.path.extend(_BESIDE)
# Child processes need them too.
_PATH = [*filter(None, [os.environ.get("PYTHONPATH")]), *_BESIDE]
os.environ["PYTHONPATH"] = os.pathsep.join(_PATH)

# What a script starts in the background ignores interrupts, and so would the programs under test.
signal.signal(signal.SIGINT, signal.default_int_handler)


def pytest_collection_finish(session: pytest.Session) -> None:
    # Once the classes are loaded the flat functions return instances of them.
    if "libvswitch" in sys.modules:
        module = _HERE / "module"
        flat = [item.nodeid for item in session.items if module in item.path.parents]
        if flat:
            raise pytest.UsageError(f"a test file loads the classes, and so {flat[0]} would fail")
    # Tests that look for what nobody holds any more would look at all of them, each time.
    gc.collect()
    gc.freeze()
