"""What a tool does to its simulated host, such as a frame that arrives, is no call of it, and so in
no trace. Here it is said in a call before, which asks for a switch that is not there."""

import json
from typing import Any, Dict, List, NamedTuple, Optional

import _libvswitch as vs

__all__ = ["Said", "said_in", "say"]

_SAID = "steered: "
_CALL = "DVSState_SwitchFindByAlias"


class Said(NamedTuple):
    """What is done to the host next."""

    what: str
    arguments: List[Any]
    more: Dict[str, Any]


def say(what: str, *arguments: Any, **more: Any) -> None:
    """Says it in the trace."""
    getattr(vs, _CALL)(_SAID + json.dumps([what, arguments, more], default=_name))


def _name(error: Any) -> str:
    name: str = error.__name__
    return name


def said_in(function: str, inputs: Dict[str, Any]) -> Optional[Said]:
    """What a call of a trace says, if it is one that does."""
    alias = str(inputs.get("alias"))
    if function != _CALL or not alias.startswith(_SAID):
        return None
    return Said(*json.loads(alias[len(_SAID) :]))
