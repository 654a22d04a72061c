"""The fabric that the options before the command name."""

import contextlib
from typing import Any, Dict, Iterator, Optional

import click

from libvswitch.errors import BadParameter
from vswitch.fabric import Fabric, Unreachable, UnusableFile

__all__ = ["connected", "options_of"]


def options_of(context: click.Context) -> Dict[str, Optional[str]]:
    """What stands before the command."""
    given: Dict[str, Any] = context.find_root().params
    return {name: given.get(name) for name in ("fabric", "private_key", "certificate", "ca_cert")}


@contextlib.contextmanager
def connected(context: Optional[click.Context] = None) -> Iterator[Fabric]:
    """The fabric, for a block."""
    options = options_of(context or click.get_current_context())
    servers = options.pop("fabric") or ""
    try:
        fabric = Fabric(servers, **options)
    except BadParameter as error:
        raise click.UsageError(f"--fabric: {error}") from None
    except UnusableFile as wrong:
        option = f"--{wrong.parameter.replace('_', '-')}"
        raise Unreachable(f"{option} {wrong.file}: {wrong.why}") from None
    with fabric:
        yield fabric
