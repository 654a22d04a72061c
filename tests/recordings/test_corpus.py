"""What the examples, the tour and random programs ask of the simulated host is recorded, and
replayed on a fresh one: there is no difference, and one that is planted is found."""

import json
import os
import subprocess
import sys
from pathlib import Path

import pytest
import recorded_clones
import recorded_sequences
from corpus import EXAMPLE, NO_EXAMPLE, record_example, record_tour
from programs import EXAMPLES
from recordings import SIMULATED, record_made
from simhost import Host
from steering import differences, replayed

SEED = 16
SEQUENCES = 20
CLONES = 8


def test_every_example_is_here() -> None:
    assert {one.stem for one in EXAMPLES.glob("*.py")} == {*EXAMPLE, *NO_EXAMPLE}


@pytest.mark.parametrize("name", EXAMPLE)
def test_an_example_goes_as_it_was_recorded(name: str, tmp_path: Path) -> None:
    trace = tmp_path / "trace.jsonl"
    record_example(name, trace)
    (report,) = replayed(trace, lambda: Host(None, tmp_path))
    assert differences(report) == []
    assert sum(of.alike for of in report.functions.values()) > 10


_REPLAY = """
import json, subprocess, sys
from pathlib import Path
from steering import differences, replayed

def steer(host, what, arguments, more):
    subprocess.run([sys.argv[2], *arguments], check=True, stdout=subprocess.DEVNULL)

(report,) = replayed(Path(sys.argv[1]), lambda: None, steer)
alike = sum(of.alike for of in report.functions.values())
print(json.dumps([alike, differences(report)]))
"""


def test_the_tour_goes_as_it_was_recorded(tmp_path: Path) -> None:
    trace = tmp_path / "trace.jsonl"
    record_tour(trace)
    simhostctl = str(SIMULATED / "simhostctl")
    here = os.pathsep.join([os.environ["PYTHONPATH"], str(Path(__file__).parent)])
    state = str(tmp_path / "host.db")
    done = subprocess.run(
        [sys.executable, "-c", _REPLAY, str(trace), simhostctl],
        env={**os.environ, "PYTHONPATH": here, "SIMHOST_STATE": state},
        stdout=subprocess.PIPE,
        text=True,
        check=True,
    )
    alike, found = json.loads(done.stdout)
    assert found == [] and alike > 300


def test_clones_tell_what_their_hosts_told() -> None:
    print("seed", SEED)
    count, found = recorded_clones.run(SEED, CLONES)
    assert found == []
    assert count > CLONES // 2


@pytest.fixture(name="sequences", scope="module")
def fixture_sequences(tmp_path_factory: pytest.TempPathFactory) -> Path:
    print("seed", SEED)
    trace = tmp_path_factory.mktemp("sequences") / "trace.jsonl"
    record_made("recorded_sequences.make", SEED, SEQUENCES, trace)
    return trace


def test_random_programs_go_as_they_were_recorded(sequences: Path) -> None:
    count, found = recorded_sequences.found_in(sequences)
    assert found == []
    assert count >= SEQUENCES


def another_status() -> Host:
    host = recorded_sequences.begun()
    host.fault("VSDVS_GetMcastFilterMode", times=0, status="QEX_NOT_SUPPORTED")
    return host


def test_a_status_that_is_planted_is_found_and_named(sequences: Path) -> None:
    _, found = recorded_sequences.found_in(sequences, another_status)
    said = "VSDVS_GetMcastFilterMode: status: QEX_OK -> QEX_NOT_SUPPORTED "
    assert found and all(one.startswith(said) for one in found)
