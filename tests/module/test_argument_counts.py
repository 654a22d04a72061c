"""Every function counts its arguments in the interpreter's words."""

from typing import Dict, Set

import pytest

import _libvswitch as vs
import functions
import reports

COUNTS: Dict[str, Set[int]] = {}
for _function in functions.read():
    COUNTS.setdefault(_function.name, set()).add(len(_function.arguments))

# Dispatched by their arguments, or open-ended; they have tests of their own.
EXCEPTIONS = {"DVSAliasToPortsetName", "Panic", "SWIG_PyInstanceMethod_New"}


@pytest.mark.parametrize("name", sorted(COUNTS.keys() - EXCEPTIONS))
def test_any_other_count_is_refused(name: str) -> None:
    (expected,) = COUNTS[name]
    function = getattr(vs, name)
    called = "swigregister" if name.endswith("_swigregister") else name
    for given in {0, expected - 1, expected + 1, expected + 5} - {-1, expected}:
        text = reports.argument_count(called, expected, given)
        reports.raises(TypeError, text, function, *[None] * given)


@pytest.mark.parametrize("given", [0, 2, 3])
def test_the_runtime_helper_takes_one_object(given: int) -> None:
    with pytest.raises(TypeError, match=r"takes exactly one argument \(\d given\)"):
        vs.SWIG_PyInstanceMethod_New(*[None] * given)
