"""Why a fabric does not do what was asked of it."""

from libvswitch.errors import Busy

__all__ = ["OtherVersion", "TransactionRefused", "Unreachable", "UnusableFile"]


class Unreachable(Busy):
    """No server of the fabric can be used, and nothing was changed."""


class OtherVersion(Unreachable):
    """A server has a schema that this client does not know."""


class UnusableFile(Unreachable):
    """A file by which one side knows the other will not do: that of the parameter `parameter`."""

    def __init__(self, parameter: str, file: str, why: str) -> None:
        super().__init__(f"{parameter} {file}: {why}")
        self.parameter = parameter
        self.file = file
        self.why = why


class TransactionRefused(Exception):
    """The database did nothing of a transaction. `is_final` tells whether no server would."""

    # All others may be those of a server in need.
    _FINAL = (
        "timed out",
        "constraint violation",
        "referential integrity violation",
        "permission error",
    )

    def __init__(self, error: str, details: str) -> None:
        super().__init__(f"{error}: {details}" if details else error)
        self.error = error
        self.is_final = error in self._FINAL

    def words(self) -> str:
        """For whoever wanted it."""
        if self.error == "permission error":
            return f"the fabric does not let this client change that: {self}"
        if self.error == "timed out":
            return "somebody else changed the same meanwhile, and nothing of this is changed"
        return f"the fabric does not take it: {self}"
