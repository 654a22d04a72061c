"""What comes to a host from outside, through both fixtures, as calls of the host see it."""

import doctest
import re
import sys
from pathlib import Path
from typing import Any, Callable, Iterator, List

import _libvswitch as vs
import pytest
import simhost
from simhost import Host, HostRefused, SharedHost, SimulatedHost

LEARNED = "02:00:00:00:0a:01"
ADDRESSES = """
import _libvswitch as vs
status, table = vs.VSQEX_GetPortMACTable("vswitch0", "web-1", vs.VS_MAC_ADDR_TYPE_LEARNED)
entries = vs.VSMACTable_macEntries_get(table)
for index in range(vs.VSMACTable_numEntries_get(table)):
    entry = vs.VSMACEntry___getitem__(entries, index)
    print(vs.VSMACEntry_macAddress_get(entry))
    vs.delete_VSMACEntry(entry)
vs.VSQEX_FreeMemory(table)
"""
HINT = """
import _libvswitch as vs
number, name = vs.VSDVS_DvPortIDToPortID("vswitch0", "web-1")[1], vs.new_qex_Name()
print(vs.VSQEX_PortGetTeamUplinkHint(number, name) or vs.qex_Name_string_get(name))
vs.delete_qex_Name(name)
"""
ERRORS = """
import _libvswitch as vs
stats = vs.new_VSServicePortTeamingStats()
print(vs.VSQEX_GetServicePortTeamingStats("vswitch0", stats))
print(vs.VSServicePortTeamingStats_txErrors_get(stats))
vs.delete_VSServicePortTeamingStats(stats)
"""
SET_MTU = """
import _libvswitch as vs
try:
    print(vs.VSDVS_SetMTU("vswitch0", 9000))
except Exception as error:
    print(repr(error))
"""
NUMBER = """
import _libvswitch as vs
print(vs.VSDVS_DvPortIDToPortID("vswitch0", "web-1"))
"""
# Its example loads the classes, which the flat functions of this process must not return.
ELSEWHERE = {"Host.objects"}
CLASSES = (simhost.SimulatedHost, simhost.Host, simhost.SharedHost, simhost.Clock, simhost.Link)

Run = Callable[[str], List[str]]


@pytest.fixture
def this(request: pytest.FixtureRequest, kind: str) -> SimulatedHost:
    found: SimulatedHost = request.getfixturevalue(kind)
    return found


@pytest.fixture
def run(this: SimulatedHost, capsys: "pytest.CaptureFixture[str]") -> Run:
    """Runs code on the host, where it belongs; the lines that it prints."""

    def in_a_process(code: str) -> List[str]:
        assert isinstance(this, SharedHost)
        done = this.run([sys.executable, "-c", code])
        assert (done.returncode, done.stderr) == (0, "")
        return done.stdout.splitlines()

    def here(code: str) -> List[str]:
        exec(code, {})
        return capsys.readouterr().out.splitlines()

    return here if isinstance(this, Host) else in_a_process


both = pytest.mark.parametrize("kind", ["host", "shared_host"])


@both
def test_the_clock_ages_what_was_learned(this: SimulatedHost, run: Run) -> None:
    this.clock.stop()
    this.learn("vswitch0", LEARNED, "web-1", vlan=4)
    this.clock.step(299.999)
    assert LEARNED in run(ADDRESSES)
    this.clock.step(0.001)
    assert LEARNED not in run(ADDRESSES)


@both
def test_the_clock_shows_what_it_is_set_to(this: SimulatedHost) -> None:
    this.clock.stop()
    this.clock.set(12.5)
    assert this.clock.now == 12.5
    this.clock.run()
    assert this.clock.now >= 12.5


@both
def test_a_link_that_goes_down_moves_the_team(this: SimulatedHost, run: Run) -> None:
    assert run(HINT) == ["nic4"]
    this.link("nic4").down()
    assert run(HINT) == ["nic5"]
    this.link("nic4").up()
    assert run(HINT) == ["nic4"]
    assert repr(this.link("nic4")) == "Link('nic4')"


