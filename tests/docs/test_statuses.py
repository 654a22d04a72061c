"""What the headers say of statuses, the simulated host returns.

Each status that the comment of a call lists is provoked; one without a provocation fails. What the
comment of a header lists is tried on every call that it is about: names of nothing, and nulls.
A text of which it is not said to be known need not be.
"""

from typing import Any, Dict, Iterator, List, Tuple

import libvswitch as vs
import provoked_configuration
import provoked_queries
import provoked_state
import pytest
import statuses
from asking import ID, KEY, PORT, SWITCH, status_of, made, number
from call_entries import Call
from catalogue import Catalogue
from conftest import BUILD, ROOT
from simhost import Host

CATALOGUE = Catalogue(ROOT, BUILD)
CALLS = [call for call in CATALOGUE.calls.values() if call.statuses]
PROVOKED = {
    **provoked_configuration.PROVOKED,
    **provoked_queries.PROVOKED,
    **provoked_state.PROVOKED,
}


def listed(call: Call) -> List[str]:
    """The statuses that a call's own comment lists, beside success."""
    return sorted({*call.comment.statuses} - {"QEX_OK"})


@pytest.mark.parametrize(
    "call, status", [(one.name, status) for one in CALLS for status in listed(one)]
)
def test_what_a_comment_lists(host: Host, call: str, status: str) -> None:
    assert PROVOKED[call][status](host) == getattr(vs, status)


def test_nothing_is_provoked_that_no_comment_lists() -> None:
    told = {one.name: listed(one) for one in CALLS if listed(one)}
    assert {call: sorted(acts) for call, acts in PROVOKED.items()} == told


def arguments(call: Call) -> Dict[str, Any]:
    """Arguments with which a call reaches what it is asked for."""
    found: Dict[str, Any] = {}
    cell: Any = vs.Cell
    texts = {"switchName": SWITCH, "switchId": ID, "port": PORT, "uplink": "nic4", "key": KEY}
    numbers = {"type": 1, "propertyType": vs.CONFIG_PROP_TYPE, "propertyTypes": vs.ALL_PROP_TYPE}
    for one in call.arguments:
        plain = one.types[0].replace(" or None", "")
        if plain == "DVMirrorSessionTable":
            found[one.name] = made(vs.alloc_dvmirror_session_table(0, 0), version=3)
        elif plain in CATALOGUE.known.records:
            sized = CATALOGUE.known.records[plain].constructor
            found[one.name] = getattr(vs, plain)(*([8] if sized else []))
        elif plain.startswith("Cell"):
            found[one.name] = cell(plain.split('"')[1]).pointer
        elif plain == "str":
            found[one.name] = texts.get(one.name, "name")
        elif plain == "int" and one.name == "port":
            found[one.name] = number()
        elif plain == "int" or plain.endswith(" or int"):  # of a family
            found[one.name] = numbers.get(one.name, 0)
        elif plain == "bytes":
            found[one.name] = bytes(16)
        else:
            found[one.name] = None
    return found


def status_with(call: Call, name: str, given: Any) -> int:
    """What a call returns when one of its arguments is another."""
    passed = {**arguments(call), name: given}
    values = list(passed.values())[: len(call.forms[0])]
    return status_of(getattr(vs, call.name), *values)


def names() -> Iterator[Tuple[str, str]]:
    """Calls, each with a parameter that must name what the host knows."""
    for call in CALLS:
        concerned = statuses.concerned(
            CATALOGUE.modelled[call.name], CATALOGUE.headers[call.header]
        )
        for name in concerned.get("QEX_NOT_FOUND", []):
            yield call.name, name


@pytest.mark.parametrize("call, name", names())
def test_a_name_of_nothing(host: Host, call: str, name: str) -> None:
    assert "QEX_NOT_FOUND" in CATALOGUE.calls[call].statuses
    assert status_with(CATALOGUE.calls[call], name, "nowhere") == vs.QEX_NOT_FOUND


@pytest.mark.parametrize("call, name", names())
def test_no_name_at_all(host: Host, call: str, name: str) -> None:
    described = CATALOGUE.calls[call]
    # An array of bytes that is not given is an empty one.
    is_array = CATALOGUE.modelled[call].argument(name).type.is_array
    assert "QEX_BAD_PARAM" in described.statuses
    status = vs.QEX_NOT_FOUND if is_array else vs.QEX_BAD_PARAM
    assert status_with(described, name, None) == status


def other_texts() -> Iterator[Tuple[str, str]]:
    known = set(names())
    for call in CALLS:
        if "QEX_NOT_FOUND" not in call.comment.statuses:
            for name in CATALOGUE.modelled[call.name].texts:
                if (call.name, name) not in known:
                    yield call.name, name


@pytest.mark.parametrize("call, name", other_texts())
def test_what_may_be_unknown(host: Host, call: str, name: str) -> None:
    assert status_with(CATALOGUE.calls[call], name, "nowhere") != vs.QEX_NOT_FOUND


def test_names_and_other_texts() -> None:
    assert len(list(names())) > 140
    assert ("VSDVS_CreateVSwitch", "switchId") in other_texts()
    assert ("DVSQEX_SwitchAdd", "alias") in other_texts()
