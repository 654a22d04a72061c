"""The command that asks hosts what would be if an uplink failed."""

import dataclasses

from libvswitch.errors import HostError
from vswitch.command import output
from vswitch.command.arguments import seconds
from vswitch.command.fabric.arguments import SWITCH
from vswitch.command.fabric.connection import connected
from vswitch.command.session import is_json

__all__ = ["drill"]


def drill(
    alias: str = SWITCH,
    timeout: float = seconds(5.0, least=0.1, words="How long hosts may take to reply."),
) -> None:
    """Ask the hosts of a switch what would carry their ports if an uplink failed.

    Nothing is taken down: each host says what it would do, for each of its uplinks and the ports
    that it carries. The status is 1 when a port would be without an uplink, or a host does not
    reply.
    """
    with connected() as fabric, output.progress(f"asking the hosts of {alias}"):
        replies = fabric.drill(alias, timeout)
    told = [reply for reply in replies.values() if reply and not isinstance(reply, HostError)]
    found = [one for reply in told for one in reply]
    if is_json():
        output.write_json([dataclasses.asdict(one) for one in found])
    else:
        rows = [(one.host, one.uplink, one.port, one.meanwhile or "none") for one in found]
        output.table(("host", "down", "port", "carried by"), rows)
    wrong = [f"{host}: {why}" for host, why in replies.items() if isinstance(why, HostError)]
    silent = [host for host, reply in replies.items() if reply is None]
    lost = [f"{one.port} without {one.host}/{one.uplink}" for one in found if one.meanwhile is None]
    wrong += [f"no uplink would carry {', '.join(lost)}"] if lost else []
    wrong += [f"no reply from {', '.join(silent)}"] if silent else []
    if wrong:
        raise HostError("; ".join(wrong))
