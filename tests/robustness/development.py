"""Calls every function once with valid arguments, and says which raises what.

Meant for the interpreter's development mode, with warnings as errors.
"""

import sys
import warnings

import every


def main() -> None:
    """Prints a line for each function that raises, and how many there were."""
    for function in every.ALL:
        every.refresh(len(function.arguments))
        try:
            result = function.function()(*every.Plain(function)())
            if function.makes_memory:
                every.release(result)
        except Exception as error:
            print(f"{function.name}: {error!r}")
    if "planted" in sys.argv:
        warnings.warn("planted", DeprecationWarning)
    print(len(every.ALL))


if __name__ == "__main__":
    main()