@both
def test_counters(this: SimulatedHost, run: Run) -> None:
    this.set_counter("vswitch0", "txErrors", 2**64 - 1)
    assert run(ERRORS) == ["0", str(2**64 - 1)]
    this.set_counter("vswitch0", "numMACsMoved", 4, port="web-1")
    (switch,) = this.describe()["switches"]
    assert switch["ports"][0]["counters"] == {"numMACsMoved": 4}


@both
def test_a_restart_takes_what_was_learned(this: SimulatedHost, run: Run) -> None:
    this.learn("vswitch0", LEARNED, "web-1")
    this.restart()
    assert run(ADDRESSES) == []


@both
def test_a_document_changes_the_host(this: SimulatedHost) -> None:
    this.apply({"switches": [{"alias": "lab", "mtu": 9000}]})
    switches = {switch["alias"]: switch["mtu"] for switch in this.describe()["switches"]}
    assert switches == {"vswitch0": 1500, "lab": 9000}
    this.reset()
    assert [switch["alias"] for switch in this.describe()["switches"]] == ["vswitch0"]


@both
@pytest.mark.parametrize("turn", [1, 2])
def test_ports_have_the_same_numbers_each_time(this: SimulatedHost, run: Run, turn: int) -> None:
    after_two_uplink_ports = ["[0, 3]"]
    assert run(NUMBER) == after_two_uplink_ports
    this.apply({"switches": [{"alias": "lab", "ports": [{"id": "desk"}]}]})
    this.reset()
    assert run(NUMBER) == after_two_uplink_ports


@both
@pytest.mark.parametrize("status", [vs.QEX_BUSY, "QEX_BUSY"])
def test_the_nth_call_returns_a_status(this: SimulatedHost, run: Run, status: Any) -> None:
    this.fault("VSDVS_SetMTU", nth=2, status=status)
    assert run(SET_MTU + SET_MTU + SET_MTU) == ["0", str(vs.QEX_BUSY), "0"]


@both
@pytest.mark.parametrize("error", [OSError, "OSError"])
def test_the_call_traps(this: SimulatedHost, run: Run, error: Any) -> None:
    this.fault("VSDVS_SetMTU", times=2, panic=(error, "the device is gone"))
    raised = "OSError('the device is gone')"
    assert run(SET_MTU + SET_MTU + SET_MTU) == [raised, raised, "0"]


@both
def test_a_delay_waits_before_the_call(this: SimulatedHost, run: Run) -> None:
    this.fault("VSDVS_SetMTU", times=0, delay=0.001, status="QEX_BUSY")
    expected = {"call": "VSDVS_SetMTU", "nth": 1, "times": 0, "delay": 0.001, "status": "QEX_BUSY"}
    (fault,) = this.describe()["faults"]
    assert {key: fault[key] for key in expected} == expected
    assert run(SET_MTU + SET_MTU) == [str(vs.QEX_BUSY)] * 2


@both
def test_faults_are_cleared(this: SimulatedHost) -> None:
    this.fault("VSDVS_SetMTU", times=0, status="QEX_BUSY")
    this.fault("VSDVS_GetMTU", times=0, status="QEX_BUSY")
    this.clear_faults("VSDVS_SetMTU")
    assert [fault["call"] for fault in this.describe()["faults"]] == ["VSDVS_GetMTU"]
    this.clear_faults()
    assert this.describe()["faults"] == []


REFUSED = [
    (lambda host: host.link("nic9").down(), "there is no uplink 'nic9' (QEX_NOT_FOUND)"),
    (
        lambda host: host.learn("vswitch0", LEARNED, "no"),
        "there is no port 'no' (QEX_NOT_FOUND)",
    ),
    (
        lambda host: host.learn("nowhere", LEARNED),
        "there is no switch 'nowhere' (QEX_NOT_FOUND)",
    ),
    (
        lambda host: host.learn("vswitch0", "2"),
        "'2' is no address such as 02:00:00:00:00:01 (QEX_INVALID_ADDRESS)",
    ),
    (
        lambda host: host.set_counter("vswitch0", "txMistakes", 1),
        "there is no counter 'txMistakes' of a switch (QEX_NOT_FOUND)",
    ),
    (
        lambda host: host.fault("Panic", status="QEX_BUSY"),
        "faults[0]: the host refuses it: no fault can hit Panic (QEX_NOT_SUPPORTED)",
    ),
    (
        lambda host: host.fault("Nope", status="QEX_BUSY"),
        "faults[0]: the host refuses it: there is no call 'Nope' (QEX_NOT_FOUND)",
    ),
    (
        lambda host: host.apply({"switches": [{"alias": "s", "mtu": 99}]}),
        "switches[0].mtu: 99 is below 1280",
    ),
]


