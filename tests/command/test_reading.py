"""What the commands tell that change nothing: exact texts, and the same for programs."""

import json
import os
import signal
import subprocess
from typing import List

import pytest
from command_line import PROGRAM, SIMULATED, Refused, Vswitch, started
from simhost import SharedHost


def test_list(vswitch: Vswitch) -> None:
    done = vswitch("list")
    assert done.stdout == (
        "SWITCH     MTU  PORTS     UPLINKS\n"
        "vswitch0  1500  3 of 128  nic4 up, nic5 up\n"
        "lab       9000  2 of 64   nic0 up, nic1 up\n"
    )
    assert (done.status, done.stderr) == (0, SIMULATED)


def test_list_for_programs(vswitch: Vswitch) -> None:
    done = vswitch("list", "--json")
    assert (done.status, done.stderr) == (0, SIMULATED)
    assert done.json[1] == {
        "alias": "lab",
        "id": "lab-1",
        "running": True,
        "mtu": 9000,
        "max_ports": 64,
        "ports": ["web-1", "web-2"],
        "uplinks": [{"name": "nic0", "link": "up"}, {"name": "nic1", "link": "up"}],
    }


def test_a_switch_that_does_not_run(vswitch: Vswitch, lab: SharedHost) -> None:
    lab.apply({"switches": [{"alias": "idle", "running": False, "ports": [{"id": "a"}]}]})
    assert vswitch("list").lines[3] == "idle      1500  1 of 128  not running"
    assert "├── running: false" in vswitch("show", "idle").lines
    assert vswitch("show", "idle").lines[-2:] == ["└── ports", "    └── a"]
    assert vswitch("show", "idle/a").status == 0


def test_show_a_switch(vswitch: Vswitch) -> None:
    assert vswitch("show", "lab").stdout == (
        "lab\n"
        "├── id: lab-1\n"
        "├── portset: lab-ports\n"
        "├── max_ports: 64\n"
        "├── version: 200\n"
        "├── running: true\n"
        "├── mtu: 9000\n"
        "├── disabled: false (default)\n"
        "├── teaming: balance=explicit criteria=link flags=all_available,notify speed=0"
        " full_duplex=false error_percent=0 active=left standby=right\n"
        "├── private_vlans: none (default)\n"
        "├── mac_learning: aging_time=300 limit=65536 learn_static=false (default)\n"
        "├── multicast: legacy (default)\n"
        "├── uplink_mirror_sessions: none (default)\n"
        "├── uplinks\n"
        "│   ├── nic0: up, at left\n"
        "│   └── nic1: up, at right\n"
        "├── lags\n"
        "│   └── lag1: up, of nic0,nic1\n"
        "├── uplink_ports\n"
        "│   ├── left\n"
        "│   └── right\n"
        "└── ports\n"
        "    ├── web-1: carried by nic0\n"
        "    │   ├── vlan: id=7 trunk=10-12\n"
        "    │   └── forbids: promiscuous\n"
        "    └── web-2: carried by nic0\n"
    )


def test_show_a_port(vswitch: Vswitch) -> None:
    shown = vswitch("show", "lab/web-1").lines
    assert shown[0] == "lab/web-1"
    assert "├── vlan: id=7 trunk=10-12" in shown
    assert "├── blocked: false (default)" in shown
    assert "├── carried by: nic0" in shown
    assert shown[-1] == "    └── 02:00:00:00:00:01: VLAN 7, static, age 0 s"


def test_show_an_uplink_port(vswitch: Vswitch) -> None:
    assert vswitch("show", "lab/left").lines == [
        "lab/left",
        "├── vlan: 0 (default)",
        "├── nested_tag: false (default)",
        "├── name: none (default)",
        "├── blocked: false (default)",
        "└── uplink: nic0",
    ]
    assert vswitch("show", "lab/left", "--json").json["uplink"] == "nic0"


def test_show_for_programs_is_what_documents_say(vswitch: Vswitch) -> None:
    switch = vswitch("show", "lab", "--json").json
    port = vswitch("show", "--json", "lab/web-1").json
    assert switch["alias"] == "lab" and switch["ports"][0]["id"] == "web-1"
    assert port["vlan"] == {"id": 7, "trunk": ["10-12"]}
    assert port["observed"]["uplink"] == "nic0"


def test_an_alias_may_have_a_slash(vswitch: Vswitch, lab: SharedHost) -> None:
    lab.apply({"switches": [{"alias": "lab/far", "ports": [{"id": "x/y"}]}]})
    assert vswitch("show", "lab/far").lines[0] == "lab/far"
    assert vswitch("show", "lab/far/x/y").lines[0] == "lab/far/x/y"
    assert vswitch("show", "lab/web-1").lines[0] == "lab/web-1"


