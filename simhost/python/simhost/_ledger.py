"""Memory that the host gave out and did not get back, as its ledger lists it."""

import re
from typing import Iterable, List, NamedTuple, Tuple

_ADVICE = "Release each block once; libvswitch.owned does at the end of its block of code."


class Block(NamedTuple):
    """A block of the host's memory: its size in bytes, and the call that gave it out."""

    call: str
    size: int
    address: int

    def __str__(self) -> str:
        return f"{self.call}: {self.size} bytes"


class MemoryLeftOut(AssertionError):
    """The host did not get back all of the memory that it gave out."""

    def __init__(self, who: str, blocks: Iterable[object]) -> None:
        lines = "".join(f"    {block}\n" for block in blocks)
        super().__init__(f"{who} left memory of the host out:\n{lines}{_ADVICE}")


def blocks_of(report: str) -> List[Block]:
    """The blocks in a report of the ledger, oldest first."""
    return [
        Block(call, int(size), int(address, 16))
        for address, size, call in re.findall(r"^(\S+) (\d+) bytes from (\S+)$", report, re.M)
    ]


def split_summary(errors: str) -> Tuple[str, List[str]]:
    """What a process wrote to standard error, and the blocks that the host missed at its end."""
    before, heading, summary = errors.partition("simulated host: not given back:\n")
    if not heading:
        return errors, []
    found = re.findall(r"^(\d+) x (\d+) bytes from (\S+)$", summary, re.M)
    return before, [
        str(Block(call, int(size), 0)) for n, size, call in found for _ in range(int(n))
    ]
