"""A call keeps the interpreter to itself, for the trap is one for the whole process."""

import sys
import threading
import time
from typing import Iterator

import calls
import pytest
from calls import Call
from recording_host import RecordingHost


class OtherThread:
    """A thread that counts whenever it is let in."""

    def __init__(self) -> None:
        self.count = 0
        self._stopping = False
        self._thread = threading.Thread(target=self._run)
        self._thread.start()

    def stop(self) -> None:
        self._stopping = True
        self._thread.join()

    def _run(self) -> None:
        while not self._stopping:
            self.count += 1
            # Lets others in, and asks to be let in again.
            time.sleep(0)


@pytest.fixture(name="other", scope="module")
def fixture_other() -> Iterator[OtherThread]:
    """Another thread, which this one lets in only of its own accord."""
    interval = sys.getswitchinterval()
    sys.setswitchinterval(1000)
    thread = OtherThread()
    yield thread
    thread.stop()
    sys.setswitchinterval(interval)


def test_the_other_thread_counts_when_it_is_let_in(other: OtherThread) -> None:
    deadline = time.monotonic() + 10
    before = other.count
    while other.count == before and time.monotonic() < deadline:
        time.sleep(0.002)
    assert other.count > before


@calls.each()
@pytest.mark.proves("lock")
def test_no_other_thread_runs_during_a_call(
    host: RecordingHost, other: OtherThread, call: Call
) -> None:
    host.delay(call.name, 2)
    given = call.given()
    before = other.count
    call(*given)
    after = other.count
    assert after == before
