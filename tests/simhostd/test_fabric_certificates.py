"""Hosts and databases that prove to each other by certificates who they are, or do not."""

import shutil
import subprocess
from pathlib import Path
from typing import Iterator, List

import pytest
from _libvswitch import QEX_OK

from certificates import Authority, Certificate, openssl
from fabric_lab import FabricLab, Host, Trust, started
from frame_lab import TOOLS, comes_true

# What it takes is more than one record of encryption holds.
PORTS = 200
LAB = {
    "switches": [
        {
            "alias": "lab",
            "max_ports": PORTS,
            "ports": [{"id": f"p{number}", "vlan": {"id": 7}} for number in range(PORTS)],
        }
    ]
}


@pytest.fixture
def lab(tmp_path: Path) -> Iterator[FabricLab]:
    trust = tmp_path / "trust"
    trust.mkdir()
    with FabricLab(tmp_path, trust=Trust(trust)) as lab:
        yield lab


def test_hosts_share_over_connections_that_are_encrypted(lab: FabricLab) -> None:
    one, other = started(lab.host("one", LAB)), started(lab.host("two"))
    assert "in the fabric at ssl:192.0.2.1:6640" in one.ctl("fabric")
    one.ctl("share", "lab")
    other.ctl("join", "lab")
    assert other.ports("lab").keys() == one.ports("lab").keys()
    assert other.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    assert comes_true(lambda: one.setting("lab", "mtu") == 1600)
    # Who speaks another language is told nothing.
    plain = lab.host("plain")
    plain.options = ["--fabric", "tcp:192.0.2.1:6640", "--host", "plain"]
    plain.start()
    assert comes_true(lambda: "the fabric cannot be used: tcp:192.0.2.1:6640: " in plain.log())
    assert sorted(row["name"] for row in lab.databases.rows("Host")) == ["one", "two"]


def use(lab: FabricLab, one: Certificate) -> None:
    """Puts other files in the place of those that the host was told."""
    shutil.copy(one.certificate, lab.folder / "host.pem")
    shutil.copy(one.key, lab.folder / "host.key")


def serve(lab: FabricLab, certificate: Certificate) -> None:
    """Has the database prove with that one who it is."""
    assert lab.trust is not None
    lab.databases.kill(0)
    lab.trust.server = certificate
    lab.databases.start(0)


def told(host: Host, why: str) -> bool:
    """Whether the log and the command say why the fabric cannot be used."""
    return comes_true(
        lambda: f"the fabric cannot be used: {why}" in host.log()
        and f"cannot be used: {why}" in host.ctl("fabric")
    )


def test_certificates_that_do_not_fit_connect_nobody(lab: FabricLab) -> None:
    assert lab.trust is not None
    folder, trust = lab.folder, lab.trust
    files = Certificate(folder / "host.pem", folder / "host.key")
    good, other = trust.of_hosts.issue("one"), trust.of_hosts.issue("two")
    one = lab.host("one", LAB)
    one.options = [*one.options[:4], *trust.options_of_host(files)]
    one.start()
    assert told(one, f"{files.certificate}: No such file or directory"), one.log()
    of_another_kind = folder / "rsa.key"
    openssl("genpkey", "-algorithm", "RSA", "-out", of_another_kind)
    for key in other.key, of_another_kind:
        files.certificate.write_text("none\n", encoding="utf-8")
        assert told(one, f"{files.certificate}: no start line"), one.log()
        use(lab, Certificate(good.certificate, key))
        why = f"{files.key}: it is not the key of the certificate {files.certificate}"
        assert told(one, why), one.log()

    server = "ssl:192.0.2.1:6640"
    refuses = f"{server}: it does not accept the certificate {files.certificate}: "
    use(lab, trust.of_hosts.issue("expired", days=-1))
    assert told(one, refuses + "certificate expired; it expired on "), one.log()
    use(lab, Authority(folder, "strangers").issue("one"))
    assert told(one, refuses + "unknown CA"), one.log()

    use(lab, good)
    assert comes_true(lambda: "in the fabric at" in one.ctl("fabric")), one.log()
    trusted = f"{server}: by {trust.of_servers.certificate} its certificate"
    serve(lab, trust.of_servers.issue("old", days=-1))
    assert told(one, f"{trusted} 'CN=old' is not to be trusted: certificate has expired")
    serve(lab, trust.of_hosts.issue("thief"))
    why = f"{trusted} 'CN=thief' is not to be trusted: self-signed certificate in certificate chain"
    assert told(one, why), one.log()
    # It goes on by itself when all is right, and what is its own never waited.
    assert one.call("VSDVS_SetMTU", "lab", 1600) == QEX_OK
    serve(lab, trust.of_servers.issue("new"))
    assert comes_true(lambda: "in the fabric at" in one.ctl("fabric")), one.log()


@pytest.mark.parametrize(
    ("options", "says"),
    [
        (["ssl:192.0.2.1:6640"], "--fabric ssl: takes --private-key FILE"),
        (["tcp:192.0.2.1:6640", "--ca-cert", "c"], "--ca-cert: --fabric names no server as ssl:"),
    ],
)
def test_encryption_is_asked_for_whole(tmp_path: Path, options: List[str], says: str) -> None:
    words = ["--state", str(tmp_path / "host.db"), "--openvswitch", "system", "--host", "one"]
    done = subprocess.run(
        [str(TOOLS / "simhostd"), *words, "--fabric", *options],
        stderr=subprocess.PIPE,
        text=True,
        check=False,
    )
    assert (done.returncode, done.stderr) == (1, f"simhostd: {says}\n")
