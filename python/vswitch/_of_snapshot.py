"""What all know of snapshots: which documents are some, and what plans take from them.

A snapshot is a document with its version under `observed`.
"""

from typing import Any, Callable, Container, Dict

from vswitch.words import DocumentError

__all__ = ["NOT_TOLD", "VERSION", "settable"]

VERSION = 1

NOT_TOLD = {
    "clock": "what the clock of the host shows",
    "persistent": "whether a switch outlasts a restart: each does in a clone",
    "external_id": "what another system calls a port",
    "uplinks": "those at no switch that runs; speed, duplex, damaged frames, driver of the others",
    "link": "why a link is down: in a clone its cable is out",
    "number": "a document gives no port its number, by which teaming chooses an uplink",
    "client": "whether the client's side of a port is up while it has no client",
}
"""What no call tells and no document says, by the keys of documents where they have one."""

# What goes on at a host is its own: no call sets it, or it would be another host for it.
_OF_UPLINK = ("link", "lacp")
_OF_SWITCH = ("addresses", "counters", "mirror_counters")
_OF_PORT = ("groups", "counters")
_OWN = ("number", *_OF_UPLINK, *_OF_PORT, *_OF_SWITCH[1:])


def settable(document: Any, whole: bool) -> Any:
    """A document as plans read it; of a snapshot without what is the host's own.

    What a snapshot does not know would be taken away by a plan that is `whole`: DocumentError.
    """
    observed = document.get("observed") if isinstance(document, dict) else None
    if not isinstance(observed, dict) or "snapshot" not in observed:
        return document
    version = observed["snapshot"]
    if version != VERSION:
        expected = f"a snapshot of version {version!r}; this reads version {VERSION}"
        raise DocumentError("observed.snapshot", expected)
    if whole:
        _refuse_parts(observed)
    return _without(document, (), uplinks=lambda one: _without(one, _OF_UPLINK), switches=_switch)


def _refuse_parts(observed: Dict[str, Any]) -> None:
    for key, words in (("refused", "was refused"), ("left_out", "was left out")):
        if any(one.get("what") not in _OWN for one in _listed(observed, key)):
            expected = f"what {words} when this was made would be taken away"
            raise DocumentError(f"observed.{key}", expected)
    if "anonymized" in observed:
        raise DocumentError("observed.anonymized", "what it names has other names on every host")


def _switch(given: Any) -> Any:
    return _without(given, _OF_SWITCH, ports=lambda one: _without(one, _OF_PORT))


def _listed(observed: Dict[str, Any], key: str) -> Any:
    """What is listed; a damaged list says nothing that could be relied on."""
    found = observed.get(key, [])
    if not isinstance(found, list) or not all(isinstance(one, dict) for one in found):
        raise DocumentError(f"observed.{key}", "a list of objects is expected")
    return found


def _without(given: Any, keys: Container[str], **parts: Callable[[Any], Any]) -> Any:
    """An object without some keys, and with lists of what is made of their items. What is nothing
    of the kind stays: who reads documents tells its path."""
    if not isinstance(given, dict):
        return given
    return {
        key: [parts[key](one) for one in value]
        if key in parts and isinstance(value, list)
        else value
        for key, value in given.items()
        if key not in keys
    }
