"""What all families of constants share: words for `str()`, and members for unknown numbers."""

import enum
from typing import Any, Tuple

# Of a format that asks for a number.
_NUMERIC = "bcdnoxX"


class Word(enum.IntEnum):
    """One of several numbers; its text is its name in small letters."""

    def __str__(self) -> str:
        return self.name.lower()

    def __format__(self, spec: str) -> str:
        return _formatted(self, spec)

    @classmethod
    def _missing_(cls, value: object) -> Any:
        """A host may know numbers that the headers do not have."""
        if not isinstance(value, int):
            return None
        member = int.__new__(cls, value)
        member._name_ = f"UNKNOWN_{value}"
        member._value_ = value
        return member


class Words(enum.IntFlag):
    """A set of bits; its text is their names in small letters, with commas in between."""

    @property
    def words(self) -> Tuple[str, ...]:
        """The bits by their words, the lowest first; those without a name as a number."""
        known = [one for one in type(self).__members__.values() if int(self) & int(one)]
        rest = int(self) & ~sum(int(one) for one in known)
        names = [one._name_ or "" for one in sorted(known, key=int)]
        return (*(name.lower() for name in names), *([hex(rest)] if rest else []))

    def __str__(self) -> str:
        return ",".join(self.words) or "none"

    def __format__(self, spec: str) -> str:
        return _formatted(self, spec)


def _formatted(value: int, spec: str) -> str:
    return format(int(value), spec) if spec[-1:] in tuple(_NUMERIC) else format(str(value), spec)
