"""An Open vSwitch of the tests' own: its two processes in a folder, with a data path whose devices
are made up, and gone with this process whatever becomes of it."""

import json
import os
import re
import socket
import struct
import subprocess
import time
from pathlib import Path
from typing import Any, Dict, List, Mapping, Optional, Sequence, Set, Tuple

SCHEMA = "/usr/share/openvswitch/vswitch.ovsschema"
PATIENCE = 30.0
# Where switches send what is to be wrapped for collectors.
GRE_PORT, ERSPAN_PORT = 65214, 65215
# The tables that a switch fills by itself.
LEARNED = (31, 32, 33, 34, 35, 36)
# Those that count what callers are told of.
COUNTING = (9, 10, 19, 22, 23, 24, 29)


class _Forgetting:
    """A connection that makes a bridge forget what it learned, by OpenFlow 1.5 and at once."""

    _VERSION = 6
    _HELLO, _ECHO_REQUEST, _FLOW_MOD, _BARRIER_REQUEST, _BARRIER_REPLY = 0, 2, 14, 20, 21
    _DELETE = 3
    _ANY = 0xFFFFFFFF
    _EMPTY_MATCH = struct.pack("!HHI", 1, 4, 0)

    def __init__(self, path: Path) -> None:
        self._socket = socket.socket(socket.AF_UNIX)
        self._socket.settimeout(PATIENCE)
        self._socket.connect(str(path))
        self._stream = self._socket.makefile("rb")
        self._send(self._HELLO)

    def close(self) -> None:
        self._stream.close()
        self._socket.close()

    def forget(self) -> None:
        for table in LEARNED:
            body = struct.pack("!QQBBHHH", 0, 0, table, self._DELETE, 0, 0, 0)
            body += struct.pack("!IIIHH", self._ANY, self._ANY, self._ANY, 0, 0)
            self._send(self._FLOW_MOD, body + self._EMPTY_MATCH)
        self._send(self._BARRIER_REQUEST)
        while True:
            _, kind, length, _ = struct.unpack("!BBHI", self._stream.read(8))
            self._stream.read(length - 8)
            assert kind in (self._HELLO, self._ECHO_REQUEST, self._BARRIER_REPLY), kind
            if kind == self._BARRIER_REPLY:
                return

    def _send(self, kind: int, body: bytes = b"") -> None:
        self._socket.sendall(struct.pack("!BBHI", self._VERSION, kind, 8 + len(body), 0) + body)


