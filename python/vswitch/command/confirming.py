"""The command that confirms a change that waits."""

from libvswitch.errors import HostError, NotRestored
from vswitch.command import keeping, output
from vswitch.command.meeting import Meeting
from vswitch.command.session import host, is_json

__all__ = ["confirm"]


def confirm() -> None:
    """Confirm the change that apply --confirm-within made, so that it stays.

    The status is 1 when there is none that waits, 3 when one was not taken back as it should be.
    """
    meeting = Meeting(host())
    if meeting.confirm():
        with output.after_change():
            if is_json():
                output.write_json({"confirmed": True})
            else:
                output.line("confirmed")
        return
    last = meeting.last() or {"outcome": keeping.CONFIRMED}
    none = "no change waits to be confirmed"
    if last["outcome"] == keeping.LEFT:
        raise NotRestored(f"{none}; the last one was not taken back: {last['words']}", left=())
    if last["outcome"] == keeping.WAITING:
        raise NotRestored(f"{none}; what would have taken the last one back is gone", left=())
    if last["outcome"] == keeping.TAKEN_BACK:
        raise HostError(f"{none}; the last one was taken back")
    raise HostError(none)
