"""What a pointer leads to is in the trace, whole: each shape, on the simulated host."""

import json
from pathlib import Path
from typing import List

import pytest
from recordings import RECORDING, Recording, record
from vswitch.trace import Call

SCENARIO = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
    "switches": [
        {
            "alias": "lab",
            "id": "lab-1",
            "uplink_ports": [{"id": "left", "uplink": "nic0"}, {"id": "right", "uplink": "nic1"}],
            "lags": [
                {"name": "lag1", "uplinks": ["nic0", "nic1"]},
                {"name": "lag2", "uplinks": []},
            ],
            "ports": [
                {
                    "id": "web-1",
                    "vlan": {"id": 7, "trunk": ["10-12", 20]},
                    "addresses": [{"mac": "02:00:00:00:00:01", "type": "static", "vlan": 7}],
                    "groups": [
                        {"address": "239.1.2.3", "sources": ["10.0.0.1"]},
                        {"address": "01:00:5e:05:06:07"},
                    ],
                },
                {"id": "web-2"},
            ],
        }
    ],
}

TOOL = """
import libvswitch as vs
from libvswitch import checked
from libvswitch.values import DVMirrorEntity, DVMirrorSession, VSRuntimeOption

checked.VSDVS_GetPortVLANPolicy("lab", "web-1")
checked.VSQEX_GetLAGTable("lab")
checked.VSQEX_GetPortMACTable("lab", "web-1", 0)
number = checked.VSDVS_DvPortIDToPortID("lab", "web-1")
for mode in (0, 2, 3):
    checked.VSQEX_GetMcastFilters("lab", number, mode)
checked.VSQEX_GetMcastFilterStats("lab", number, 2, "239.1.2.3")
checked.VSQEX_GetMcastFilterStats("lab", number, 0, "01:00:5e:05:06:07")
checked.VSDVS_SetPrivateVLANMap("lab", [
    vs.VSPvlanMapEntry(primaryVID=5, secondaryVID=5, pvlanType=1),
    vs.VSPvlanMapEntry(primaryVID=5, secondaryVID=6, pvlanType=2),
])
checked.VSDVS_GetPrivateVLANMap("lab")
checked.VSQEX_SetRuntimeOptions([VSRuntimeOption(1, 20), VSRuntimeOption(13, "10.0.0.9")])
checked.VSQEX_GetRuntimeOptions([1, 13])
checked.VSDVS_AppendDVMirrorSessions("lab", "web-1", [
    DVMirrorSession("one", dstEntities=(DVMirrorEntity(0, "web-2"), DVMirrorEntity(2, "9"))),
    DVMirrorSession("two", dstEntities=(DVMirrorEntity(3, "10.0.0.7"),),
                    srcInEntities=(DVMirrorEntity(4, "3"), DVMirrorEntity(1, "nic0"))),
])
checked.VSDVS_GetDVMirrorSessions("lab", "web-1")
checked.DVSQEX_SwitchPortList("lab-1", 1)
checked.DVSQEX_GlobalPropSet("lab-1", vs.VSPROP_MTU, b"\\x28\\x23\\0\\0", 16)
checked.DVSQEX_GlobalPropGet("lab-1", vs.VSPROP_MTU)
checked.VSDVS_SetMACLearning("lab", vs.VSMACLearning(agingTime=60, learnStatic=1, macLimit=9))
checked.VSDVS_GetSwitchUplinkPorts("lab")
checked.VSQEX_GetDVMirrorSessionIDs("lab")
vs.DVS_SwitchId(None)
try:
    checked.VSDVS_GetMTU("nowhere")
except checked.NotFound:
    pass
"""


@pytest.fixture(name="recording", scope="module")
def fixture_recording(tmp_path_factory: pytest.TempPathFactory) -> Recording:
    folder = tmp_path_factory.mktemp("shapes")
    (folder / "host.json").write_text(json.dumps(SCENARIO))
    scenario = str(folder / "host.json")
    made = record(TOOL, folder / "trace.jsonl", SIMHOST_SCENARIO=scenario)
    assert made.status == 0, made.stderr
    return made


