"""What the roles of hosts and of operators let them write; and that strangers reach nothing."""

import json
import shutil
import sys
from pathlib import Path
from typing import Any, Dict, Iterator, List, Optional

import pytest
from _libvswitch import QEX_OK

from certificates import Authority, Certificate
from fabric_lab import SCHEMA, FabricLab, Host, Trust, started
from frame_lab import TOOLS, comes_true

PROGRAM = TOOLS.parent / "bin" / "vswitch"
ROLES = json.loads((SCHEMA.parent / "fabric.roles.json").read_text(encoding="utf-8"))[1:]
FOR_HOSTS, FOR_OPERATORS = "192.0.2.1:6640", "192.0.2.1:6641"
LAB = {
    "uplinks": [{"name": "nic0"}, {"name": "nic1"}],
    "switches": [{"alias": "lab", "uplinks": ["nic0", "nic1"], "ports": [{"id": "a"}]}],
}
HOSTS = ("one", "two", "three")


class Roles(Trust):
    """The first server is for hosts, the second for operators: who vouches for whom is each
    server's own matter, and what they listen on is in the database."""

    def __init__(self, folder: Path) -> None:
        super().__init__(folder)
        self.of_operators = Authority(folder, "operators")

    def options_of_server(self, number: int) -> List[str]:
        column = "operator_connections" if number else "connections"
        trusted = self.of_operators if number else self.of_hosts
        return [f"--remote=db:fabric,Fabric,{column}", *self.server.options(trusted.certificate)]


def connection(name: str, address: str, role: str) -> Dict[str, Any]:
    listens = ":".join(["pssl", *address.split(":")[::-1]])
    row = {"target": listens, "role": role}
    return {"op": "insert", "table": "Connection", "uuid-name": name, "row": row}


def admission() -> Dict[str, Any]:
    """Of hosts to switches and ports, if these name them as writers."""
    words = ["set", [f"writers:{host}" for host in HOSTS]]
    where = [["role", "==", "host"], ["update", "includes", "settings"]]
    mutation = ["authorization", "insert", words]
    return {"op": "mutate", "table": "RBAC_Permission", "where": where, "mutations": [mutation]}


class RoleLab(FabricLab):
    """With roles, and hosts that all may share switches."""

    def __init__(self, folder: Path) -> None:
        certificates = folder / "trust"
        certificates.mkdir()
        self.roles = Roles(certificates)
        super().__init__(folder, servers=2, trust=self.roles)
        connections = {
            "connections": ["named-uuid", "hosts"],
            "operator_connections": ["named-uuid", "operators"],
        }
        self.databases.transact(
            *ROLES,
            connection("hosts", FOR_HOSTS, "host"),
            connection("operators", FOR_OPERATORS, "operator"),
            {"op": "insert", "table": "Fabric", "row": connections},
            admission(),
        )

    def certified(self, name: str) -> Host:
        host = self.host(name, LAB if name == "one" else None)
        host.options = [option.split(",")[0] for option in host.options]
        return host

    def says(self, certificate: Certificate, address: str, *operations: Dict[str, Any]) -> str:
        """What becomes of a transaction of whoever has that certificate."""
        options = certificate.options(self.roles.of_servers.certificate)
        words = ["transact", f"ssl:{address}", json.dumps(["fabric", *operations])]
        return self.hub.try_run("ovsdb-client", "--timeout=30", *options, *words).stdout


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[RoleLab]:
    lab = RoleLab(tmp_path)
    with lab:
        yield lab


def prohibited(host: str, what: str) -> str:
    return f'RBAC rules for client \\"{host}\\" role \\"host\\" prohibit {what}'


def operates(lab: RoleLab, document: Dict[str, Any]) -> str:
    """Has an operator apply a document."""
    file = lab.folder / "document.json"
    file.write_text(json.dumps({"switches": [{"alias": "lab", **document}]}), encoding="utf-8")
    return command(lab, "apply", str(file))


