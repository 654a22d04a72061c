"""simhostctl, beside processes that use the same host through the module."""

import json
import os
import re
import subprocess
import time
from pathlib import Path
from typing import Any, List

import pytest

from simulated_host import SIMHOST, Host

HINT = """
number, name = vs.VSDVS_DvPortIDToPortID("vswitch0", "web-1")[1], vs.new_qex_Name()
print(vs.VSQEX_PortGetTeamUplinkHint(number, name) or vs.qex_Name_string_get(name))
vs.delete_qex_Name(name)
"""
ADDRESSES = """
status, table = vs.VSQEX_GetPortMACTable("vswitch0", "web-1", vs.VS_MAC_ADDR_TYPE_LEARNED)
entries = vs.VSMACTable_macEntries_get(table)
for index in range(vs.VSMACTable_numEntries_get(table)):
    entry = vs.VSMACEntry___getitem__(entries, index)
    print(vs.VSMACEntry_macAddress_get(entry), vs.VSMACEntry_elapsed_get(entry))
    vs.delete_VSMACEntry(entry)
"""


def test_shows_the_host_as_a_tree(host: Host) -> None:
    host.ctl("clock", "stop")
    host.ctl("clock", "set", "12.5")
    lines = host.ctl("show").splitlines()
    assert lines[:3] == ["host", "|-- clock stopped at 12.500 s", "|-- uplinks"]
    assert "|   |-- nic0       link up, 10000 Mbit/s full duplex, free" in lines
    assert "`-- switch vswitch0: 3 of 128 ports, MTU 1500" in lines
    ports = [line for line in lines if "port web-1" in line]
    assert len(ports) == 1 and ports[0].endswith(", sends over nic4")


def test_shows_a_host_of_any_size(host: Host) -> None:
    ports = [{"id": f"port-{number}"} for number in range(4_000)]
    host.apply({"switches": [{"alias": "big", "max_ports": 4_000, "ports": ports}]})
    text = host.ctl("show", "--json")
    assert len(text) > 1 << 20, "more than the first guess at its size"
    assert len(json.loads(text)["switches"][1]["ports"]) == 4_000


def test_what_it_shows_it_applies(host: Host, tmp_path: Path) -> None:
    host.ctl("clock", "stop")
    document = tmp_path / "host.json"
    document.write_text(host.ctl("show", "--json"))
    # The groups that the ports have joined are reported anew, at the time that the clock shows.
    host.ctl("apply", str(document))
    shown = host.ctl("show", "--json")
    host.ctl("apply", str(document))
    assert host.ctl("show", "--json") == shown


def test_a_document_describes_the_fresh_host(host: Host, tmp_path: Path) -> None:
    document = tmp_path / "empty.json"
    document.write_text("{}")
    host.environment["SIMHOST_SCENARIO"] = str(document)
    assert host.described()["uplinks"] == []
    assert host.lines('print(vs.VSDVS_CreateVSwitch("s", None, None, 0, 1, 0, 0, 0))') == ["0"]


def test_a_document_that_cannot_be_used_raises(host: Host, tmp_path: Path) -> None:
    document = tmp_path / "host.json"
    document.write_text('{"switches": [{"alias": "s", "mtu": 99}]}')
    host.environment["SIMHOST_SCENARIO"] = str(document)
    lines = host.lines(
        """
try:
    vs.VSDVS_SetMTU("s", 1500)
except RuntimeError as error:
    print(error)
"""
    )
    assert lines == [
        f"VSDVS_SetMTU: the scenario {document} cannot be used: "
        "switches[0].mtu: 99 is below 1280"
    ]


def test_a_refused_document_changes_nothing(host: Host) -> None:
    host.ctl("clock", "stop")
    before = host.described()
    wrong = '{"switches": [{"alias": "new"}, {"alias": "bad", "mtu": 99}]}'
    assert host.refusal("apply", "-", given=wrong) == (
        "simhostctl: -: switches[1].mtu: 99 is below 1280\n"
    )
    assert host.described() == before


def test_a_link_that_fails_moves_the_hint(host: Host) -> None:
    assert host.lines(HINT) == ["nic4"]
    host.ctl("link", "nic4", "down")
    assert host.lines(HINT) == ["nic5"]
    host.ctl("link", "nic4", "up")
    assert host.lines(HINT) == ["nic4"]
    why = "there is no uplink 'nic9' (QEX_NOT_FOUND)"
    assert host.refusal("link", "nic9", "down") == f"simhostctl: {why}\n"


