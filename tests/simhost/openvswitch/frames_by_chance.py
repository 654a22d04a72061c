#!/usr/bin/env python3
"""Frames of any content at switches that chance makes: real ones, through a data path.

    frames_by_chance.py [--seconds N] [--seed N]

Holds every copy that comes out to the rules, byte by byte, and what flows count of it, for as long
as it is told; prints the switch and the frame that the rules and the data path do not agree about,
or what was counted, and at the end how many frames there were.
"""

import random
import sys
import tempfile
from collections import Counter
from contextlib import contextmanager
from pathlib import Path
from typing import Any, Callable, Counter as Counts, Iterator, List, Optional, Tuple

sys.path.insert(0, str(Path(__file__).parents[2] / "support"))

import seeds  # noqa: E402  (after the path is set)
from hypothesis import given, seed  # noqa: E402
from hypothesis import strategies as st  # noqa: E402

from compiler import Compiler  # noqa: E402
from counting_rules import CountingRules  # noqa: E402
from drawn_switches import (  # noqa: E402
    CLIENTS,
    PLACES,
    choosy_switches,
    frame_of_bytes,
    mirroring_switches,
    switches_with_links,
)
from frames import Frame  # noqa: E402
from open_vswitch import OpenVSwitch  # noqa: E402
from rules import Rules  # noqa: E402
from wires import Arrived, Wires  # noqa: E402

OF_A_SEED = 20
# Of switches whose like chance makes too rarely.
OF_A_KIND = 5
ANY = switches_with_links(collectors=True)
KINDS = [mirroring_switches(), choosy_switches()]
OF_A_SWITCH = 30


class Count:
    sent = passed = 0


def may_come_out(rules: Rules, at: str, data: bytes) -> "List[Counts[Arrived]]":
    frame = Frame.read(data)
    if frame is None:
        return [Counter()]
    return [
        Counter({(name, frame.with_tags(tags, most)): n for (name, tags, most), n in out.items()})
        for out in rules.comes_out(at, frame)
    ]


def in_short(data: bytes) -> str:
    """Without the zeros at the end."""
    return f"{data.rstrip(bytes(1)).hex()} of {len(data)} bytes"


def disagreement(
    at: str, data: bytes, found: "Counts[Arrived]", wanted: "List[Counts[Arrived]]"
) -> str:
    def listed(arrived: "Counts[Arrived]") -> List[str]:
        return sorted(f"{name}: {in_short(sent)}" for name, sent in arrived.elements())

    said = [f"{in_short(data)} at {at}", f"comes out: {listed(found)}"]
    return "\n".join([*said, *(f"the rules say: {listed(one)}" for one in wanted)])


def run(
    wires: Wires,
    number: int,
    examples: int,
    shrink: bool = True,
    change: Callable[[str], Optional[str]] = str,
    switches: "st.SearchStrategy[Any]" = ANY,
) -> Tuple[Count, List[str]]:
    """So many of these switches, which the number chooses, with each flow and group changed: how
    many frames were sent, of how many something came out, and what is wrong."""
    count = Count()

    @seed(number)
    @seeds.options(examples, shrink)
    @given(drawn=switches, clients=CLIENTS, chance=st.integers(0, 2**32))
    def each(drawn: Any, clients: Any, chance: int) -> None:
        switch, links = drawn
        rules = wires.load(switch, clients, change, links)
        counting = CountingRules(rules)
        frames = random.Random(chance)
        sent = [frame_of_bytes(frames) for _ in range(OF_A_SWITCH)]
        sent = [(at, data) for at, data in sent if at in wires.devices and at not in links.down]
        # What is too large leaves open where it would have gone, and counts there.
        for is_large in False, True:
            for at, data in sent:
                if counting.is_large(Frame.read(data)) == is_large:
                    wires.forget()
                    found, wanted = wires.transmit(at, data), may_come_out(rules, at, data)
                    assert found in wanted, disagreement(at, data, found, wanted)
                    count.sent += 1
                    count.passed += bool(found)
                    counting.add(at, data, Counter(name for name, _ in found.elements()))
            unlike = counting.wrong(*wires.counted())
            assert not unlike, "\n".join(unlike)

    try:
        each()
    except AssertionError as error:
        return count, ["\n".join([*getattr(error, "__notes__", []), str(error)])]
    return count, []


@contextmanager
def wires_of_its_own() -> Iterator[Wires]:
    with tempfile.TemporaryDirectory() as folder:
        compiler, open_vswitch = Compiler(), OpenVSwitch(Path(folder))
        try:
            wires = Wires(open_vswitch, compiler, Path(folder), len(PLACES))
            wires.lead_to_collectors()
            yield wires
        finally:
            open_vswitch.close()
            compiler.close()


def main() -> int:
    """Make switches of one seed after the other."""
    with wires_of_its_own() as wires:

        def of_seed(number: int) -> seeds.Outcome:
            sent, all_wrong = 0, []
            for kind in (ANY, *KINDS):
                examples = OF_A_SEED if kind is ANY else OF_A_KIND
                count, wrong = run(wires, number, examples, switches=kind)
                sent += count.sent
                all_wrong += wrong
            return sent, all_wrong

        return seeds.main(of_seed)


if __name__ == "__main__":
    sys.exit(main())
