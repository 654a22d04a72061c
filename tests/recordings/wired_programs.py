"""What chance does to hosts of which all can be had with wires, too."""

from typing import Any, Dict, cast

import recorded_clones  # which knows where those that follow are
import recorded_sequences
import drawn_documents
import host_machine
from hypothesis import strategies as st
from hypothesis.stateful import rule

__all__ = ["clones", "sequences"]


class WiredMachine(recorded_sequences.RecordedMachine):
    """On which frames come to switches that have clients, and nothing ages at once."""

    step_the_clock = cast(Any, None)  # no rule

    @rule(alias=host_machine.aliases, mac=st.sampled_from([1, 2]), vlan=host_machine.vlans)
    def a_frame_arrives(self, alias: str, mac: int, vlan: int) -> None:
        switch = self.model.switches.get(alias)
        if switch is not None and switch.ports and switch.uplinks:
            super().a_frame_arrives(alias=alias, mac=mac, vlan=vlan)


def sequences(seed: int, count: int) -> None:
    recorded_sequences.make(seed, count, WiredMachine)


def clones(seed: int, count: int) -> None:
    """Their documents say of no address that it was learned: frames alone teach that."""
    recorded_clones.make(seed, count, drawn_documents.documents().map(_without_learned))


def _without_learned(document: Dict[str, Any]) -> Dict[str, Any]:
    for switch in document["switches"]:
        for place in [switch, *switch["ports"]]:
            said = place.get("addresses", [])
            place["addresses"] = [one for one in said if one["type"] != "learned"]
    return document