def test_learned_addresses_age_by_the_clock(host: Host) -> None:
    host.ctl("clock", "stop")
    host.ctl("learn", "vswitch0", "02:00:00:00:0a:01", "--port", "web-1", "--vlan", "4")
    assert "02:00:00:00:0a:01 0" in host.lines(ADDRESSES)
    host.ctl("clock", "step", "299.999")
    assert host.lines(ADDRESSES) == ["02:00:00:00:0a:01 299"]
    host.ctl("clock", "step", "0.001")
    assert host.lines(ADDRESSES) == []


def test_an_address_that_is_not_learned_is_told_why(host: Host) -> None:
    fixed = "02:00:00:00:00:01"
    ports = [
        {"id": "deaf"},
        {"id": "full", "mac_learning": {"learning": True, "limit": 0}},
        {"id": "owner", "addresses": [{"mac": fixed, "type": "static"}]},
    ]
    host.apply({"switches": [{"alias": "lab", "ports": ports}]})
    other = "02:00:00:00:00:02"
    for port, mac, why in (
        ("deaf", other, "the port does not learn (QEX_IS_DISABLED)"),
        ("full", other, "there is no room for another address (QEX_LIMIT_EXCEEDED)"),
        ("", fixed, "the address is fixed elsewhere (QEX_EXISTS)"),
        ("", fixed[:-1], f"'{fixed[:-1]}' is no address such as {fixed} (QEX_INVALID_ADDRESS)"),
    ):
        options = [f"--port={port}"] if port else []
        assert host.refusal("learn", "lab", mac, *options) == f"simhostctl: {why}\n"


def test_the_clock_stands_and_runs(host: Host) -> None:
    host.ctl("clock", "stop")
    host.ctl("clock", "set", "100")
    assert host.ctl("clock", "show") == "100.000\n"
    assert host.ctl("clock", "show") == "100.000\n"
    host.ctl("clock", "run")
    time.sleep(0.01)
    shown = float(host.ctl("clock", "show"))
    assert 100.01 <= shown < 160
    assert host.run("clock", "step", "-1").returncode != 0


def test_counters_are_what_the_queries_say(host: Host) -> None:
    host.ctl("counter", "vswitch0", "txErrors", str(2**64 - 1))
    assert (
        host.lines(
            """
stats = vs.new_VSServicePortTeamingStats()
print(vs.VSQEX_GetServicePortTeamingStats("vswitch0", stats))
print(vs.VSServicePortTeamingStats_txErrors_get(stats))
vs.delete_VSServicePortTeamingStats(stats)
"""
        )
        == ["0", str(2**64 - 1)]
    )
    assert host.refusal("counter", "vswitch0", "txMistakes", "1") == (
        "simhostctl: there is no counter 'txMistakes' of a switch (QEX_NOT_FOUND)\n"
    )
    assert host.refusal("counter", "vswitch0", "txErrors", "1", "--port", "web-9") == (
        "simhostctl: there is no port 'web-9' (QEX_NOT_FOUND)\n"
    )
    assert host.refusal("counter", "vswitch0", "rarpPktsSent", str(2**32)) == (
        f"simhostctl: {2**32} is above {2**32 - 1} (QEX_BAD_PARAM)\n"
    )


