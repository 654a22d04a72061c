"""Wrong and extreme values, each with a name by which a report can tell it."""

import array
import ctypes
import enum
import weakref
from typing import Any, Callable, FrozenSet, Iterator, List, NamedTuple

import _libvswitch as vs
import every
import peer
import pointer_types
from arguments import Bytes, Index, Integer, Proxy, Text, spellings_of


class Value(NamedTuple):
    """A value, and for a pointer the spellings of its type."""

    name: str
    object: Any
    spellings: FrozenSet[str] = frozenset()


class Hostile(BaseException):
    """No Exception, so that what catches those lets it pass."""


def raiser(error: BaseException) -> Callable[..., Any]:
    """A method or property that always fails."""

    def fail(*_: object) -> Any:
        raise error

    return fail


class Endless:
    """Has every attribute, each another object that has every attribute."""

    def __getattr__(self, name: str) -> "Endless":
        return Endless()


class Looped:
    """Is what it stands for."""

    @property
    def this(self) -> "Looped":
        return self


class Loud(int):
    """An int whose own conversions fail."""

    __index__ = __int__ = __bool__ = raiser(Hostile("no number"))


class Mute(str):
    """A str that does not encode itself."""

    encode = __str__ = __hash__ = raiser(Hostile("no text"))


class Level(enum.IntEnum):
    HIGH = 2**31 - 1


class Liar:
    """Claims to be of another class."""

    __class__ = property(lambda self: str)  # type: ignore[assignment]  # it is what it is for


def _with(**attributes: Any) -> Any:
    """An object of a class of its own."""
    return type("Odd", (), attributes)()


def _temporary(address: int, spelling: str) -> Any:
    """An object whose pointer is made anew each time, so that nothing else keeps it."""
    return _with(this=property(lambda self: peer.pointer_object(address, spelling)))


INTEGERS = [0, 1, 2, -1, 2**200, -(2**200), True, Integer(7), Integer(2**70), Level.HIGH]
for _bits in (7, 8, 15, 16, 31, 32, 63, 64):
    INTEGERS += [2**_bits - 1, 2**_bits, -(2**_bits), -(2**_bits) - 1]


def _integers() -> Iterator[Value]:
    for number in INTEGERS:
        yield Value(f"{type(number).__name__} {number:#x}", number)
    yield Value("int that fails", Loud(1))
    for other in (1.5, float("nan"), float("inf"), 1j, Index()):
        yield Value(repr(other), other)
    yield Value("index that fails", _with(__index__=raiser(Hostile())))


def _texts() -> Iterator[Value]:
    for text in ("", "a", "ab", "é", "\0", "a\0b", "\ud800", "a\udcff", "dvs0", "\U0001f600" * 64):
        yield Value(ascii(text)[:20], text)
    for size in (31, 32, 63, 64, 127, 128, 254, 255, 256, 257, 4096, 70_000):
        yield Value(f"text of {size}", "x" * size)
        yield Value(f"wide text of {size}", "é" * size)
    yield Value("derived text", Text("derived"))
    yield Value("text that fails", Mute("a"))


def _buffers() -> Iterator[Value]:
    for data in (b"", b"a", b"abcdef", b"x" * 70_000, Bytes(b"derived"), bytearray(b"abcdef")):
        yield Value(f"{type(data).__name__} of {len(data)}", data)
    whole = memoryview(bytearray(12))
    yield Value("view", whole)
    yield Value("view with gaps", whole[::2])
    yield Value("view of words", whole.cast("I"))
    released = memoryview(b"abcdef")
    released.release()
    yield Value("released view", released)
    yield Value("array", array.array("Q", range(4)))
    yield Value("C array", (ctypes.c_char * 16)())