@both
@pytest.mark.parametrize("ask, reason", REFUSED, ids=[reason for _, reason in REFUSED])
def test_what_the_host_refuses_raises_its_reason(
    this: SimulatedHost, ask: Callable[[SimulatedHost], None], reason: str
) -> None:
    with pytest.raises(HostRefused) as raised:
        ask(this)
    assert str(raised.value) == reason


PANIC = "panic is an exception and its text, as in (OSError, 'gone'), not "
MISTAKES = [
    (lambda host: host.link(3), TypeError("uplink is a str, not 3")),
    (lambda host: host.link(None), TypeError("uplink is a str, not None")),
    (lambda host: host.learn(b"s", LEARNED), TypeError("switch is a str, not b's'")),
    (lambda host: host.learn("s", b"02:"), TypeError("mac is a str, not b'02:'")),
    (lambda host: host.learn("s", LEARNED, b"p"), TypeError("port is a str, not b'p'")),
    (
        lambda host: host.set_counter("s", "n", -1),
        ValueError("a counter has 64 bits and no sign, which -1 does not fit"),
    ),
    (
        lambda host: host.set_counter("s", "n", 2**64),
        ValueError(f"a counter has 64 bits and no sign, which {2**64} does not fit"),
    ),
    (lambda host: host.set_counter(1, "n", 1), TypeError("switch is a str, not 1")),
    (lambda host: host.set_counter("s", 2, 1), TypeError("name is a str, not 2")),
    (lambda host: host.set_counter("s", "n", 1, port=3), TypeError("port is a str, not 3")),
    (lambda host: host.set_counter("s", "n", 1, session=4), TypeError("session is a str, not 4")),
    (lambda host: host.clear_faults(b"c"), TypeError("call is a str, not b'c'")),
    (lambda host: host.fault(b"c", status="QEX_BUSY"), TypeError("call is a str, not b'c'")),
    (
        lambda host: host.fault("VSDVS_SetMTU", times=0),
        ValueError("a fault of VSDVS_SetMTU takes a status, a panic or a delay"),
    ),
    (
        lambda host: host.fault("VSDVS_SetMTU", panic=OSError),
        TypeError(f"{PANIC}<class 'OSError'>"),
    ),
    (lambda host: host.fault("VSDVS_SetMTU", panic="no"), TypeError(f"{PANIC}'no'")),
    (
        lambda host: host.fault("VSDVS_SetMTU", panic=(OSError,)),
        TypeError(f"{PANIC}(<class 'OSError'>,)"),
    ),
    (
        lambda host: host.fault("VSDVS_SetMTU", panic=(int, "gone")),
        TypeError(f"{PANIC}(<class 'int'>, 'gone')"),
    ),
    (
        lambda host: host.fault("VSDVS_SetMTU", panic=("OSError", b"gone")),
        TypeError(f"{PANIC}('OSError', b'gone')"),
    ),
]


def raises(error: Exception) -> Any:
    return pytest.raises(type(error), match=f"^{re.escape(str(error))}$")


@both
@pytest.mark.parametrize("ask, error", MISTAKES, ids=[str(error) for _, error in MISTAKES])
def test_a_mistake_is_told_before_the_host_is_asked(
    this: SimulatedHost, ask: Callable[[Any], None], error: Exception
) -> None:
    with raises(error):
        ask(this)
    assert this.describe()["faults"] == []