def test_an_array_after_a_record_has_the_length_that_the_record_says(recording: Recording) -> None:
    out = recording.call("VSDVS_GetPortVLANPolicy").outputs
    policy = out["policy"]["VSPortVlanPolicy"]
    assert (policy["vlanID"], policy["numRanges"]) == (7, 2)
    assert policy["vidRanges"] == [{"minVID": 10, "maxVID": 12}, {"minVID": 20, "maxVID": 20}]
    assert out["priority"] == -1


def test_records_of_their_own_lengths_follow_each_other(recording: Recording) -> None:
    table = recording.call("VSQEX_GetLAGTable").outputs["table"]["VSLAGTable"]
    assert table["numLAGs"] == 2
    assert [one["name"] for one in table["VSLAGStatus"]] == ["lag1", "lag2"]
    uplinks = [[name["string"] for name in one["uplinkNames"]] for one in table["VSLAGStatus"]]
    assert uplinks == [["nic0", "nic1"], []]


def test_bit_fields_and_addresses(recording: Recording) -> None:
    table = recording.call("VSQEX_GetPortMACTable").outputs["table"]["VSMACTable"]
    (entry,) = table["macEntries"]
    assert (entry["macAddress"], entry["macAddrType"], entry["vid"]) == ("020000000001", 0, 7)
    learning = recording.call("VSDVS_SetMACLearning").inputs["learning"]
    assert learning == {"agingTime": 60, "learnStatic": 1, "reserved": 0, "macLimit": 9}


def test_the_form_that_was_asked_for_says_which_view_holds(recording: Recording) -> None:
    tables = [
        recording.call("VSQEX_GetMcastFilters", nth).outputs["filters"]["VSMcastFilters"]
        for nth in range(3)
    ]
    # The bytes of Ethernet; those of IPv4 as they lie in a number.
    assert tables[0]["macEntries"] == ["01005e050607"]
    assert tables[1]["ipv4Entries"] == [0x030201EF]
    assert tables[2]["ipv6Entries"] == []
    assert [list(one)[2:] for one in tables] == [["macEntries"], ["ipv4Entries"], ["ipv6Entries"]]
    stats = recording.call("VSQEX_GetMcastFilterStats")
    assert stats.inputs["group"] == {"bytes": "ef010203"}
    assert stats.outputs["stats"]["VSMcastFilterStats"]["ipv4Entries"] == [0x0100000A]


def test_where_nothing_is_no_view_is_missed(recording: Recording) -> None:
    stats = recording.call("VSQEX_GetMcastFilterStats", 1).outputs["stats"]["VSMcastFilterStats"]
    names = ["version", "srcIPFilterMode", "updateTime", "vni", "totalEntries", "numEntries"]
    assert list(stats) == names and stats["numEntries"] == 0


def test_arrays_of_a_caller_and_of_the_host(recording: Recording) -> None:
    entries = [
        {"primaryVID": 5, "secondaryVID": 5, "pvlanType": 1, "pad": ""},
        {"primaryVID": 5, "secondaryVID": 6, "pvlanType": 2, "pad": ""},
    ]
    given = recording.call("VSDVS_SetPrivateVLANMap").inputs
    assert (given["entries"], given["count"]) == (entries, 2)
    out = recording.call("VSDVS_GetPrivateVLANMap").outputs
    assert (out["entries"]["VSPvlanMapEntry"], out["count"]) == (entries, 2)
    assert recording.call("VSQEX_GetRuntimeOptions").inputs["ids"] == [1, 13]


def test_a_packed_list_ends_where_it_says(recording: Recording) -> None:
    options = [
        {"type": 1, "length": 8, "data": "14000000"},
        {"type": 13, "length": 13, "data": b"10.0.0.9\0".hex()},
    ]
    given = recording.call("VSQEX_SetRuntimeOptions").inputs["options"]
    assert given == {"totalLength": 25, "VSRuntimeOptionHeader": options}
    out = recording.call("VSQEX_GetRuntimeOptions").outputs["options"]
    assert out["VSRuntimeOptions"]["VSRuntimeOptionHeader"] == options


def entities(call: Call) -> List[object]:
    table = call.inputs.get("table") or call.outputs["table"]["DVMirrorSessionTable"]
    return [
        [one["sid"] for one in table["sessions"]],
        [one["startIdx"] for one in table["sessions"]],
        table["DVMirrorEntity"],
    ]


