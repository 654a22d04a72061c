"""Frames as bytes, and what the data path is told to do with them as what comes out where."""

import re
from collections import Counter
from dataclasses import dataclass, field
from typing import Counter as Counts
from typing import List, Mapping, Optional, Tuple

# The VLAN and the priority of a tag.
Tag = Tuple[int, int]
Tags = Tuple[Tag, ...]
# A device, the tags that the frame has there, outermost first, and how much of it: that many bytes
# with those tags, None for all.
Copy = Tuple[str, Tags, Optional[int]]

MINIMUM = 60
# Of a tag.
TAG = 4
TAG_TYPES = (0x8100, 0x88A8)
# No protocol has this type.
CONTENT = 0x88B5
_ADDRESSES = 12
_TYPE = 2
# What is less is no type but a length, and a type may come later.
_LEAST_TYPE = 0x600
_IPV4, _IPV6 = 0x0800, 0x86DD
_TYPE_COMES = bytes.fromhex("aaaa03000000")


@dataclass(frozen=True)
class Frame:
    """An Ethernet frame with some tags; the rest is of a length, or is what its content says."""

    destination: str
    source: str
    tags: Tags = ()
    length: int = MINIMUM
    content: bytes = b""

    @classmethod
    def read(cls, data: bytes) -> "Optional[Frame]":
        """One of any bytes; nothing if a tag has nothing after it."""
        tags: List[Tag] = []
        at = _ADDRESSES
        while int.from_bytes(data[at : at + _TYPE], "big") in TAG_TYPES:
            if len(data) < at + TAG + _TYPE:
                return None
            tag = int.from_bytes(data[at + _TYPE : at + TAG], "big")
            tags.append((tag & 0xFFF, tag >> 13))
            at += TAG
        destination, source = data[:6].hex(":"), data[6:12].hex(":")
        return cls(destination, source, (*tags,), content=data[at:])

    @property
    def size(self) -> int:
        """Without its tags."""
        return len(self._untagged())

    @property
    def type(self) -> int:
        """What comes after its tags."""
        return self._type_and_packet()[0]

    @property
    def counted_size(self) -> int:
        """Without what comes after an IP packet, which is as long as it says."""
        kind, packet = self._type_and_packet()
        header, said = 0, len(packet)
        if kind == _IPV4 and len(packet) >= 20 and packet[0] & 15 >= 5:
            header, said = (packet[0] & 15) * 4, int.from_bytes(packet[2:4], "big")
        if kind == _IPV6 and len(packet) >= 40:
            header, said = 40, 40 + int.from_bytes(packet[4:6], "big")
        return self.size - (len(packet) - said if header <= said <= len(packet) else 0)

    def _type_and_packet(self) -> Tuple[int, bytes]:
        content = self._untagged()[_ADDRESSES:]
        found = int.from_bytes(content[:_TYPE], "big")
        if found < _LEAST_TYPE and content[_TYPE:].startswith(_TYPE_COMES):
            return int.from_bytes(content[8:10], "big"), content[10:]
        return found, content[_TYPE:]

    def _untagged(self) -> bytes:
        addresses = bytes.fromhex((self.destination + self.source).replace(":", ""))
        content = self.content or CONTENT.to_bytes(_TYPE, "big")
        return addresses + content.ljust(0 if self.content else self.length - _ADDRESSES, b"\0")

    def to_bytes(self) -> bytes:
        return self.with_tags(self.tags)

    def with_tags(self, tags: Tags, most: Optional[int] = None) -> bytes:
        """Its bytes with other tags, and no more than so many."""
        untagged = self._untagged()
        words = b"".join(
            TAG_TYPES[0].to_bytes(_TYPE, "big") + ((pcp << 13) | vid).to_bytes(2, "big")
            for vid, pcp in tags
        )
        return (untagged[:_ADDRESSES] + words + untagged[_ADDRESSES:])[:most]

    def to_key(self, device: str) -> str:
        """By what the data path tells it from others."""
        inner = f"eth_type({CONTENT:#06x})"
        for vid, pcp in reversed(self.tags):
            inner = f"eth_type(0x8100),vlan(vid={vid},pcp={pcp}),encap({inner})"
        return f"in_port({device}),eth(src={self.source},dst={self.destination}),{inner}"


def plain(data: bytes) -> bytes:
    """A frame all of whose tags are of the first kind, and do not say whether it may be dropped
    first: those are told apart nowhere."""
    found = bytearray(data)
    at = _ADDRESSES
    while int.from_bytes(found[at : at + _TYPE], "big") in TAG_TYPES and len(found) >= at + TAG:
        found[at : at + _TYPE] = TAG_TYPES[0].to_bytes(_TYPE, "big")
        found[at + _TYPE] &= 0xEF
        at += TAG
    return bytes(found)


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
        cut = 0
        while not reader.ended():
            word, arguments = reader.action()
            if word == "push_vlan":
                tags.insert(0, _pushed(arguments))
            elif word == "pop_vlan":
                tags.pop(0)
            elif word == "trunc":
                cut = max(0, self._length(tags) - int(arguments))
            elif word == "clone":
                self.do(arguments, list(tags))
            elif word == "check_pkt_len":
                found = re.fullmatch(r"size=(\d+),gt\((.*)\),le\((.*)\)", arguments)
                assert found, arguments
                larger = self._length(tags) > int(found.group(1))
                self.do(found.group(2 if larger else 3), list(tags))
            elif word != "drop":
                assert not arguments, f"{word}({arguments})"
                most = self._length(tags) - cut if cut else None
                self.out[(self.names[word], tuple(tags), most)] += 1
                cut = 0

    def _length(self, tags: List[Tag]) -> int:
        return self.size + TAG * len(tags)


def copies(actions: str, frame: Frame, names: Mapping[str, str]) -> Counts[Copy]:
    """What comes out of a frame by the actions of the data path, whose devices have other names."""
    run = _Run(names, frame.size)
    run.do(actions, list(frame.tags))
    return run.out