MOST = 2**64 - 1
ODD_NUMBERS = [
    ("counter vswitch0 txErrors -- -1", "value: '-1' is no whole number, 0 or more"),
    ("counter vswitch0 txErrors +1", "value: '+1' is no whole number, 0 or more"),
    ("counter vswitch0 txErrors 010", "value: '010' is no whole number, 0 or more"),
    ("counter vswitch0 txErrors 0x10", "value: '0x10' is no whole number, 0 or more"),
    ("counter vswitch0 txErrors 1.5", "value: '1.5' is no whole number, 0 or more"),
    (f"counter vswitch0 txErrors {MOST + 1}", f"value: {MOST + 1} is above {MOST}"),
    (f"counter vswitch0 txErrors {'9' * 20}", f"value: {'9' * 20} is above {MOST}"),
    ("fault add VSDVS_SetMTU --delay 1 --nth 0", "--nth: 0 is below 1"),
    (f"fault add VSDVS_SetMTU --delay 1 --nth {2**32}", f"--nth: {2**32} is above {2**32 - 1}"),
    ("fault add VSDVS_SetMTU --delay 1 --nth=-1", "--nth: '-1' is no whole number, 1 or more"),
    (f"fault add VSDVS_SetMTU --delay 1 --times {2**32}", f"--times: {2**32} is above {2**32 - 1}"),
    ("learn vswitch0 02:00:00:00:00:01 --vlan 65536", "--vlan: 65536 is above 65535"),
    ("learn vswitch0 02:00:00:00:00:01 --vlan 010", "--vlan: '010' is no whole number, 0 or more"),
    (f"learn vswitch0 02:00:00:00:00:01 --vni {2**32}", f"--vni: {2**32} is above {2**32 - 1}"),
    ("uplink nic4 --speed=-1", "--speed: '-1' is no whole number, 0 or more"),
    ("uplink nic4 --error-percent=1e1", "--error-percent: '1e1' is no whole number, 0 or more"),
]


@pytest.mark.parametrize("words, complaint", ODD_NUMBERS)
def test_numbers_are_read_as_in_documents(host: Host, words: str, complaint: str) -> None:
    host.ctl("clock", "stop")
    before = host.described()
    assert host.complaint(*words.split()) == complaint
    assert host.described() == before


def test_the_document_knows_the_bounds_of_an_uplink(host: Host) -> None:
    assert host.refusal("uplink", "nic4", "--speed", "0") == (
        "simhostctl: uplinks[0].speed: 0 is below 1\n"
    )
    assert host.refusal("uplink", "nic4", "--error-percent", str(MOST)) == (
        f"simhostctl: uplinks[0].error_percent: {MOST} is above 100\n"
    )


def test_faults_hit_other_processes(host: Host) -> None:
    host.ctl("fault", "add", "VSDVS_SetMTU", "--nth", "2", "--status", "QEX_BUSY")
    host.ctl(
        "fault", "add", "VSDVS_SetMTU", "--nth", "3", "--exception", "KeyError", "--message", "lost"
    )
    assert host.ctl("fault", "list").splitlines() == [
        "VSDVS_SetMTU from call 2 on, 1 x: returns QEX_BUSY; 0 made",
        "VSDVS_SetMTU from call 3 on, 1 x: KeyError: lost; 0 made",
    ]
    call = 'print(vs.VSDVS_SetMTU("vswitch0", 2000))\n'
    assert host.lines(call + f"print({0x0BAD0001 + 3})\n" + call) == [
        "0",
        str(0x0BAD0004),
        str(0x0BAD0004),
    ]
    raised = host.lines(
        f"""
try:
    {call}
except KeyError as error:
    print(repr(error))
"""
    )
    assert raised == ["KeyError('lost')"]
    assert host.ctl("fault", "list") == ""
    assert host.lines(call) == ["0"]


def test_faults_are_cleared(host: Host) -> None:
    host.ctl("fault", "add", "VSDVS_SetMTU", "--times", "0", "--status", "QEX_BUSY")
    host.ctl("fault", "clear", "VSDVS_SetMTU")
    assert host.ctl("fault", "list") == ""
    assert "QEX_NOT_SUPPORTED" in host.refusal("fault", "add", "Panic", "--status", "QEX_BUSY")


def test_a_restart_takes_what_is_not_persistent(host: Host) -> None:
    host.apply({"switches": [{"alias": "brief", "persistent": False}]})
    host.ctl("learn", "vswitch0", "02:00:00:00:0a:01", "--port", "web-1")
    host.ctl("restart")
    shown = host.described()
    assert [switch["alias"] for switch in shown["switches"]] == ["vswitch0"]
    addresses = [a for port in shown["switches"][0]["ports"] for a in port["addresses"]]
    assert {address["type"] for address in addresses} == {"static"}


def test_a_reset_makes_the_host_fresh(host: Host) -> None:
    fresh = host.ctl("show").splitlines()[2:]
    host.apply({"uplinks": [{"name": "extra"}], "switches": [{"alias": "more"}]})
    host.ctl("link", "nic0", "down")
    host.ctl("reset")
    assert host.ctl("show").splitlines()[2:] == fresh


