"""What is done although the program is interrupted meanwhile."""

from typing import Callable, TypeVar

__all__ = ["surely"]

T = TypeVar("T")


def surely(do: Callable[[], T]) -> T:
    """Does it; what interrupts that, as Ctrl-C does, goes on when it is done once more.

    It has to be something that takes no harm from being done twice.
    """
    try:
        return do()
    except Exception:
        raise
    except BaseException:
        do()
        raise