def command(lab: RoleLab, *words: str) -> str:
    """What an operator's command says."""
    key, certificate = lab.roles.of_operators.issue("olga")[::-1]
    files = ["-p", key, "-c", certificate, "-C", lab.roles.of_servers.certificate]
    before = ["--fabric", f"ssl:{FOR_OPERATORS}", *map(str, files)]
    done = lab.hub.try_run(str(PROGRAM), *before, *words)
    assert done.returncode == 0, done.stdout
    return done.stdout


def hello_of(lab: RoleLab, certificate: Optional[Certificate]) -> str:
    """What a server says to one who asks which databases there are, with a certificate or none."""
    program = f"""
import contextlib, socket, ssl
context = ssl.create_default_context(cafile={str(lab.roles.of_servers.certificate)!r})
context.check_hostname = False
files = {[str(one) for one in certificate or ()]!r}
if files:
    context.load_cert_chain(*files)
with socket.create_connection({tuple(FOR_HOSTS.split(":"))!r}, timeout=30) as plain:
    # It says why, or has closed before that can be heard.
    with contextlib.suppress(ssl.SSLError, ConnectionError), context.wrap_socket(plain) as stream:
        stream.sendall(b'{{"method": "list_dbs", "params": [], "id": 0}}')
        print(stream.recv(1000).decode(), end="")
"""
    return lab.hub.try_run(sys.executable, "-c", program).stdout


def test_hosts_write_what_is_theirs_and_switches_that_they_belong_to(lab: RoleLab) -> None:
    one, two = started(lab.certified("one")), started(lab.certified("two"))
    one.ctl("share", "lab")
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    one.set_port("lab", "b")
    # Who does not belong to it may not even join it.
    refused = two.try_ctl("join", "lab")
    assert refused.returncode == 1
    assert "QEX_BUSY" in refused.stdout and "RBAC rules for client" in refused.stdout
    operates(lab, {"hosts": ["one", "two"]})
    assert comes_true(lambda: two.setting("lab", "mtu") == 1600)
    assert two.call("VSDVS_SetMTU", "lab", 1700) == QEX_OK
    two.set_port("lab", "b", vlan={"id": 7})
    two.set_port("lab", "c")
    assert comes_true(lambda: "c" in one.ports("lab") and one.setting("lab", "mtu") == 1700)
    one.set_port("lab", "c", vlan={"id": 8})
    operates(lab, {"ports": [{"id": "d"}]})
    assert comes_true(lambda: "d" in two.ports("lab"))
    two.set_port("lab", "d", vlan={"id": 9})
    # Questions of operators hosts reply to, each for itself.
    one.client("lab", "a")
    (carried,) = json.loads(command(lab, "drill", "lab", "--json"))
    assert (carried["host"], carried["port"]) == ("one", "a")
    assert {carried["uplink"], carried["meanwhile"]} == {"nic0", "nic1"}
    # Who is taken from it changes it no longer, whatever it has yet.
    two.stop()
    operates(lab, {"hosts": ["one"]})
    assert all(row["writers"] == ["map", [["one", "one"]]] for row in lab.databases.rows("Port"))
    assert one.call("VSDVS_SetMTU", "lab", 1800) == QEX_OK
    three = lab.roles.of_hosts.issue("three")
    row: Dict[str, Any] = {
        "table": "Switch",
        "where": [["alias", "==", "lab"]],
        "row": {"alias": "gone"},
    }
    said = lab.says(three, FOR_HOSTS, {"op": "update", **row})
    assert prohibited("three", 'modification of table \\"Switch\\"') in said
    of_port: Dict[str, Any] = {"table": "Port", "where": [["id", "==", "d"]]}
    for column, value in (
        ("settings", ["map", [["mtu", "1900"]]]),
        ("host", "three"),
        ("counters", ["map", [["three", "{}"]]]),
    ):
        said = lab.says(three, FOR_HOSTS, {"op": "update", **of_port, "row": {column: value}})
        assert prohibited("three", 'modification of table \\"Port\\"') in said
    said = lab.says(three, FOR_HOSTS, {"op": "delete", **of_port})
    assert prohibited("three", 'row deletion from table \\"Port\\"') in said
    assert one.call("VSDVS_RemoveDVPort", "lab", "d") == QEX_OK


def told(lab: RoleLab, host: str) -> List[str]:
    """Of which ports a host has told what it counted."""
    ports = lab.databases.rows("Port")
    return sorted(row["id"] for row in ports if host in dict(row["counters"][1]))


