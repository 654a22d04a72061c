"""What an ELF file of 64 bits says of itself: machine, libraries it needs, symbols."""

import struct
from dataclasses import dataclass
from pathlib import Path
from typing import Dict, List, Set, Tuple

from libvswitch import _examined

_MACHINES = {
    3: "i386",
    20: "powerpc",
    21: "ppc64le",
    22: "s390x",
    40: "arm",
    62: "x86_64",
    183: "aarch64",
    243: "riscv64",
}
_NEEDED, _RPATH, _RUNPATH = 1, 15, 29
_DYNAMIC, _DYNSYM, _VERSYM = 6, 11, 0x6FFFFFFF
_WEAK = 2
_LONGEST_TEXT = 4096


class NotElf(ValueError):
    """The file is no ELF file of 64 bits, little-endian, or is damaged."""


@dataclass(frozen=True)
class Elf:
    path: Path
    machine: str
    needed: Tuple[str, ...]
    runpath: Tuple[str, ...]
    defined: Set[str]
    # Symbols that must come from elsewhere and of which no version is asked; weak ones need not.
    wanted: Set[str]


def machine_of(path: Path) -> str:
    """The machine an ELF file is for; NotElf for any other file."""
    try:
        head = _examined.read(path, 20)
    except _examined.NotExamined as error:
        raise NotElf(str(error)) from error
    if len(head) < 20 or head[:4] != b"\x7fELF":
        raise NotElf(f"{path} is no ELF file")
    if head[4] == 1:
        return "32 bits"
    if head[4] != 2 or head[5] != 1:
        raise NotElf(f"{path} is no little-endian ELF file")
    (number,) = struct.unpack_from("<H", head, 18)
    return _MACHINES.get(number, f"machine {number}")


def read(path: Path) -> Elf:
    machine = machine_of(path)
    held = _examined.read(path)
    try:
        return _parse(path, machine, held)
    except (struct.error, IndexError, ValueError, OverflowError) as error:
        raise NotElf(f"{path} is damaged: {error}") from error


def _parse(path: Path, machine: str, held: bytes) -> Elf:
    sections = _sections(held)
    by_type: Dict[int, Tuple[int, int, int]] = {}
    for kind, offset, size, link in sections:
        by_type.setdefault(kind, (offset, size, link))

    needed: List[str] = []
    runpath: List[str] = []
    if _DYNAMIC in by_type:
        offset, size, link = by_type[_DYNAMIC]
        strings = sections[link][1]
        for at in range(offset, offset + size, 16):
            tag, value = struct.unpack_from("<qQ", held, at)
            if tag == _NEEDED:
                needed.append(_text(held, strings + value))
            elif tag in (_RPATH, _RUNPATH):
                folders = _text(held, strings + value)
                runpath += folders.split(":") if folders else []

    defined: Set[str] = set()
    wanted: Set[str] = set()
    if _DYNSYM in by_type:
        offset, size, link = by_type[_DYNSYM]
        strings = sections[link][1]
        versions = by_type.get(_VERSYM, (0, 0, 0))[0]
        for index in range(size // 24):
            name, info, _, section = struct.unpack_from("<IBBH", held, offset + index * 24)
            text = _text(held, strings + name)
            version = struct.unpack_from("<H", held, versions + 2 * index)[0] if versions else 0
            if section != 0:
                defined.add(text)
            elif text and info >> 4 != _WEAK and version & 0x7FFF <= 1:
                wanted.add(text)
    return Elf(path, machine, tuple(needed), tuple(runpath), defined, wanted)


def _sections(held: bytes) -> List[Tuple[int, int, int, int]]:
    """Type, offset, size and link of each section."""
    (table,) = struct.unpack_from("<Q", held, 40)
    size, count = struct.unpack_from("<HH", held, 58)
    found = []
    for index in range(count):
        at = table + index * size
        (kind,) = struct.unpack_from("<I", held, at + 4)
        offset, length, link = struct.unpack_from("<QQI", held, at + 24)
        found.append((kind, offset, length, link))
    return found


def _text(held: bytes, at: int) -> str:
    return held[at : held.index(b"\0", at, at + _LONGEST_TEXT)].decode("ascii", "replace")
