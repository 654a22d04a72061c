"""The host of this process for a replay: calls made through the library that reads and writes the
values of traces as the recorder does."""

import contextlib
import ctypes
import json
from typing import Any, Dict, Iterator, List, Optional

import _libvswitch

from libvswitch.errors import HostError
from vswitch import _front
from vswitch._meanings import CALLS
from vswitch.likeness import Untranslated
from vswitch.replay import Visit

__all__ = ["PresentHost"]

_LIBRARY = "libreplayer.so"
_Visitor = ctypes.CFUNCTYPE(ctypes.c_int, ctypes.c_char_p)


class PresentHost:
    """The host that the module has found."""

    def __init__(self) -> None:
        library = _front.folder() / _LIBRARY
        if not library.exists():
            raise HostError(f"replay is not installed: there is no {library}")
        self._library = ctypes.CDLL(str(library))
        for name in ("open", "check", "make"):
            getattr(self._library, f"replayer_{name}").restype = ctypes.c_char_p
        self._library.replayer_check.argtypes = [ctypes.c_size_t, ctypes.c_char_p]
        self._library.replayer_make.argtypes = [ctypes.c_size_t, ctypes.c_char_p, _Visitor]
        lacking = self._library.replayer_open(_libvswitch.__file__.encode())
        if lacking is not None:
            raise HostError(f"no call can be made: {lacking.decode()}")
        self._visits: List[Visit] = []
        self._raised: List[BaseException] = []
        # It lives as long as the library may call it.
        self._visitor = _Visitor(self._visit)

    def check(self, function: str, inputs: Dict[str, Any]) -> Optional[str]:
        wrong = self._library.replayer_check(CALLS[function]["number"], _written(inputs))
        return None if wrong is None else wrong.decode("utf-8", "replace")

    def make(self, function: str, inputs: Dict[str, Any], visit: Visit) -> Dict[str, Any]:
        with self._visited(visit):
            told = self._library.replayer_make(
                CALLS[function]["number"], _written(inputs), self._visitor
            )
        end: Dict[str, Any] = json.loads(told)
        if "refused" in end:
            raise Untranslated(end["refused"])
        return end

    @contextlib.contextmanager
    def _visited(self, visit: Visit) -> Iterator[None]:
        """Callbacks of a call go to its visit; what that raises comes out of the call."""
        self._visits.append(visit)
        try:
            yield
        finally:
            self._visits.pop()
        if self._raised:
            raise self._raised.pop()

    def _visit(self, told: bytes) -> int:
        # Once something is wrong, a walk ends.
        if self._raised:
            return 0
        callback = json.loads(told)
        try:
            return self._visits[-1](callback["argument"], callback["in"])
        except BaseException as error:
            self._raised.append(error)
            return 0


def _written(inputs: Dict[str, Any]) -> bytes:
    return json.dumps(inputs).encode()
