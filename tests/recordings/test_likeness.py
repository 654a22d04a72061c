"""Calls of two hosts are held to each other, but not in what is each host's own."""

from typing import Any, Dict, List, Tuple

import pytest
from libvswitch.enums import Status
from vswitch.likeness import Correspondence, Untranslated, differences, named, translated
from vswitch.trace import Call, Callback, Trap


def call(function: str, inputs: Any = (), outputs: Any = (), status: Any = 0, **more: Any) -> Call:
    return Call(
        number=1,
        process=7,
        thread=1,
        function=function,
        at=0,
        inputs=dict(inputs),
        outputs=dict(outputs),
        status=status,
        has_ended=True,
        **more,
    )


def told(recorded: Call, present: Call, known: Any = None) -> List[Tuple[Any, ...]]:
    found = differences(recorded, present, known or Correspondence())
    return [(one.path, one.recorded, one.present, one.note) for one in found]


def mtu(value: Any, status: int = 0) -> Call:
    return call("VSDVS_GetMTU", {"switchName": "lab"}, {"mtu": value} if not status else {}, status)


def test_the_same_is_the_same() -> None:
    assert told(mtu(1500), mtu(1500)) == []


def test_a_value_is_told_with_its_path() -> None:
    assert told(mtu(1500), mtu(9000)) == [("out.mtu", 1500, 9000, "")]


def test_a_status_is_told_by_its_name_and_alone() -> None:
    busy = mtu(0, int(Status.BUSY))
    assert told(mtu(1500), busy) == [("status", "QEX_OK", "QEX_BUSY", "")]
    assert told(busy, mtu(0, int(Status.BUSY))) == []


def test_constants_are_told_by_their_names() -> None:
    def state(value: int) -> Call:
        return call("VSQEX_GetUplinkLinkState", outputs={"state": value})

    assert told(state(1), state(0)) == [("out.state", "up", "down", "")]
    flags = "out.security.flags"
    assert named("VSDVS_GetPortSecurity", flags, 5) == "promiscuous,forged_transmits"
    assert named("VSDVS_GetPortSecurity", flags, "5") == "5"
    assert named("VSDVS_GetPortSecurity", "out.flags", 5) == 5


def test_a_trap_is_its_type_and_its_text() -> None:
    def trapped(text: str, value: int = 1) -> Call:
        return call("VSDVS_GetMTU", status=None, trap=Trap("OSError", text, value))

    assert told(trapped("late"), trapped("late", 2)) == []
    assert told(trapped("late"), trapped("soon")) == [
        ("trap", "OSError: late", "OSError: soon", "")
    ]
    assert told(mtu(1), trapped("late")) == [("trap", "QEX_OK", "OSError: late", "")]


def uplinks(*entries: Any) -> Call:
    listed = [{"name": {"string": name}, "portID": number} for name, number in entries]
    held = {"totalEntries": len(listed), "numEntries": len(listed), "entries": listed}
    return call("VSQEX_GetUplinks", outputs={"uplinks": {"at": len(listed), "VSUplinks": held}})


def test_numbers_of_ports_are_mapped_one_to_one() -> None:
    known = Correspondence()
    assert told(uplinks(("nic0", 3), ("nic1", 4)), uplinks(("nic0", 13), ("nic1", 14)), known) == []
    path = "out.uplinks.VSUplinks.entries[0].portID"
    assert told(uplinks(("nic0", 3)), uplinks(("nic0", 15)), known) == [
        (path, 3, 15, "3 was 13 before")
    ]
    assert told(uplinks(("nic0", 5)), uplinks(("nic0", 14)), known) == [
        (path, 5, 14, "14 was 4 before")
    ]
    asked = call("VSQEX_PortGetTeamUplinkHint", {"port": 4})
    assert translated(asked, known, int)["port"] == 14
    assert translated(call("VSQEX_PortGetTeamUplinkHint", {"port": 99}), known, int)["port"] == 99


def test_lists_of_other_lengths_are_told_whole() -> None:
    found = told(uplinks(("nic0", 3)), uplinks())
    assert [one[0] for one in found] == [
        "out.uplinks.VSUplinks.totalEntries",
        "out.uplinks.VSUplinks.numEntries",
        "out.uplinks.VSUplinks.entries",
    ]
    assert found[2][2] == []


def test_what_a_tool_named_itself_has_that_name_on_both() -> None:
    known = Correspondence()
    created = call("VSDVS_CreateVSwitch", {"switchId": "lab-1", "portsetName": None})
    assert told(created, created, known) == []

    def identifier(value: str) -> Call:
        return call("DVS_SwitchId", {"handle": {"at": 1}}, status=None, result=value)

    assert told(identifier("lab-1"), identifier("other"), known) == [
        ("result", "lab-1", "other", "lab-1 was lab-1 before")
    ]
    assert told(identifier("4f2a"), identifier("77d1"), known) == []
    assert translated(call("DVSQEX_PortFind", {"switchId": "4f2a"}), known, int) == {
        "switchId": "77d1"
    }


def test_what_a_tool_names_is_not_what_is_something_else_here() -> None:
    known = Correspondence()
    assert told(uplinks(("nic0", 4)), uplinks(("nic0", 14)), known) == []
    guessed = call("VSQEX_PortGetTeamUplinkHint", {"port": 14})
    assert told(guessed, guessed, known) == []
    assert translated(guessed, known, int) == {"port": 14}
    assert told(uplinks(("nic0", 4)), uplinks(("nic0", 14)), known) == []