class OpenVSwitch:
    """The processes, and the bridges in them."""

    def __init__(self, folder: Path) -> None:
        self._folder = folder
        self._environment = dict(os.environ)
        for name in ("RUN", "LOG", "DB", "SYSCONF"):
            self._environment[f"OVS_{name}DIR"] = str(folder)
        self._processes: List["subprocess.Popen[bytes]"] = []
        self._forgetting: Dict[str, _Forgetting] = {}
        self._meters: Set[Tuple[str, int]] = set()
        self._database = f"unix:{folder}/db.sock"
        database = str(folder / "conf.db")
        subprocess.run(["ovsdb-tool", "create", database, SCHEMA], check=True)
        self._start("ovsdb-server", database, f"--remote=punix:{folder}/db.sock")
        self._wait_for(folder / "db.sock")
        self._vsctl("--no-wait", "init")
        self._control = folder / "switch.ctl"
        self._start(
            "ovs-vswitchd",
            self._database,
            "--enable-dummy",
            "--disable-system",
            f"--unixctl={self._control}",
        )
        self._wait_for(self._control)
        self._vsctl("set", "Open_vSwitch", ".", "other_config:vlan-limit=2")

    def close(self) -> None:
        """Ends both processes."""
        for connection in self._forgetting.values():
            connection.close()
        for process in reversed(self._processes):
            process.kill()
            process.wait()

    def _start(self, *command: str) -> None:
        # The kernel ends them should nobody else do.
        words = ["setpriv", "--pdeathsig", "KILL", *command, "--no-chdir"]
        with open(self._folder / f"{command[0]}.log", "wb") as log:
            self._processes.append(
                subprocess.Popen(words, env=self._environment, stdout=log, stderr=log)
            )

    def _wait_for(self, path: Path) -> None:
        deadline = time.monotonic() + PATIENCE
        while not path.exists():
            assert time.monotonic() < deadline, f"{path} does not come"
            time.sleep(0.002)

    def _run(self, *command: str, given: str = "") -> str:
        done = subprocess.run(
            command,
            env=self._environment,
            input=given,
            stdout=subprocess.PIPE,
            stderr=subprocess.PIPE,
            text=True,
            check=False,
        )
        assert done.returncode == 0, f"{' '.join(command)}: {done.stderr}"
        return done.stdout

    def _vsctl(self, *words: str) -> str:
        # The server may be there and not yet listen.
        patient = ["--retry", f"--timeout={int(PATIENCE)}"]
        return self._run("ovs-vsctl", f"--db={self._database}", *patient, *words)

    def _ofctl(self, *words: str, given: str = "") -> str:
        return self._run("ovs-ofctl", "-OOpenFlow15", *words, given=given)

    def ask(self, method: str, *parameters: str) -> str:
        """What the switch says to a command of ovs-appctl."""
        with socket.socket(socket.AF_UNIX) as connection:
            connection.connect(str(self._control))
            question = {"id": 0, "method": method, "params": list(parameters)}
            connection.sendall(json.dumps(question).encode())
            connection.settimeout(PATIENCE)
            text = ""
            while True:
                text += connection.recv(1 << 20).decode()
                try:
                    answer: Mapping[str, Any] = json.loads(text)
                except ValueError:
                    continue
                assert answer["error"] is None, answer["error"]
                return str(answer["result"])

    @staticmethod
    def _settings(bridge: str) -> List[str]:
        row = ["datapath_type=dummy", "fail_mode=secure", "protocols=OpenFlow15"]
        return ["--", "set", "Bridge", bridge, *row]

    def add_bridge(
        self, bridge: str, devices: Mapping[str, int], sent_to: Optional[Path] = None
    ) -> None:
        """A bridge with devices of those names, by their OpenFlow ports; each keeps what it sends
        in a file of its name, as pcap."""
        words = ["add-br", bridge, *self._settings(bridge)]
        for name, number in devices.items():
            words += ["--", "add-port", bridge, name]
            # No device drops what the switch lets through.
            words += ["--", "set", "Interface", name, "type=dummy", f"ofport_request={number}"]
            words += ["mtu_request=9190"]
            words += [f"options:tx_pcap={sent_to / name}"] if sent_to else []
        self._vsctl(*words)

    def add_wrapping(
        self, bridge: str, device: str, sent_to: Path, address: str, collectors: Sequence[str]
    ) -> None:
        """Has a bridge wrap what it sends to the ports of collectors, and send it from an address
        over a device of another bridge, where these have addresses that are known."""
        under = f"{bridge}-under"
        words = ["add-br", under, *self._settings(under)]
        words += ["--", "add-port", under, device, "--", "set", "Interface", device, "type=dummy"]
        words += ["ofport_request=1", "mtu_request=9190", f"options:tx_pcap={sent_to / device}"]
        gre = ["remote_ip=flow", "in_key=1", "out_key=flow"]
        erspan = [*gre, *(f"erspan_{what}=flow" for what in ("ver", "idx", "dir", "hwid"))]
        for kind, number, options in ("gre", GRE_PORT, gre), ("erspan", ERSPAN_PORT, erspan):
            name = f"{bridge}-{kind}"
            words += ["--", "add-port", bridge, name, "--", "set", "Interface", name]
            words += [f"type={kind}", f"ofport_request={number}"]
            words += [f"options:{option}" for option in options]
        self._vsctl(*words)
        self._ofctl("add-flow", under, "in_port=LOCAL actions=output:1")
        self.ask("netdev-dummy/ip4addr", under, f"{address}/24")
        for number, collector in enumerate(collectors):
            self.ask("ovs/route/add", f"{collector}/32", under)
            self.ask("tnl/arp/set", under, collector, f"02:00:00:00:c0:{number:02x}")

    def set_link(self, bridge: str, number: int, is_up: bool) -> None:
        """Pulls or plugs the cable of a device, and waits until the bridge has seen it."""
        device = f"{bridge}{number}"
        self.ask("netdev-dummy/set-admin-state", device, "up" if is_up else "down")
        deadline = time.monotonic() + PATIENCE
        while ("LIVE" in self._ofctl("dump-ports-desc", bridge, str(number))) != is_up:
            assert time.monotonic() < deadline, f"the link of {device} stays as it was"

    def have_bridge(self, bridge: str) -> None:
        """A bridge without devices, if it is not there."""
        self._vsctl("--may-exist", "add-br", bridge, *self._settings(bridge))

    def limit_learned(self, bridge: str, limit: int) -> None:
        """So many addresses at most, as a switch is told beside its flows."""
        table = ["create", "Flow_Table", f"flow_limit={limit}", "overflow_policy=refuse"]
        to_bridge = ["set", "Bridge", bridge, "flow_tables:32=@limited"]
        self._vsctl("--", "--id=@limited", *table, "--", *to_bridge)

    def frames_received(self) -> int:
        """Of all devices, since it began."""
        return sum(
            int(number)
            for number in re.findall(
                r"packets received: (\d+)", self.ask("dpif-netdev/pmd-stats-show")
            )
        )

    def counted(self, bridge: str) -> Dict[int, int]:
        """The frames that its flows counted, by their cookies; those of the tables that count."""
        self.ask("revalidator/wait")
        return {cookie: frames for cookie, (frames, _) in self.counts(bridge).items()}

    def counts(self, bridge: str) -> Dict[int, Tuple[int, int]]:
        """Likewise with their bytes, without what the data path did by itself and has not told."""
        counted: Dict[int, Tuple[int, int]] = {}
        for line in self._ofctl("dump-flows", bridge).splitlines()[1:]:
            found = re.search(
                r"cookie=(0x[0-9a-f]+), .*table=(\d+), n_packets=(\d+), n_bytes=(\d+)", line
            )
            if found and int(found[2]) in COUNTING and found[3] != "0":
                frames, size = counted.get(int(found[1], 16), (0, 0))
                counted[int(found[1], 16)] = frames + int(found[3]), size + int(found[4])
        return counted

    def known_places(self, bridge: str) -> Dict[str, int]:
        """Where the addresses are that it learned."""
        self.ask("revalidator/wait")
        found = re.findall(
            r"dl_dst=(\S+) actions=set_field:(\w+)/0xffff->reg6",
            self._ofctl("dump-flows", bridge, "table=32"),
        )
        return {address: int(place, 16) for address, place in found}

    def load(self, bridge: str, flows: Sequence[str], groups: Sequence[str]) -> None:
        """Replaces all that the bridge has, in one bundle."""
        for meter in re.findall(r"meter:(\d+)", "\n".join(flows)):
            self._have_meter(bridge, int(meter))
        lines = ["flow delete", "group delete group_id=4294967292"]
        lines += [f"group add {group}" for group in groups]
        lines += [f"flow add {flow}" for flow in flows]
        self._ofctl("bundle", bridge, "-", given="\n".join(lines) + "\n")

    def _have_meter(self, bridge: str, meter: int) -> None:
        """One that nothing is too much for."""
        if (bridge, meter) not in self._meters:
            self._meters.add((bridge, meter))
            rate = "pktps,band=type=drop,rate=1000000"
            self._ofctl("add-meter", bridge, f"meter={meter},{rate}")

    def forget(self, bridge: str) -> None:
        """Makes a bridge forget what it learned, and its data path what came of it."""
        if bridge not in self._forgetting:
            self._forgetting[bridge] = _Forgetting(self._folder / f"{bridge}.mgmt")
        self._forgetting[bridge].forget()
        self.ask("revalidator/purge")

    def flows(self, bridge: str) -> List[str]:
        """What it has, but for what it learned; a line of text each, sorted."""
        lines = self._ofctl("--no-stats", "--no-names", "dump-flows", bridge).splitlines()
        found = [line.strip() for line in lines if not line.startswith("OFPST")]
        learned = tuple(f"table={table}," for table in LEARNED)
        matches = [line.split(" actions=")[0] for line in found]
        return sorted(
            line
            for line, match in zip(found, matches)
            if not any(table in match for table in learned)
        )

    def groups(self, bridge: str) -> List[str]:
        """Likewise."""
        lines = self._ofctl("--no-names", "dump-groups", bridge).splitlines()
        return sorted(line.strip() for line in lines if not line.startswith("OFPST"))
