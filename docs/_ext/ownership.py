"""Who owns what a call takes and returns, in sentences made of the model of the calls."""

from typing import Iterator, List

from call_model import RESULT, Argument, Call, Direction, Ownership
from definitions import Definitions, Function

_KEPT = "nothing changes hands."
_RELEASED = "releases memory; what the caller has of it is no longer to be used."


def of_call(call: Call) -> List[str]:
    sentences = [text for one in call.arguments for text in _of_argument(one)]
    if call.result.value.ownership is Ownership.VIEW:
        sentences.append(f"What is returned is {_view(call.result.value.until)}.")
    return sentences or [_KEPT]


def of_function(known: Definitions, function: Function) -> List[str]:
    """Of what the module adds to the calls of the host."""
    if any(function.says("releases", one.name) for one in function.parameters):
        return [_RELEASED]
    deallocator = function.says("allocates", RESULT)
    if deallocator:
        return [f"the caller's, until {deallocator} releases it."]
    return [of_result(known, function)]


def of_result(known: Definitions, method: Function) -> str:
    """Whose is what a method, or a function like one, returns."""
    type_ = known.resolve(method.result)
    if method.owns_elements or (not type_.layers and type_.name in known.records):
        return "Python owns what is returned, and frees it."
    if type_.is_pointer and type_.name in known.records:
        return "what is returned lies in the record, and nothing frees it."
    return _KEPT


def _of_argument(one: Argument) -> Iterator[str]:
    value = one.value
    if value.ownership is Ownership.RELEASED:
        yield _RELEASED
    elif value.ownership is Ownership.ALLOCATED:
        unless = f", unless {value.unless}" if value.unless else ""
        memory = f"the library's memory, for {value.deallocator} to release once"
        yield f"`{one.name}`: {memory}{unless}."
    elif value.ownership is Ownership.VIEW:
        yield f"`{one.name}`: {_view(value.until)}."
    elif value.ownership is Ownership.CALLER:
        filled = one.direction is Direction.OUT
        yield f"`{one.name}`: the caller's{'; the call fills it' if filled else ', only read'}."


def _view(until: str) -> str:
    return f"a view of what stays the library's, good until {until}; nothing frees it"
