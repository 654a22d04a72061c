"""The calls of the module by the table of functions, in the form that parametrised tests want."""

import re
from dataclasses import dataclass
from typing import Any, Callable, Iterable, List, Tuple, Type
from unittest.mock import ANY

import _libvswitch as vs
import arguments
import functions
import pytest
import reports
from arguments import Kind, Sample

NO_SUCH_FORM = (
    "Wrong number or type of arguments for overloaded function 'DVSAliasToPortsetName'.\n"
    "  Possible C/C++ prototypes are:\n"
    "    DVSAliasToPortsetName(char const *,char *)\n"
    "    DVSAliasToPortsetName(char const *,char [128])\n"
)

Failure = Tuple[Type[Exception], str]


@dataclass(frozen=True)
class Call:
    """A call, or one form of it."""

    name: str
    arguments: Tuple[str, ...]
    """The C types of its arguments."""
    ignores_more: bool
    """Whether it takes any number of further arguments; the host then sees a null pointer."""
    result: str
    outputs: Tuple[str, ...]
    """What the list holds after the result; with no outputs the result stands alone."""
    forms: int

    def __str__(self) -> str:
        return self.name if self.forms == 1 else f"{self.name}/{len(self.arguments)}"

    def __call__(self, *given: object) -> Any:
        return getattr(vs, self.name)(*given)

    def kind(self, position: int) -> Kind:
        """The kind of an argument, counted from 1."""
        return arguments.kind(self.arguments[position - 1])

    def plain(self) -> List[Sample]:
        """Arguments that convert, each another."""
        return [self.kind(position).plain(position) for position in self.positions()]

    def given(self) -> List[Any]:
        """The same, as Python gives them."""
        return [sample.given for sample in self.plain()]

    def given_with(self, position: int, value: object) -> List[Any]:
        """The same but for one."""
        values = self.given()
        values[position - 1] = value
        return values

    def seen(self, samples: Iterable[Sample]) -> Tuple[Any, ...]:
        """All parameters of the host's function for such arguments."""
        rest = (None,) if self.ignores_more else (ANY,) * len(self.outputs)
        return (*(sample.seen for sample in samples), *rest)

    def positions(self, *kinds: Type[Kind]) -> List[int]:
        """The positions of all arguments, or of those of some kinds."""
        everything = range(1, len(self.arguments) + 1)
        return [p for p in everything if not kinds or isinstance(self.kind(p), kinds)]

    def output_position(self, index: int) -> int:
        """The position of an output among the parameters of the host's function."""
        return len(self.arguments) + 1 + index

    def refusal(self, position: int, error: Type[Exception]) -> Failure:
        """What an argument that does not convert raises."""
        if self.forms > 1:
            return NotImplementedError, NO_SUCH_FORM
        return error, reports.argument(self.name, position, self.arguments[position - 1])

    def wrong_count(self, given: int) -> Failure:
        """What another number of arguments than the right one raises."""
        if self.forms > 1:
            return NotImplementedError, NO_SUCH_FORM
        return TypeError, reports.argument_count(self.name, len(self.arguments), given)


def _read() -> List[Call]:
    listed = [function for function in functions.read() if function.kind == "call"]
    names = [function.name for function in listed]
    found = []
    for function in listed:
        taken = tuple(argument for argument in function.arguments if argument != "...")
        result = re.fullmatch(r"\[(.*)\]", function.result)
        own, *outputs = result[1].split(", ") if result else [function.result]
        found.append(
            Call(
                name=function.name,
                arguments=taken,
                ignores_more=taken != function.arguments,
                result=own,
                outputs=tuple(outputs),
                forms=names.count(function.name),
            )
        )
    return found


ALL = _read()


def each(wanted: Iterable[Call] = ALL) -> Callable[[Any], Any]:
    """Parametrises a test with `call`."""
    found = list(wanted)
    assert found, "a rule that holds for nothing proves nothing"
    return pytest.mark.parametrize("call", found, ids=str)


def each_argument(wanted: Callable[[Kind], object] = lambda kind: True) -> Callable[[Any], Any]:
    """Parametrises a test with `call` and `position`, for each argument of the kinds wanted."""
    found = [(call, p) for call in ALL for p in call.positions() if wanted(call.kind(p))]
    assert found, "a rule that holds for nothing proves nothing"
    return pytest.mark.parametrize(
        "call, position", found, ids=[f"{call}-{position}" for call, position in found]
    )


def of_kinds(*kinds: Type[Kind]) -> Callable[[Kind], bool]:
    """Selects the arguments of some kinds."""
    return lambda kind: isinstance(kind, kinds)
