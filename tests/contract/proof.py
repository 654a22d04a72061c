"""Counts the calls that the tests proved: by tests that ran and passed, not by those that exist.

A test that shows one aspect of a call is marked `proves(aspect)` and parametrised with `call`, and
with `position` where the aspect concerns each argument. A call is proven when each aspect of each
of its forms, and for all its arguments, was shown and no marked test of it failed.
"""

from pathlib import Path
from typing import Any, Dict, List, Set, Tuple

import calls
import pytest
from calls import Call

Aspect = Tuple[str, int]
"""What is shown, and of which argument; 0 if of the call as a whole."""

_HERE = Path(__file__).parent


def required(call: Call) -> Set[Aspect]:
    """All that must be shown of a call."""
    aspects = {("count", 0), ("result", 0), ("lock", 0)}
    aspects |= {("passes", position) for position in call.positions()}
    aspects |= {("refuses", p) for p in call.positions() if call.kind(p).refused()}
    # The one call that is made outside the trap.
    if call.name != "Panic":
        aspects.add(("trap", 0))
    return aspects


class Proof:
    """A plugin of pytest that says at the end how many calls are proven."""

    def __init__(self) -> None:
        self._claims: Dict[str, Tuple[Call, Aspect]] = {}
        self._shown: Dict[Call, Set[Aspect]] = {call: set() for call in calls.ALL}
        self._failed: Set[Call] = set()
        self._whole = True

    def pytest_deselected(self) -> None:
        self._whole = False

    def pytest_collection_finish(self, session: pytest.Session) -> None:
        for item in session.items:
            mark = item.get_closest_marker("proves")
            if mark and isinstance(item, pytest.Function):
                found: Dict[str, Any] = item.callspec.params
                self._claims[item.nodeid] = found["call"], (mark.args[0], found.get("position", 0))
        collected = {item.path for item in session.items}
        self._whole &= collected >= set(_HERE.glob("test_*.py"))
        self._whole &= not any("::" in argument for argument in session.config.args)

    def pytest_runtest_logreport(self, report: pytest.TestReport) -> None:
        if report.nodeid in self._claims:
            call, aspect = self._claims[report.nodeid]
            if not report.passed:
                self._failed.add(call)
            elif report.when == "call":
                self._shown[call].add(aspect)

    def pytest_sessionfinish(self, session: pytest.Session) -> None:
        if self._whole and self._unproven():
            session.exitstatus = pytest.ExitCode.TESTS_FAILED

    def pytest_terminal_summary(self, terminalreporter: Any) -> None:
        names = {call.name for call in calls.ALL}
        unproven = self._unproven()
        proven = len(names) - len({call.name for call in unproven})
        part = "" if self._whole else " (by a part of the tests)"
        terminalreporter.write_line(f"calls proven: {proven} of {len(names)}{part}")
        if self._whole:
            for call in unproven:
                missing = sorted(required(call) - self._shown[call])
                terminalreporter.write_line(f"  not {call}: {missing or 'a test failed'}")

    def _unproven(self) -> List[Call]:
        return [
            call
            for call, shown in self._shown.items()
            if call in self._failed or not shown >= required(call)
        ]