def _objects() -> Iterator[Value]:
    for thing in (None, Ellipsis, NotImplemented, [], (), {}, set(), object(), object, type):
        yield Value(repr(thing)[:30], thing)
    yield Value("module", vs)
    yield Value("variables", vs.cvar)
    yield Value("function of the module", vs.VSDVS_SetMTU)
    yield Value("function", raiser)
    yield Value("iterator", iter(()))
    yield Value("method of a pointer", every.pointer("VSInfo *", 0).own)
    yield Value("pointer type", type(every.pointer("VSInfo *", 0)))
    yield Value("function with no mark", peer.documented_function(None))
    for mark in ("", "NULL", "_", "_00", "_zz_p_void", "_" + "f" * 16, "_" + "0" * 5000):
        yield Value(f"mark {mark[:20]!r}", peer.documented_function(f"swig_ptr: {mark}"))


def _impostors() -> Iterator[Value]:
    """What poses as a pointer object, or fails while it is asked for one."""
    yield Value("loop", Looped())
    yield Value("endless", Endless())
    yield Value("liar", Liar())
    yield Value("namesake", type("SwigPyObject", (), {})())
    yield Value("namesake with slots", type("SwigPyObject", (), {"__slots__": tuple("abcd")})())
    yield Value("namesake inside", Proxy(type("SwigPyObject", (), {})()))
    yield Value("namesake of packed", type("SwigPyPacked", (), {})())
    for error in (AttributeError(), Hostile(), KeyboardInterrupt(), RecursionError()):
        name = type(error).__name__
        yield Value(f"this: {name}", _with(this=property(raiser(error))))
        yield Value(f"getattr: {name}", _with(__getattr__=raiser(error)))
        yield Value(f"getattribute: {name}", _with(__getattribute__=raiser(error)))
    for inner in (1, None, "a", object(), vs):
        yield Value(f"proxy of {inner!r:.20}", Proxy(inner))
    deep: object = 1
    for _ in range(3000):
        deep = Proxy(deep)
    yield Value("deep proxy", deep)
    gone = weakref.proxy(type("Gone", (), {})())
    yield Value("dead weak proxy", gone)
    kept = Proxy(every.pointer("VSInfo *", every.POOL))
    _ALIVE.append(kept)
    spellings = frozenset(spellings_of("VSInfo *"))
    yield Value("weak proxy", weakref.proxy(kept), spellings)


def _pointers() -> Iterator[Value]:
    for spellings in pointer_types.read():
        spelling = min(spellings)
        made = every.pointer(spelling, every.POOL)
        yield Value(f"pointer {spelling}", made, spellings)
    for spelling in ("VSInfo *", "char *", "void *", "qex_uint32 *"):
        spellings = frozenset(spellings_of(spelling))
        made = every.pointer(spelling, every.POOL)
        yield Value(f"proxy {spelling}", Proxy(made), spellings)
        yield Value(f"proxy of proxy {spelling}", Proxy(Proxy(made)), spellings)
        yield Value(f"temporary {spelling}", _temporary(int(made), spelling), spellings)
    chained = every.pointer("VSInfo *", every.POOL)
    chained.append(every.pointer("VSStats *", every.POOL))
    both = {*spellings_of("VSInfo *"), *spellings_of("VSStats *")}
    yield Value("chained pointers", chained, frozenset(both))


def _classes() -> Iterator[Value]:
    """What a registration may be given in place of a class."""
    odd = [1, "a", print, vs.VSDVS_SetMTU, lambda *_: None, raiser(Hostile()), Endless(), None]
    for destroy in odd:
        yield Value(
            f"class with destroy {destroy!r:.20}", type("C", (), {"__swig_destroy__": destroy})
        )
        yield Value(f"destroy {destroy!r:.20}", _with(__swig_destroy__=destroy))
    for make in odd:
        yield Value(f"class with new {make!r:.20}", type("C", (), {"__new__": make}))
    yield Value("class without attributes", type("C", (), {"__slots__": ()}))
    yield Value("class that refuses", type("C", (), {"__setattr__": raiser(Hostile())}))
    hostile = type("Meta", (type,), {"__getattribute__": raiser(Hostile())})
    yield Value("class of a hostile class", hostile("C", (), {}))


_ALIVE: List[object] = []


def read() -> List[Value]:
    """All values, in the same order each time."""
    makers = (_integers, _texts, _buffers, _objects, _impostors, _pointers)
    return [value for maker in makers for value in maker()]


def classes() -> List[Value]:
    """What registrations are given beside the other values."""
    return list(_classes())