def test_a_table_of_sessions_has_the_entities_of_all(recording: Recording) -> None:
    address = {"isIPv6": 0, "pad": "000000", "ipv4": {"s_addr": 0x0700000A}}
    expected = [
        ["one", "two"],
        [0, 2],
        [
            {"type": 0, "dvPortId": "web-2"},
            {"type": 2, "vlan": 9},
            {"type": 3, "ip": address},
            {"type": 4, "portId": 3},
            {"type": 1, "uplink": {"string": "nic0"}},
        ],
    ]
    assert entities(recording.call("VSDVS_AppendDVMirrorSessions")) == expected
    assert entities(recording.call("VSDVS_GetDVMirrorSessions")) == expected


def test_bytes_have_their_length(recording: Recording) -> None:
    given = recording.call("DVSQEX_GlobalPropSet").inputs
    assert (given["data"], given["length"]) == ({"bytes": "28230000"}, 4)
    out = recording.call("DVSQEX_GlobalPropGet").outputs
    assert (out["data"]["bytes"], out["length"]) == ("28230000", 4)


def test_lists_of_names_and_ports(recording: Recording) -> None:
    ports = recording.call("DVSQEX_SwitchPortList").outputs["ports"]["DVPortList"]
    assert ports["nports"] == len(ports["dvPort"]) == 4
    assert {one["dvPortId"] for one in ports["dvPort"]} == {"web-1", "web-2", "left", "right"}
    names = recording.call("VSDVS_GetSwitchUplinkPorts").outputs["ids"]["VSUplinkPortIds"]
    assert names["uplinkPortId"] == ["left", "right"]
    ids = recording.call("VSQEX_GetDVMirrorSessionIDs").outputs["ids"]["VSDVMirrorSessionIDs"]
    assert ids["numEntries"] == len(ids["entries"])


def test_memory_has_one_number_until_it_is_released(recording: Recording) -> None:
    seen = set()
    for call in recording.calls:
        for value in call.outputs.values():
            if isinstance(value, dict) and "at" in value:
                assert value["at"] not in seen, "a number is not used again"
                seen.add(value["at"])
        if call.function in ("VSDVS_FreeMemory", "VSQEX_FreeMemory", "DVSQEX_DataFree"):
            (released,) = call.inputs.values()
            assert released["at"] in seen
    assert len(seen) > 10


def test_nothing_is_nothing(recording: Recording) -> None:
    call = recording.call("DVS_SwitchId")
    assert (call.inputs, call.result) == ({"handle": None}, None)


def test_what_a_refused_call_left_is_not_told(recording: Recording) -> None:
    call = [one for one in recording.calls if one.inputs.get("switchName") == "nowhere"][0]
    assert call.status not in (0, None) and call.outputs == {}


def test_what_cannot_be_followed_is_said_and_harms_nobody(tmp_path: Path) -> None:
    program = """
    import _libvswitch as flat, peer
    from recording_host import RecordingHost
    host = RecordingHost()
    host.answer("VSQEX_GetUplinks", outputs={2: 0x1000})
    print(int(flat.VSQEX_GetUplinks("lab")[1]))
    host.answer("VSQEX_GetUplinks", outputs={2: (2).to_bytes(8, "little")})
    flat.DVSData_Update(None, "name", peer.pointer_object(0x2000, "void *"), 16, 8)
    # An array that says that it is longer than all memory.
    import ctypes
    long = ctypes.create_string_buffer(b"\\xff" * 64)
    host.answer("VSQEX_GetUplinks", outputs={2: ctypes.addressof(long)})
    flat.VSQEX_GetUplinks("lab")
    host.answer("VSQEX_GetMcastFilters", outputs={4: ctypes.addressof(long)})
    flat.VSQEX_GetMcastFilters("lab", 1, 1)
    """
    made = record(program, tmp_path / "trace.jsonl", RECORDING)
    assert (made.status, made.stdout) == (0, "4096\n"), made.stderr
    not_there = {"unread": "no memory of the process is there"}
    first, second = (made.call("VSQEX_GetUplinks", nth).outputs["uplinks"] for nth in range(2))
    assert first["VSUplinks"] == not_there
    assert made.call("DVSData_Update").inputs["data"] == not_there
    assert second["VSUplinks"]["entries"] == {"unread": "it is longer than a trace holds"}
    filters = made.call("VSQEX_GetMcastFilters").outputs["filters"]["VSMcastFilters"]
    assert filters["unread"] == "nothing says which view of it holds"
