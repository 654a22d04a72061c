"""The arguments and options that several commands have."""

from typing import Any, Optional

import typer

from vswitch.command import completing

__all__ = ["EVERY", "PLACE", "SWITCH", "seconds"]

# More than a system can be asked to wait is no time, and neither is nan.
_LONGEST = 10.0**9


def _check_seconds(given: Optional[float]) -> Optional[float]:
    if given is not None and not given <= _LONGEST:
        raise typer.BadParameter(f"{given} is no time of up to {_LONGEST:.0f} seconds.")
    return given


def seconds(default: Any, *names: str, least: float, words: str) -> Any:
    """An option that takes a time; ... for its default says that it must be given."""
    return typer.Option(
        default, *names, metavar="S", min=least, callback=_check_seconds, help=words
    )


PLACE = typer.Argument(
    ...,
    metavar="SWITCH[/PORT]",
    help="A switch, or a port of it.",
    autocompletion=completing.things,
)
SWITCH = typer.Argument(
    ..., metavar="SWITCH", help="The alias of a switch.", autocompletion=completing.switches
)
EVERY = seconds(1.0, "--every", least=0.05, words="Seconds between two times.")
