"""The command is run as people run it: a program, on a host whose state is in a file."""

import pytest
from command_line import LAB, PROGRAM, SIMULATED, Done, Refused, Vswitch, state
from simhost import SharedHost


@pytest.fixture
def lab(shared_host: SharedHost) -> SharedHost:
    """A host with the switches lab and vswitch0."""
    shared_host.apply(LAB)
    # Ages stay what they are.
    shared_host.clock.stop()
    return shared_host


@pytest.fixture
def vswitch(lab: SharedHost) -> Vswitch:
    """Runs the program on that host. Memory that it does not release fails the test."""

    def run(*words: str, input: str = "") -> Done:
        done = lab.run([PROGRAM, *words], input=input)
        return Done(done.returncode, done.stdout, done.stderr)

    return run


@pytest.fixture
def refused(lab: SharedHost, vswitch: Vswitch) -> Refused:
    """Runs what is refused: what it says. It must leave the host as it was, and print nothing."""

    def run(*words: str, status: int = 1, input: str = "") -> str:
        before = state(lab)
        done = vswitch(*words, input=input)
        assert (done.status, done.stdout) == (status, ""), done
        assert "Traceback" not in done.stderr
        assert state(lab) == before
        return done.stderr.replace(SIMULATED, "")

    return run