@pytest.mark.parametrize(
    "command, error",
    [
        ("false", TypeError("a command is a list of words, not 'false'")),
        (b"false", TypeError("a command is a list of words, not b'false'")),
        (Path("false"), TypeError("a command is a list of words, not PosixPath('false')")),
        ([], ValueError("a command has at least one word")),
        (["echo", b"1"], TypeError("a word of a command is a str, not b'1'")),
    ],
)
def test_what_is_no_command(shared_host: SharedHost, command: Any, error: Exception) -> None:
    with raises(error):
        shared_host.run(command)


@both
def test_the_clock_is_not_set_back(this: SimulatedHost) -> None:
    with pytest.raises(HostRefused):
        this.clock.step(-0.001)
    with pytest.raises(HostRefused):
        this.clock.set(-0.001)


def test_every_status_is_known_by_its_number(host: Host) -> None:
    numbers = {
        value
        for name, value in vars(vs).items()
        if name.startswith("QEX_") and type(value) is int
        if vs.QEX_FAILURE <= value < 2**31
        if vs.QEX_ReturnStatusToString(value) is not None
    }
    assert len(numbers) > 100
    for number in numbers:
        host.fault("VSDVS_SetMTU", status=number)
    assert {getattr(vs, one["status"]) for one in host.describe()["faults"]} == numbers


@pytest.mark.parametrize("number", [1, 0x0BAD0000, vs.QEX_OK])
def test_a_number_that_is_no_failure(host: Host, number: int) -> None:
    with pytest.raises(ValueError, match=f"^{number} is no status of a failure$"):
        host.fault("VSDVS_SetMTU", status=number)


def test_the_ledger_begins_with_the_test(host: Host) -> None:
    assert host.ledger() == []
    status, uplinks = vs.VSQEX_GetUplinks("vswitch0")
    (block,) = host.ledger()
    assert (block.call, block.address) == ("VSQEX_GetUplinks", int(uplinks))
    assert str(block) == f"VSQEX_GetUplinks: {block.size} bytes"
    assert Host(None, Path()).ledger() == [], "what was out before is not a new host's"
    vs.VSQEX_FreeMemory(uplinks)
    assert host.ledger() == []


def test_a_command_that_leaves_memory_out(shared_host: SharedHost) -> None:
    code = "import _libvswitch as vs; vs.VSQEX_GetUplinks('vswitch0')"
    command = [sys.executable, "-c", f"{code}; {code}"]
    with pytest.raises(simhost.MemoryLeftOut) as raised:
        shared_host.run(command)
    first, *blocks, last = str(raised.value).splitlines()
    assert first == f"the command {' '.join(command)} left memory of the host out:"
    assert blocks == ["    VSQEX_GetUplinks: 80 bytes"] * 2


def test_a_command_gets_input_and_fails_as_it_does(shared_host: SharedHost) -> None:
    code = "import sys; print(sys.stdin.read()); sys.exit('no such switch')"
    done = shared_host.run([sys.executable, "-c", code], input="given")
    assert (done.returncode, done.stdout, done.stderr) == (1, "given\n", "no such switch\n")


def test_commands_share_the_host(shared_host: SharedHost) -> None:
    shared_host.run([sys.executable, "-c", SET_MTU])
    assert shared_host.describe()["switches"][0]["mtu"] == 9000
    assert shared_host.state_file.exists()
    assert shared_host.environment["SIMHOST_STATE"] == str(shared_host.state_file)


def examples() -> Iterator[Any]:
    finder = doctest.DocTestFinder()
    for kind in CLASSES:
        for example in finder.find(kind, kind.__name__):
            if example.examples:
                yield pytest.param(example, id=example.name)


@pytest.mark.parametrize("example", [one for one in examples() if one.id not in ELSEWHERE])
def test_the_documentation_shows_what_happens(
    example: doctest.DocTest, host: Host, shared_host: SharedHost
) -> None:
    example.globs = {"host": host, "shared_host": shared_host}
    shown: List[str] = []
    result = doctest.DocTestRunner(verbose=False).run(example, out=shown.append)
    assert result.attempted
    assert not shown, "".join(shown)


def test_every_function_has_an_example() -> None:
    shown = {param.id for param in examples()}
    for kind in CLASSES:
        for name, member in vars(kind).items():
            if not name.startswith("_") and (callable(member) or isinstance(member, property)):
                assert f"{kind.__name__}.{name}" in shown
