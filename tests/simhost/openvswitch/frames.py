"""Frames as bytes, and what the data path is told to do with them as what comes out where."""

import re
from collections import Counter
from dataclasses import dataclass, field
from typing import Counter as Counts
from typing import List, Mapping, Optional, Tuple

# The VLAN and the priority of a tag.
Tag = Tuple[int, int]
Tags = Tuple[Tag, ...]
# A device, the tags that the frame has there, outermost first, and how much of it, None for all.
Copy = Tuple[str, Tags, Optional[int]]

MINIMUM = 60
# Of a tag.
TAG = 4
# No protocol has this type.
CONTENT = 0x88B5


@dataclass(frozen=True)
class Frame:
    """An Ethernet frame with some tags."""

    destination: str
    source: str
    tags: Tags = ()
    size: int = MINIMUM

    def to_bytes(self) -> bytes:
        """Its size without its tags is `size`."""
        addresses = bytes.fromhex((self.destination + self.source).replace(":", ""))
        tags = b"".join(
            b"\x81\x00" + ((pcp << 13) | vid).to_bytes(2, "big") for vid, pcp in self.tags
        )
        content = CONTENT.to_bytes(2, "big")
        return (addresses + tags + content).ljust(self.size + len(tags), b"\0")

    def to_key(self, device: str) -> str:
        """By what the data path tells it from others."""
        inner = f"eth_type({CONTENT:#06x})"
        for vid, pcp in reversed(self.tags):
            inner = f"eth_type(0x8100),vlan(vid={vid},pcp={pcp}),encap({inner})"
        return f"in_port({device}),eth(src={self.source},dst={self.destination}),{inner}"


def from_bytes(sent: Frame, got: bytes) -> Tags:
    """The tags of a frame; the rest must be as it was sent."""
    tags: List[Tag] = []
    at = 12
    while got[at : at + 2] == b"\x81\x00":
        content = int.from_bytes(got[at + 2 : at + 4], "big")
        tags.append((content & 0xFFF, content >> 13))
        at += 4
    untagged = Frame(sent.destination, sent.source, (), sent.size).to_bytes()
    assert got[:12] + got[at:] == untagged
    return tuple(tags)


class _Reader:
    """Reads the actions of a data path as ofproto/trace prints them."""

    def __init__(self, text: str) -> None:
        self._text = text
        self._at = 0

    def ended(self) -> bool:
        return self._at >= len(self._text)

    def action(self) -> Tuple[str, str]:
        """The next one, and what it has in parentheses."""
        found = re.compile(r"[^,()]+").match(self._text, self._at)
        assert found, self._text[self._at :]
        self._at = found.end()
        arguments = self._inside() if self._take("(") else ""
        self._take(",")
        return found.group(), arguments

    def _take(self, wanted: str) -> bool:
        if not self._text.startswith(wanted, self._at):
            return False
        self._at += len(wanted)
        return True

    def _inside(self) -> str:
        depth, begin = 1, self._at
        while depth:
            depth += {"(": 1, ")": -1}.get(self._text[self._at], 0)
            self._at += 1
        return self._text[begin : self._at - 1]


def _pushed(arguments: str) -> Tag:
    values = dict(part.split("=") for part in arguments.split(","))
    return int(values["vid"]), int(values["pcp"])


@dataclass
class _Run:
    """A run of actions over a frame."""

    names: Mapping[str, str]
    size: int
    out: Counts[Copy] = field(default_factory=Counter)

    def do(self, text: str, tags: List[Tag]) -> None:
        reader = _Reader(text)
        most: Optional[int] = None
        while not reader.ended():
            word, arguments = reader.action()
            if word == "push_vlan":
                tags.insert(0, _pushed(arguments))
            elif word == "pop_vlan":
                tags.pop(0)
            elif word == "trunc":
                most = int(arguments)
            elif word == "clone":
                self.do(arguments, list(tags))
            elif word == "check_pkt_len":
                found = re.fullmatch(r"size=(\d+),gt\((.*)\),le\((.*)\)", arguments)
                assert found, arguments
                larger = self.size + TAG * len(tags) > int(found.group(1))
                self.do(found.group(2 if larger else 3), list(tags))
            elif word != "drop":
                assert not arguments, f"{word}({arguments})"
                self.out[(self.names[word], tuple(tags), most)] += 1
                most = None


def copies(actions: str, frame: Frame, names: Mapping[str, str]) -> Counts[Copy]:
    """What comes out of a frame by the actions of the data path, whose devices have other names."""
    run = _Run(names, frame.size)
    run.do(actions, list(frame.tags))
    return run.out
