"""Records as values: made with their fields, as dicts, compared by what they hold."""

from typing import Any

import libvswitch as vs
import pytest


def test_a_record_is_made_with_its_fields() -> None:
    learning = vs.VSMACLearning(agingTime=60, macLimit=9)
    assert (learning.agingTime, learning.macLimit, learning.learnStatic) == (60, 9, 0)
    nested = vs.VSPMACManagement(
        macChangeAllowed=True, portMACLearning=vs.VSPMACLearning(learning=True, macLimit=3)
    )
    assert nested.macChangeAllowed is True
    assert (nested.portMACLearning.learning, nested.portMACLearning.macLimit) == (True, 3)


def test_an_array_takes_its_first_elements_or_all() -> None:
    policy = vs.VSTeamPolicy(numActive=2, uplinkPortName=["left", "right"])
    assert [*policy.uplinkPortName][:3] == ["left", "right", ""]
    every = [f"u{at}" for at in range(32)]
    assert [*vs.VSTeamPolicy(uplinkPortName=every).uplinkPortName] == every
    with pytest.raises(ValueError, match="32 elements are wanted, not 33"):
        vs.VSTeamPolicy(uplinkPortName=[*every, "more"])


def test_what_a_field_refuses_a_constructor_refuses() -> None:
    with pytest.raises(OverflowError):
        vs.VSMACLearning(macLimit=2**32)
    make: Any = vs.VSMACLearning
    with pytest.raises(TypeError, match="^VSMACLearning has no field 'ageingTime', but agingTime,"):
        make(ageingTime=3)
    with pytest.raises(TypeError):
        make(3)


def test_the_fields_as_a_dict() -> None:
    policy = vs.VSTeamPolicy(loadBalance=vs.TEAM_FRP_TYPE_LB_SRCID, uplinkPortName=["left"])
    assert policy.asdict() == {
        "loadBalance": 3,
        "linkCriteria": 0,
        "percentError": 0,
        "fullDuplex": 0,
        "speed": 0,
        "flags": 0,
        "numActive": 0,
        "numStandby": 0,
        "uplinkPortName": ["left"] + [""] * 31,
    }
    entry = vs.VSMACEntry(macAddress="02:00:00:00:00:01", aging=True, vid=7)
    assert entry.asdict() == {
        "macAddress": "02:00:00:00:00:01",
        "macAddrType": 0,
        "aging": True,
        "vid": 7,
        "vni": 0,
        "elapsed": 0,
    }


def test_dicts_hold_dicts_lists_and_bytes() -> None:
    nested = vs.VSPMACManagement(portMACLearning=vs.VSPMACLearning(macLimit=3)).asdict()
    assert nested["portMACLearning"]["macLimit"] == 3
    info = vs.VSInfo().asdict()
    assert info["nebID"] == bytes(64) and info["mtu"] == 0
    filters = vs.VSExtraEthFilter().asdict()
    assert filters["multicastAddrs"] == [bytes(6)] * 32


RECORDS = [
    kind
    for kind in vars(vs).values()
    if isinstance(kind, type) and issubclass(kind, vs.Record) and kind not in (vs.Record, vs.Table)
]


def test_there_are_records() -> None:
    assert len(RECORDS) > 80


@pytest.mark.parametrize("kind", RECORDS)
def test_every_record_has_a_dict(kind: Any) -> None:
    try:
        made = kind()
    except TypeError:
        made = kind(1)
    assert set(made.asdict()) <= set(made._fields)
    assert made.same_values(made)


def test_equal_values_are_not_the_same_memory() -> None:
    one, other = vs.VSMACLearning(agingTime=60), vs.VSMACLearning(agingTime=60)
    assert one.same_values(other) and one != other
    other.macLimit = 1
    assert not one.same_values(other)
    assert not one.same_values(vs.VSPMACLearning()) and not one.same_values(60)


def test_a_record_that_is_gone_has_no_values() -> None:
    with vs.owned(vs.VSQEX_GetUplinks("vswitch0")) as (_, uplinks):
        assert [one["name"] for one in uplinks.asdict()["entries"]] == [
            {"string": "nic4"},
            {"string": "nic5"},
        ]
    with pytest.raises(ValueError, match="gone"):
        uplinks.asdict()
