"""What is being done, for those who watch."""

import sys
import time


class Progress:
    """One line on a terminal that says what is being measured; elsewhere, a line now and then."""

    def __init__(self) -> None:
        self._terminal = sys.stderr.isatty()
        self._last = float("-inf")

    def __call__(self, text: str) -> None:
        now = time.monotonic()
        if self._terminal:
            print(f"\r\033[K{text}", end="", file=sys.stderr, flush=True)
        elif now - self._last > 10:
            print(text, file=sys.stderr, flush=True)
            self._last = now

    def clear(self) -> None:
        """Remove the line."""
        if self._terminal:
            print("\r\033[K", end="", file=sys.stderr, flush=True)