def test_names_move_no_cursor(vswitch: Vswitch, lab: SharedHost) -> None:
    lab.apply({"switches": [{"alias": "a\x1b[2Jb\n[bold]c[/bold]"}]})
    assert vswitch("list").lines[3].startswith("a\\x1b[2Jb\\n[bold]c[/bold]  1500")
    for words in (["show", "nope"], ["list", "--a\x1b[2Jb\n[bold]c[/bold]"]):
        assert "a\\x1b[2Jb\\n[bold]c[/bold]" in vswitch(*words).stderr


def test_stats(vswitch: Vswitch) -> None:
    rows = [line.split() for line in vswitch("stats", "lab/web-1").lines]
    assert rows[:2] == [["OF", "COUNTER", "COUNT"], ["lab/web-1", "pktsInUnicast", "5"]]
    assert ["lab", "txErrors", "0"] in [line.split() for line in vswitch("stats", "lab").lines]
    counted = vswitch("stats", "lab", "--json").json
    assert list(counted) == ["lab", "lab/web-1", "lab/web-2"]
    assert counted["lab/web-1"]["pktsInUnicast"] == 5


def test_stats_again_and_again(lab: SharedHost) -> None:
    with started(lab, "stats", "lab/web-1", "--watch", "--every", "0.05") as (running, stdout):
        assert stdout.readline().endswith(" lab/web-1: pktsInUnicast+5\n")
        lab.set_counter("lab", "pktsInUnicast", 12, port="web-1")
        assert stdout.readline().endswith(" lab/web-1: pktsInUnicast+7\n")
        running.send_signal(signal.SIGINT)
        told = running.communicate()[1]
        assert (running.returncode, told) == (0, SIMULATED)


def test_stats_again_and_again_for_programs(lab: SharedHost) -> None:
    watch = ("stats", "lab", "--watch", "--every", "0.05", "--json")
    with started(lab, *watch) as (running, stdout):
        first, second = (json.loads(stdout.readline()) for _ in range(2))
        assert first["counters"]["lab/web-1"]["pktsInUnicast"] == 5
        assert first["at"] < second["at"] and first["counters"] == second["counters"]


def test_lag(vswitch: Vswitch) -> None:
    assert vswitch("lag", "lab").lines == ["LAG   LINK  UPLINKS", "lag1  up    nic0, nic1"]
    expected = [{"name": "lag1", "link": "up", "uplinks": ["nic0", "nic1"]}]
    assert vswitch("lag", "lab", "--json").json == expected


def test_options(vswitch: Vswitch) -> None:
    shown = vswitch("options")
    assert shown.lines[0].split() == ["OPTION", "VALUE"]
    assert "IGMPVersion                 3" in shown.lines
    assert vswitch("options", "--json").json["IGMPVersion"] == 3


def test_find(vswitch: Vswitch) -> None:
    done = vswitch("find", "0200.0000.0001")
    assert done.lines == [
        "SWITCH  PORT   VLAN  TYPE    AGE",
        "lab     web-1     7  static    0",
    ]
    told = vswitch("find", "02-00-00-00-00-01", "--json").json
    assert [(one["switch"], one["port"], one["vlan"]) for one in told] == [("lab", "web-1", 7)]


def test_find_what_is_nowhere(vswitch: Vswitch, refused: Refused) -> None:
    assert refused("find", "02:00:00:00:00:77") == (
        "vswitch: no switch knows the address 02:00:00:00:00:77\n"
    )
    done = vswitch("find", "02:00:00:00:00:77", "--json")
    assert (done.status, done.json) == (1, [])


@pytest.mark.parametrize(
    "words, status, said",
    [
        (["show", "nope"], 1, "vswitch: no switch 'nope' (there are lab, vswitch0)\n"),
        (
            ["show", "lab/nope"],
            1,
            "vswitch: no port 'nope' of switch 'lab' (it has web-1, web-2)\n",
        ),
        (["stats", "lab/left"], 1, "vswitch: 'left' of switch 'lab' is an uplink port\n"),
        (["list", "--real"], 1, "vswitch: this host is simulated, and a real one is wanted\n"),
        (
            ["find", "lab"],
            2,
            "vswitch: MAC: 'lab' is not six bytes such as 02:00:00:00:00:01\n"
            "vswitch: see vswitch find --help\n",
        ),
        (
            ["show"],
            2,
            "vswitch: Missing argument 'SWITCH[/PORT]'.\nvswitch: see vswitch show --help\n",
        ),
        (["shew"], 2, "vswitch: No such command 'shew'.\nvswitch: see vswitch --help\n"),
        (
            ["list", "--nope"],
            2,
            "vswitch: No such option: --nope\nvswitch: see vswitch list --help\n",
        ),
    ],
)
def test_what_is_refused(refused: Refused, words: List[str], status: int, said: str) -> None:
    assert refused(*words, status=status) == said