def test_needs_to_know_which_host(host: Host, tmp_path: Path) -> None:
    state = host.environment.pop("SIMHOST_STATE")
    assert "--state FILE or SIMHOST_STATE" in host.refusal("show")
    assert host.ctl("--state", state, "show").startswith("host\n")


WRONG_WORDS = [
    ("", "a command is missing"),
    ("clock", "a command is missing"),
    ("lnk nic0 down", "there is no command 'lnk'"),
    ("clock stp", "there is no command 'stp'"),
    ("--speed 5 show", "there is no option '--speed'"),
    ("show --jsn", "there is no option '--jsn'"),
    ("link nic0 down now", "there is no use for 'now'"),
    ("link nic0 --foo", "there is no option '--foo'"),
    ("link", "'uplink' is missing"),
    ("link nic0", "'state' is missing"),
    ("link -- nic0", "'state' is missing"),
    ("link -- nic0 up --now", "there is no use for '--now'"),
    ("--state", "'--state' needs a value"),
    ("--state a --state b show", "'--state' takes one value, once"),
    ("--version=3", "'--version' takes no value"),
    ("counter vswitch0 txErrors 1 --port a --session b", "'--port' does not go with '--session'"),
    ("link nic0 sideways", "state: 'sideways' is neither up nor down"),
    ("uplink nic0 --link sideways", "--link: 'sideways' is neither up nor down"),
    ("uplink nic0 --driver perhaps", "--driver: 'perhaps' is neither true nor false"),
    ("uplink nic0 --speed", "'--speed' needs a value"),
    ("fault add VSDVS_SetMTU --nth 1 --nth 2", "'--nth' takes one value, once"),
    (
        "fault add VSDVS_SetMTU --status QEX_BUSY --exception OSError",
        "'--status' does not go with '--exception'",
    ),
    ("show --json=perhaps", "'--json' takes no value"),
    ("calls --json=5", "'--json' takes no value"),
    (
        "fault add VSDVS_SetMTU --delay soon",
        "--delay: 'soon' is no number such as 3 or 0.25",
    ),
    ("fault add VSDVS_SetMTU --delay 0x10", "--delay: '0x10' is no number such as 3 or 0.25"),
    ("fault add VSDVS_SetMTU --delay 1e3", "--delay: '1e3' is no number such as 3 or 0.25"),
    ("clock step 1.2345", "seconds: '1.2345' is no number such as 3 or 0.25"),
    ("clock set inf", "seconds: 'inf' is no number such as 3 or 0.25"),
    ("clock step 1.", "seconds: '1.' is no number such as 3 or 0.25"),
    ("clock set 1000000000000", "seconds: 1000000000000 has more than 12 digits"),
]


@pytest.mark.parametrize("words, complaint", WRONG_WORDS)
def test_wrong_words_are_named(host: Host, words: str, complaint: str) -> None:
    assert host.complaint(*words.split()) == complaint
    del host.environment["SIMHOST_STATE"]
    assert host.complaint(*words.split()) == complaint


def test_shows_no_control_characters(host: Host) -> None:
    host.apply({"switches": [{"alias": "red\x1b[31m", "ports": [{"id": "a\u009bb"}]}]})
    shown = host.ctl("show")
    assert "switch red\\x1b[31m: 1 of" in shown
    assert "port a\\xc2\\x9bb" in shown
    assert not re.search(r"[\x00-\x09\x0b-\x1f\x7f-\x9f]", shown)
    assert "'red\\x1b'" in host.refusal("learn", "vswitch0", "red\x1b")
    assert host.complaint("red\x1b") == "there is no command 'red\\x1b'"


def test_words_that_are_no_utf_8_are_refused_in_words(host: Host) -> None:
    for words in (["uplink", "nic\udcff"], ["fault", "add", "\udcff", "--status", "QEX_BUSY"]):
        assert host.refusal(*words) == "simhostctl: a word is no UTF-8\n"


def test_a_delay_is_bounded_by_the_host(host: Host) -> None:
    refusal = host.refusal("fault", "add", "VSDVS_SetMTU", "--delay", "3600.001")
    assert "a delay is an hour at most" in refusal
    host.ctl("fault", "add", "VSDVS_SetMTU", "--delay", "3600")


