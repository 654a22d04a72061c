"""The exact words of failure reports, and a check that a call makes one."""

from typing import Any, Type

import pytest


def argument(method: str, position: int, c_type: str) -> str:
    return f"in method '{method}', argument {position} of type '{c_type}'"


def argument_count(method: str, expected: int, given: int) -> str:
    plural = "" if expected == 1 else "s"
    return f"{method}() takes exactly {expected} argument{plural} ({given} given)"


def null_argument(method: str, position: int, c_type: str) -> str:
    return "invalid null reference " + argument(method, position, c_type)


def null_variable(field: str, c_type: str) -> str:
    return f"invalid null reference in variable '{field}' of type '{c_type}'"


def raises(error: Type[BaseException], text: str, function: Any, *arguments: Any) -> None:
    """Fails unless the call raises exactly this type with exactly this text."""
    with pytest.raises(BaseException) as caught:
        function(*arguments)
    assert caught.type is error, caught.value
    assert str(caught.value) == text
