"""Sequences of calls on the simulated host, and the faults that they must find."""

from typing import Any, List, Type

import drawn_keys
import host_calls
import host_model
import pytest
import sequences
from host_machine import HostMachine
from host_model import Model

SEED = 20
SEQUENCES = 50


def test_the_model_knows_what_is_drawn() -> None:
    assert set(drawn_keys.of("switch")) == set(host_model.OF_SWITCH)
    assert set(drawn_keys.of("port")) == set(host_model.OF_PORT)


def test_no_sequence_ends_elsewhere_than_the_model() -> None:
    print("seed", SEED)
    made, wrong = sequences.run(HostMachine, SEED, SEQUENCES)
    assert wrong == []
    assert made >= SEQUENCES


class UnexpectedStatus(HostMachine):
    """On a host that is busy when nothing has told it to be."""

    def __init__(self) -> None:
        super().__init__()
        self.host.fault("VSDVS_SetMcastFilterMode", times=0, status="QEX_BUSY")


class LostMemory(HostMachine):
    """With a tool that forgets what it was given until it ends."""

    def __init__(self) -> None:
        super().__init__()
        self.forgotten: List[int] = []

    def _hold(self, block: host_calls.Allocated, keep: bool) -> None:
        self.forgotten.append(block.address)

    def teardown(self) -> None:
        for address in self.forgotten:
            host_calls.release(address)
        super().teardown()


class LongerMemory(Model):
    """What a host would be on which nothing is volatile."""

    def restart(self) -> None:
        pass


class VolatileHost(HostMachine):
    """On a host that loses what the model keeps."""

    def __init__(self) -> None:
        super().__init__()
        self.model = LongerMemory()


class SlowClock(HostMachine):
    """On a host whose addresses age a second earlier than the model's."""

    def __init__(self) -> None:
        super().__init__()
        self.host.apply({"mac_learning": {"aging_time": 299}})


FAULTS = {
    UnexpectedStatus: "VSDVS_SetMcastFilterMode('",
    LostMemory: "get_raw",
    VolatileHost: "restart",
    SlowClock: "step_the_clock",
}


@pytest.mark.parametrize("machine", FAULTS)
def test_what_is_planted_is_found(machine: Type[Any]) -> None:
    _, wrong = sequences.run(machine, SEED, 10 * SEQUENCES, shrink=False)
    assert len(wrong) == 1
    assert FAULTS[machine] in wrong[0]
