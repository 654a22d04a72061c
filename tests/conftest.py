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

_has_workers = False


@pytest.hookimpl(optionalhook=True)  # type: ignore[misc]  # pluggy is not typed
def pytest_xdist_setupnodes() -> None:
    global _has_workers
    _has_workers = True


def _end_in_order(*_: object) -> None:
    """As if interrupted from a terminal, which interrupts workers, too: what tests have begun ends
    with them."""
    signal.signal(signal.SIGTERM, signal.SIG_IGN)
    if _has_workers:
        # Which are its only children then, for it runs no test by itself.
        for task in Path("/proc/self/task").iterdir():
            for worker in (task / "children").read_text(encoding="ascii").split():
                os.kill(int(worker), signal.SIGINT)
    raise KeyboardInterrupt


signal.signal(signal.SIGTERM, _end_in_order)


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