def test_tells_its_version_without_a_host(host: Host) -> None:
    del host.environment["SIMHOST_STATE"]
    of_the_library = host.python(
        """
simhost.simhost_version.restype = ctypes.c_char_p
print("simhostctl", simhost.simhost_version().decode())
"""
    )
    assert host.ctl("--version") == of_the_library
    assert re.fullmatch(r"simhostctl \d+\.\d+\.\d+\n", of_the_library)


@pytest.mark.parametrize("words", ["show", "calls", "clock show", "--help", "--version"])
def test_says_that_an_answer_cannot_be_written(host: Host, words: str) -> None:
    with open("/dev/full", "wb") as full:
        done = subprocess.run(
            [SIMHOST / "simhostctl", *words.split()],
            env=host.environment,
            stdout=full,
            stderr=subprocess.PIPE,
            text=True,
        )
    assert done.returncode == 1
    assert done.stderr == "simhostctl: the output cannot be written\n"


def test_says_what_carries_tunnels(host: Host) -> None:
    def underlay() -> Any:
        return host.described().get("underlay")

    host.ctl("underlay", "eth1", "192.0.2.1/24", "--gateway", "192.0.2.254")
    whole = {"device": "eth1", "address": "192.0.2.1/24", "gateway": "192.0.2.254"}
    assert underlay() == whole
    for words, why in (
        (["eth1"], "'address' is missing"),
        (["eth1", "192.0.2.1"], "underlay.address: must be an address and the bits"),
        (["eth1", "--none"], "--none"),
        (["eth1", "192.0.2.1/24", "--gateway", "2001:db8::1"], "an address of the other kind"),
    ):
        refused = host.run("underlay", *words)
        assert refused.returncode != 0 and why in refused.stderr
        assert underlay() == whole
    host.ctl("underlay", "eth2", "192.0.2.1/24")
    assert underlay() == {"device": "eth2", "address": "192.0.2.1/24"}
    host.ctl("underlay", "--none")
    assert underlay() is None


COMMANDS = (
    *("show", "apply", "link", "uplink", "learn", "counter", "clock", "restart", "reset", "fault"),
    *("connect", "disconnect", "underlay", "plane", "trace", "share", "join", "fabric"),
    *("calls", "lab"),
    *("lab up", "lab down", "lab list", "lab exec"),
    *("clock show", "clock stop", "clock run", "clock step", "clock set"),
    *("fault add", "fault list", "fault clear"),
)


def commands_in(text: str) -> List[str]:
    """The subcommands that a help lists."""
    listed = text.partition("Subcommands:\n")[2].partition("\n\n")[0]
    return re.findall(r"^  (\w+) ", listed, re.MULTILINE)


def test_explains_itself(host: Host) -> None:
    listed = commands_in(host.ctl("--help"))
    below = [
        f"{command} {inner}"
        for command in listed
        for inner in commands_in(host.ctl(command, "--help"))
    ]
    assert sorted(listed + below) == sorted(COMMANDS)


@pytest.mark.parametrize("command", COMMANDS)
def test_explains_every_command_and_every_word_of_it(host: Host, command: str) -> None:
    lines = host.ctl(*command.split(), "--help").splitlines()
    assert lines[0] and lines[1].startswith("Usage: simhostctl")
    # What has no room beside its word stands below it.
    sections = re.sub(r"\n {20,}", "  ", "\n".join(lines).partition("\n\n")[2])
    for line in re.findall(r"^  (?:[a-z-]\S*).*$", sections, re.MULTILINE):
        if "simhostctl " in line:
            continue
        word, *explained = re.split(r"\s{2,}", line.strip())
        assert explained, f"{command} does not say what {word} is"


@pytest.mark.parametrize("command", [command for command in COMMANDS if " " not in command])
def test_the_examples_of_a_help_work(host: Host, command: str) -> None:
    environment = {**host.environment, "PATH": f"{SIMHOST}:{os.environ['PATH']}"}
    for example in re.findall(r"^  (.*simhostctl .*)$", host.ctl(command, "--help"), re.MULTILINE):
        done = subprocess.run(
            ["bash", "-c", example], env=environment, capture_output=True, text=True
        )
        assert (done.returncode, done.stderr) == (0, ""), example
