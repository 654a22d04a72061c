"""Virtual switches of this host, as classes and functions.

Every record of the host is a class here, every call a function, every constant a name; they are
the flat functions of `_libvswitch` in a shape that frees memory, checks bounds and prints itself.
Beyond them there are:

    Cell      memory of a C type, for calls that fill or read what a pointer points to
    owned     releases what the library allocated, at the end of a block
    Callback  a Python function that the library may call

`python3 -m libvswitch.doctor` says what is wrong when this does not load.
"""

import sys as _sys
from importlib import import_module as _import_module
from typing import Any as _Any
from typing import List as _List

_MODULES = ("cells", "checked", "doctor", "enums", "errors", "values")
_PARTS = ("_constants", "_classes", "_calls")
_BESIDE = {
    "_records": ("Record", "Table"),
    "_arrays": ("Array",),
    "_ownership": ("owned",),
    "cells": ("Callback", "Cell", "Pointer"),
}


def _load() -> None:
    """Fills this module. Apart from its import, so that the doctor can be found in a package whose
    libraries would not load."""
    if "__all__" in globals():
        return
    globals()["cvar"] = _import_module("_libvswitch").cvar
    for part in _PARTS:
        made = vars(_import_module(f"libvswitch.{part}"))
        names = made.get("__all__") or [name for name in made if not name.startswith("_")]
        globals().update({name: made[name] for name in names})
    for module, names in _BESIDE.items():
        for name in names:
            globals()[name] = getattr(_import_module(f"libvswitch.{module}"), name)
    globals()["__all__"] = sorted(
        name for name in globals() if not name.startswith("_") and name not in _MODULES
    )


def __getattr__(name: str) -> _Any:
    # The parts of this package are found without loading it.
    if name in _MODULES or (name.startswith("_") and name != "__all__"):
        raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
    _load()
    try:
        return globals()[name]
    except KeyError:
        raise AttributeError(f"module {__name__!r} has no attribute {name!r}") from None


def __dir__() -> _List[str]:
    return sorted(globals())


# `python3 -m` looks for its program with this argument: then nothing is loaded before it is asked.
if _sys.argv[:1] != ["-m"]:
    _load()
