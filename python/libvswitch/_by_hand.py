"""Bases of the classes of records whose memory the flat methods do not guard."""

import typing
from typing import Any, Optional, Union

import _libvswitch
from libvswitch import _checks, _memory, _pointers, _records

if typing.TYPE_CHECKING:
    from libvswitch import _classes

__all__ = ["LagTable", "MirrorTable", "OfOneForm", "RuntimeOption", "RuntimeOptions"]

# The stubs of the flat functions take the classes that derive from these.
flat: Any = _libvswitch

_HEADER = 4  # bytes before the value of a runtime option, and before the first option


class LagTable(_records.Table["_classes.VSLAGStatus"]):
    """A sequence of groups, which lie one after the other, each as long as its uplinks make it."""

    def __len__(self) -> int:
        self._require()
        return int(flat.VSLAGTable_numLAGs_get(self))

    def __iter__(self) -> typing.Iterator["_classes.VSLAGStatus"]:
        count, at = len(self), int(self) + _memory.RECORD_SIZES["VSLAGTable"]
        for _ in range(count):
            group: Any = _records.record_at("VSLAGStatus", at)
            yield _records.inner(self, group)
            at = _records.Record._end_of(group) or at

    def __getitem__(self, index: int) -> "_classes.VSLAGStatus":
        wanted = _memory.position(index, len(self))
        return next(group for at, group in enumerate(self) if at == wanted)

    @classmethod
    def _end_of(cls, record: Any) -> int:
        end = int(record) + _memory.RECORD_SIZES["VSLAGTable"]
        for group in record:
            end = _records.Record._end_of(group) or end
        return end


class MirrorTable(_records.Table["_classes.DVMirrorSession"]):
    """A table of sessions, with the entities of all of them after the last."""

    @classmethod
    def _end_of(cls, record: Any) -> int:
        entities: int = flat.DVMirrorSessionTable_numEntities_get(record)
        return (super()._end_of(record) or int(record)) + entities * _memory.RECORD_SIZES[
            "DVMirrorEntity"
        ]


class OfOneForm(_records.Record):
    """Addresses of one family: the call that allocates the record is asked for it."""

    @classmethod
    def _end_of(cls, record: Any) -> Optional[int]:
        size = _checks.FORMS.get(record.__dict__.get("_form"))
        if size is None:
            return None
        trailing = _memory.ARRAY_OFFSETS[f"{cls._name}_ipv4Entries"]
        count: int = record.numEntries
        return int(record) + max(trailing + count * size, _memory.RECORD_SIZES[cls._name])


class RuntimeOptions(_records.Record):
    """A list of options, which may be as long as its memory."""

    @classmethod
    def _end_of(cls, record: Any) -> int:
        used: int = flat.VSRuntimeOptions_totalLength_get(record)
        return int(record) + max(used, _HEADER)

    def add_int_option(
        self,
        at: "_classes.VSRuntimeOptionHeader",
        option_name: Optional[str],
        type: int,
        value: int,
    ) -> Optional["_classes.VSRuntimeOptionHeader"]:
        self._require_place(at)
        following = flat.VSRuntimeOptions_add_int_option(self, at, option_name, type, value)
        return self._option(following)

    def add_str_option(
        self,
        at: "_classes.VSRuntimeOptionHeader",
        option_name: Optional[str],
        type: int,
        option_text: str,
    ) -> Optional["_classes.VSRuntimeOptionHeader"]:
        text: Any = _checks.text("option_text", option_text)
        if isinstance(text, str):
            self._require_place(at)
        following = flat.VSRuntimeOptions_add_str_option(self, at, option_name, type, text)
        return self._option(following)

    def set_options_length(self, used: int) -> None:
        _records.require_room(self, _memory.length(used) + _HEADER, "a list of this length")
        flat.VSRuntimeOptions_set_options_length(self, used)

    def get_first_option(self) -> "_classes.VSRuntimeOptionHeader":
        first: "_classes.VSRuntimeOptionHeader" = _records.inner(
            self, flat.VSRuntimeOptions_get_first_option(self)
        )
        return first

    def get_next_option(
        self, option: "_classes.VSRuntimeOptionHeader"
    ) -> Optional["_classes.VSRuntimeOptionHeader"]:
        self._require_length()
        return self._option(flat.VSRuntimeOptions_get_next_option(self, option))

    def _require_length(self) -> None:
        used: int = flat.VSRuntimeOptions_totalLength_get(self)
        _records.require_room(self, used, "a list of this totalLength")

    def _require_place(self, at: Any) -> None:
        """That an option may be put there: the flat methods look at the list's own end only."""
        self._require_length()
        if not isinstance(at, _records.Record) or at.__dict__.get("_owner") is not self:
            raise ValueError("at is no place in this list")

    def _option(self, option: Any) -> Optional["_classes.VSRuntimeOptionHeader"]:
        found: Optional["_classes.VSRuntimeOptionHeader"] = _records.inner(self, option)
        return found


class RuntimeOption(_records.Record):
    """An option of a list, which says itself how long it is."""

    def get_option_name(self) -> str:
        kind: int = flat.VSRuntimeOptionHeader_type_get(self)
        if kind >= flat.VS_NUM_RT_OPT:
            raise ValueError(f"there is no option {kind}, and so no name of it")
        return str(flat.VSRuntimeOptionHeader_get_option_name(self))

    def get_option_value(self) -> Union[int, bytes]:
        kind: int = flat.VSRuntimeOptionHeader_type_get(self)
        if kind <= flat.VS_RT_OPT_ALLOW_MIRROR_STATS:
            _records.require_room(self, _HEADER + 4, "an option with a number")
        else:
            self._require_text()
        found: Union[int, bytes] = flat.VSRuntimeOptionHeader_get_option_value(self)
        return found

    def _require_text(self) -> None:
        available = _records.room(self)
        if available is None:
            return
        used = min(flat.VSRuntimeOptionHeader_length_get(self), available)
        if b"\0" not in _pointers.read_memory(self, 0, used)[_HEADER:]:
            raise ValueError("the text of this option has no end within it")
