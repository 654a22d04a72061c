"""A test whose calls are played from a recording, or recorded for the next time.

What plays are libraries in front of the host's, which have to be there before the module is loaded.
So they are loaded as early as pytest can, and forward the calls of all other tests.
"""

import contextlib
import json
import subprocess
import sys
import tempfile
from pathlib import Path
from typing import TYPE_CHECKING, Dict, Iterator

import pytest

if TYPE_CHECKING:
    from vswitch.playing import Ledger

_MODES = ("none", "once", "all")
_FIND = """
import json
from vswitch.recording import host_libraries
print(json.dumps({name: str(path) for name, path in host_libraries().items()}))
"""
_hosts: Dict[str, Path] = {}


def stand_in_front() -> None:
    """Has this process find the libraries that play, and through them the host, if there is one."""
    from vswitch import _front

    # Another process loads the host's, for this one would then have them.
    found = subprocess.run([sys.executable, "-c", _FIND], capture_output=True, text=True)
    if found.returncode == 0:
        _hosts.update({name: Path(path) for name, path in json.loads(found.stdout).items()})
    _front.stand_in_front(_hosts)


class RecordedTest:
    """What a test's mark says, and what became of it."""

    def __init__(
        self,
        item: pytest.Item,
        file: str,
        *,
        by: str = "order",
        mode: str = "none",
        all_used: bool = False,
    ) -> None:
        from vswitch._front import Runtime
        from vswitch.playing import BY

        if by not in BY or mode not in _MODES:
            raise ValueError(f"by is one of {', '.join(BY)}, and mode one of {', '.join(_MODES)}")
        self._item = item
        self._trace = item.path.parent / file
        self._by_arguments = by == "arguments"
        self._all_used = all_used
        self._is_recorded = mode == "all" or (mode == "once" and not self._trace.exists())
        if not self._is_recorded and not self._trace.exists():
            raise OSError(f"there is no {self._trace}; mode='once' records it")
        if self._is_recorded and not _hosts:
            raise OSError(f"there is no host to record {self._trace} with")
        self._has_passed = False
        self._runtime = Runtime()

    @contextlib.contextmanager
    def under_way(self) -> Iterator[None]:
        """The calls that are made meanwhile are played, or recorded."""
        with self._recorded() if self._is_recorded else self._played():
            yield

    def end_of_passed_test(self) -> None:
        """A test may hide that a call failed, and has failed all the same."""
        failure = self._runtime.failure()
        if failure:
            pytest.fail(failure, pytrace=False)
        self._has_passed = True

    @contextlib.contextmanager
    def _recorded(self) -> Iterator[None]:
        from vswitch.recording import anew, begin

        with contextlib.ExitStack() as stack:
            try:
                made = stack.enter_context(anew(self._trace))
                begin(made, [self._item.nodeid], _hosts)
            except OSError as error:
                pytest.fail(f"the mark recording: {error}", pytrace=False)
            try:
                self._runtime.record(made)
                yield
            finally:
                self._runtime.forward()
            # What a test that failed has asked is not what it is to ask.
            if self._has_passed:
                self._keep(made)

    def _keep(self, made: Path) -> None:
        from vswitch.trace import has_calls

        if has_calls(made):
            made.replace(self._trace)
        else:
            words = f"the test made no call, so that nothing is recorded in {self._trace.name}"
            self._item.warn(pytest.PytestWarning(words))

    @contextlib.contextmanager
    def _played(self) -> Iterator[None]:
        from vswitch.playing import Ledger
        from vswitch.trace import TraceError

        with tempfile.TemporaryDirectory(prefix="vswitch-play-") as folder:
            try:
                ledger = Ledger(self._trace, Path(folder, "ledger"))
            except TraceError as error:
                pytest.fail(f"the mark recording: {error}", pytrace=False)
            self._runtime.play(self._trace, ledger.file, self._by_arguments)
            try:
                yield
                failure = self._runtime.failure()
            finally:
                self._runtime.forward()
            # A test that has failed has been told enough.
            if self._has_passed:
                self._look_back(failure, ledger)

    def _look_back(self, failure: str, ledger: "Ledger") -> None:
        if failure:
            pytest.fail(f"a fixture of the test: {failure}", pytrace=False)
        if ledger.left:
            words = ledger.said_of(f"calls of {self._trace.name}")
            if self._all_used:
                pytest.fail(words, pytrace=False)
            self._item.warn(pytest.PytestWarning(words))