def test_a_call_that_fails(lab: SharedHost, refused: Refused) -> None:
    lab.fault("VSDVS_GetMTU", status="QEX_BUSY")
    assert refused("list").startswith("vswitch: ")


def test_help(vswitch: Vswitch) -> None:
    nothing: List[str] = []
    without_json = ("draw", "record", "play", "completion")
    for words in (nothing, ["--help"], ["-h"]):
        done = vswitch(*words)
        assert (done.status, done.stderr) == (0, "")
        assert done.lines[0] == "Usage: vswitch [OPTIONS] COMMAND [ARGS]..."
    _, _, listed = vswitch("--help").stdout.partition("Commands:\n")
    for line in listed.partition("\n\n")[0].splitlines():
        name = line.split()[0]
        told = vswitch(name, "--help")
        assert told.status == 0 and told.lines[0].startswith(f"Usage: vswitch {name} ")
        assert ("--json" in told.stdout) is (name not in without_json)
        assert "--real" in told.stdout


def test_as_a_module_it_is_the_same(lab: SharedHost, vswitch: Vswitch) -> None:
    done = lab.run(["/usr/bin/python3", "-m", "vswitch", "list"])
    assert (done.returncode, done.stdout) == (0, vswitch("list").stdout)


def test_a_closed_pipe_is_no_error(lab: SharedHost) -> None:
    shell = f'("{PROGRAM}" show lab 2>&3; echo "$?" >&3) 3>&2 | true'
    done = subprocess.run(
        ["sh", "-c", shell], env=lab.environment, stderr=subprocess.PIPE, text=True
    )
    assert done.stderr == SIMULATED + "0\n"


def test_what_an_encoding_has_no_bytes_for(lab: SharedHost) -> None:
    environment = {**lab.environment, "PYTHONIOENCODING": "ascii"}
    done = subprocess.run([PROGRAM, "show", "lab"], env=environment, stdout=subprocess.PIPE)
    assert done.returncode == 0 and b"\\u2514" in done.stdout


def test_the_objects_need_no_library_of_the_command() -> None:
    """Nor does anything of it cost those time who only import the objects."""
    program = (
        "import sys, vswitch\n"
        "loaded = {'click', 'typer', 'rich', 'yaml', 'vswitch.command'} & set(sys.modules)\n"
        "assert not loaded, loaded\n"
    )
    subprocess.run(["/usr/bin/python3", "-c", program], check=True)


def test_without_its_libraries_it_says_what_it_needs(lab: SharedHost) -> None:
    program = "import sys; sys.modules['typer'] = None; from vswitch.command import main; main()"
    done = lab.run(["/usr/bin/python3", "-c", program])
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr.endswith("; pip install 'libvswitch[command]' brings what is missing\n")
    assert done.stderr.count("\n") == 1


@pytest.mark.parametrize("library", ["typer", "vswitch"])
def test_interrupted_before_it_begins(
    lab: SharedHost, tmp_path: "os.PathLike[str]", library: str
) -> None:
    with open(os.path.join(tmp_path, f"{library}.py"), "w", encoding="utf-8") as file:
        file.write("raise KeyboardInterrupt\n")
    path = f"{tmp_path}{os.pathsep}{lab.environment['PYTHONPATH']}"
    done = subprocess.run(
        [PROGRAM, "list"],
        env={**lab.environment, "PYTHONPATH": path},
        capture_output=True,
        text=True,
    )
    assert (done.returncode, done.stdout, done.stderr) == (130, "", "")


def test_without_a_host_it_says_so(lab: SharedHost, tmp_path: "os.PathLike[str]") -> None:
    """Libraries that are none stand for a machine that has none."""
    for name in ("libvswitch.so", "libnebPublic.so"):
        with open(os.path.join(tmp_path, name), "w"):
            pass
    environment = {**lab.environment, "LD_LIBRARY_PATH": str(tmp_path)}
    done = subprocess.run(
        [PROGRAM, "list"],
        env=environment,
        stdout=subprocess.PIPE,
        stderr=subprocess.PIPE,
        text=True,
    )
    assert (done.returncode, done.stdout) == (1, "")
    assert done.stderr.startswith("vswitch: ") and len(done.stderr.splitlines()) == 1
    assert done.stderr.endswith(": python3 -m libvswitch.doctor says what to do\n")