def test_what_a_host_may_not_tell_keeps_back_nothing_else(lab: RoleLab) -> None:
    one = started(lab.certified("one"))
    one.apply({"switches": [{"alias": "own", "ports": [{"id": "b"}]}]})
    for switch in "lab", "own":
        one.ctl("share", switch)
    one.stop()

    def let_write(*hosts: str) -> None:
        row = {"writers": ["map", [[host, host] for host in hosts]]}
        lab.databases.transact(
            {"op": "update", "table": "Switch", "where": [["alias", "==", "lab"]], "row": row},
            {"op": "update", "table": "Port", "where": [["id", "==", "a"]], "row": row},
        )

    let_write()
    for switch, port in ("lab", "a"), ("own", "b"):
        one.ctl("counter", switch, "pktsInUnicast", "7", "--port", port)
    started(one)
    assert comes_true(lambda: told(lab, "one") == ["b"])
    assert comes_true(lambda: "what was counted is not told: " in one.log())
    one.stop()
    let_write("one")
    started(one)
    assert comes_true(lambda: told(lab, "one") == ["a", "b"])


def test_nobody_writes_what_is_another_host_s(lab: RoleLab) -> None:
    one = started(lab.certified("one"))
    two = lab.roles.of_hosts.issue("two")
    row_of_one: Dict[str, Any] = {"table": "Host", "where": [["name", "==", "one"]]}
    change = {"id": "x", "host": "one", "revoked": True}
    refused: Dict[str, Dict[str, Any]] = {
        'modification of table "Host"': {"op": "update", **row_of_one, "row": {"session": "x"}},
        'row deletion from table "Host"': {"op": "delete", **row_of_one},
        'row insertion into table "Change"': {"op": "insert", "table": "Change", "row": change},
        'row insertion into table "Drill"': {"op": "insert", "table": "Drill", "row": {}},
        'row insertion into table "Connection"': {"op": "insert", "table": "Connection", "row": {}},
        'mutate operation on table "RBAC_Permission"': admission(),
    }
    for what, operation in refused.items():
        said = lab.says(two, FOR_HOSTS, operation)
        assert prohibited("two", what.replace('"', '\\"')) in said, said
    # A name is that of the certificate.
    thief = lab.certified("thief")
    thief.options = ["one" if word == "thief" else word for word in thief.options]
    one.stop()
    shutil.copy(one.state, thief.state)
    started(one)
    thief.start()
    why = 'RBAC rules for client "thief" role "host" prohibit modification of table "Host"'
    assert comes_true(lambda: why in thief.log()), thief.log()
    assert thief.call("VSDVS_CreateVSwitch", "own", "", "", 0, 1, 0, 1500, 0) == QEX_OK
    one.ctl("share", "lab")
    # An operator may, and does not come in where hosts do, nor they where operators do.
    olga = lab.roles.of_operators.issue("olga")
    # All hosts count changes, so that one may end all changes, until an operator begins anew.
    count: Dict[str, Any] = {"op": "update", "table": "Fabric", "where": []}
    assert '"count":1' in lab.says(two, FOR_HOSTS, {**count, "row": {"revision": 2**63 - 1}})
    changed = {"switches": [{"alias": "lab", "mtu": 1700}]}
    assert "range error" in one.refusal(changed)
    assert '"count":1' in lab.says(olga, FOR_OPERATORS, {**count, "row": {"revision": 0}})
    one.apply(changed)
    assert '"count":1' in lab.says(olga, FOR_OPERATORS, {"op": "delete", **row_of_one})
    select = {"op": "select", "table": "Host", "where": []}
    assert "fabric" in hello_of(lab, two)
    assert hello_of(lab, None) == ""
    stranger = Authority(lab.folder, "strangers").issue("one")
    for certificate, address in (
        (olga, FOR_HOSTS),
        (two, FOR_OPERATORS),
        (stranger, FOR_HOSTS),
        (stranger, FOR_OPERATORS),
    ):
        assert '"rows"' not in lab.says(certificate, address, select)
    assert '"rows"' in lab.says(two, FOR_HOSTS, select)