def test_what_is_refused_names_nothing() -> None:
    known = Correspondence()
    refused = call("VSQEX_PortGetTeamUplinkHint", {"port": 3}, status=3)
    assert told(refused, refused, known) == []
    assert told(uplinks(("nic0", 3)), uplinks(("nic0", 8)), known) == []


def test_times_and_counts_need_only_be_there() -> None:
    def table(**more: int) -> Call:
        entry = {"macAddress": "02", "vid": 0, **more}
        held = {"numEntries": 1, "macEntries": [entry]}
        return call("VSQEX_GetTeamMACTable", outputs={"table": {"at": 1, "VSMACTable": held}})

    assert told(table(elapsed=1), table(elapsed=299)) == []
    path = "out.table.VSMACTable.macEntries[0].elapsed"
    assert told(table(elapsed=1), table()) == [(path, 1, "nothing", "")]


def test_padding_says_nothing() -> None:
    def entries(pad: str) -> Call:
        held = [{"primaryVID": 5, "pad": pad}]
        return call("VSDVS_GetPrivateVLANMap", outputs={"entries": {"VSPvlanMapEntry": held}})

    assert told(entries(""), entries("x")) == []


def test_addresses_come_again_by_chance_and_are_not_compared() -> None:
    def handle(number: int) -> Call:
        return call("DVSState_PortFind", status=None, result={"at": number})

    known = Correspondence()
    assert told(handle(1), handle(8), known) == told(handle(1), handle(9), known) == []
    found = call("DVSState_PortFind", status=None, result=None)
    assert told(handle(1), found, known) == [("result", {"at": 1}, None, "")]


def test_an_image_is_given_as_the_present_host_wrote_it() -> None:
    def image(held: str) -> Call:
        outputs = {"state": {"at": 1, "bytes": held}, "length": len(held) // 2}
        return call("DVSQEX_StateGet", outputs=outputs)

    known = Correspondence()
    assert told(image("aabb"), image("ccddee"), known) == []
    back = call("DVSQEX_StateInit", {"state": {"bytes": "aabb"}, "length": 2})
    assert translated(back, known, int) == {"state": {"bytes": "ccddee"}, "length": 3}
    other = call("DVSQEX_StateInit", {"state": {"bytes": "aa"}, "length": 1})
    assert translated(other, known, int) == {"state": {"bytes": "aa"}, "length": 1}


def test_how_often_a_walk_called_back_is_told() -> None:
    def walk(argument: str, times: int) -> Call:
        visits = [Callback(at, 7, 1, argument, 0, {}) for at in range(times)]
        return call("DVSState_SwitchForEach", status=None, callbacks=visits)

    assert told(walk("callback", 2), walk("callback", 3)) == [("callbacks", 2, 3, "")]
    assert told(walk("alloc", 2), walk("alloc", 3)) == []


@pytest.mark.parametrize(
    "recorded, present, found",
    [
        ({"unread": "too long"}, {"unread": "too long"}, []),
        ({"unread": "too long"}, "x", [("out.mtu", {"unread": "too long"}, "x", "")]),
        (1, True, [("out.mtu", 1, True, "")]),
        (None, 0, [("out.mtu", None, 0, "")]),
    ],
)
def test_what_is_of_two_kinds_differs(recorded: Any, present: Any, found: List[Any]) -> None:
    assert told(mtu(recorded), mtu(present)) == found


def test_what_was_not_recorded_cannot_be_given() -> None:
    unread: Dict[str, Any] = {"list": {"at": 1}, "data": {"unread": "no memory is there"}}
    with pytest.raises(Untranslated, match="^in.data was not recorded: no memory is there$"):
        translated(call("DVSData_Update", unread), Correspondence(), int)


def test_addresses_are_those_of_the_present_host() -> None:
    given = call(
        "DVSState_PortForEach", {"handle": {"at": 3}, "callback": {"at": 4}, "context": {"at": 5}}
    )
    # The last two are the tool's own, and mean nothing to a host.
    assert translated(given, Correspondence(), lambda number: 100 + number) == {
        "handle": {"at": 103},
        "callback": {"at": 4},
        "context": {"at": 5},
    }


@pytest.mark.parametrize(
    "function, inputs, said",
    [
        (
            "VSDVS_SetMTU",
            {"switchName": None, "mtu": 1500},
            "in.switchName is null, and something must be there",
        ),
        (
            "VSDVS_GetMTU",
            {"switchName": "lab", "mtu": None},
            "in.mtu is null, and something must be there",
        ),
        (
            "DVSQEX_StateInit",
            {"state": None, "length": 9},
            "in.state is null, and in.length is not 0",
        ),
    ],
)
def test_no_null_is_given_that_no_host_need_expect(
    function: str, inputs: Dict[str, Any], said: str
) -> None:
    with pytest.raises(Untranslated, match=f"^{said}$"):
        translated(call(function, inputs), Correspondence(), int)


def test_nulls_that_hosts_expect_are_given() -> None:
    empty = call("DVSQEX_StateInit", {"state": None, "length": 0})
    assert translated(empty, Correspondence(), int) == {"state": None, "length": 0}
    named_by_host = call("VSDVS_CreateVSwitch", {"alias": "a", "switchId": None})
    assert translated(named_by_host, Correspondence(), int)["switchId"] is None
