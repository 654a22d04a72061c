"""What of a call is each host's own, and whether it changes the host, in sentences."""

from typing import Dict, List

import call_model
from call_model import Call, Volatile
from definitions import Field


def of_call(call: Call) -> List[str]:
    sentences = ["changes nothing of the host."] if call.asks else []
    own: Dict[Volatile, List[str]] = {}
    for one in call.arguments:
        if one.volatile is not None:
            own.setdefault(one.volatile, []).append(f"`{one.name}`")
    if call.result.volatile is not None:
        own.setdefault(call.result.volatile, []).append("what is returned")
    sentences += [f"{' and '.join(names)}: {_of(kind)}." for kind, names in own.items()]
    return sentences


def of_field(one: Field) -> str:
    kind = call_model.kind_of(one.volatile)
    return _of(kind) if kind is not None else ""


def _of(kind: Volatile) -> str:
    # Of those the value says already that it is nobody else's.
    if kind in (Volatile.IMAGE, Volatile.CALLERS_OWN, Volatile.PADDING):
        return kind.value
    return f"{kind.value}, each host's own"
