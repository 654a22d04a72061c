"""Every fuzzer over its seeds and what it makes of them, and the faults that fuzzers must find."""

import re
import subprocess
from pathlib import Path

import fuzzing
import pytest

SEED = 20

# How many inputs each tries; together they take some seconds.
INPUTS = {
    "decoded": 20_000,
    "mirror": 20_000,
    "multicast": 30_000,
    "openflow": 30_000,
    "ovsdb": 8_000,
    "properties": 1_500,
    "runtime_options": 20_000,
    "scenario": 8_000,
    "script": 20_000,
    "state_image": 12_000,
    "tables": 100_000,
    "texts": 300_000,
}

FAULTS = {
    "past the end": "AddressSanitizer: heap-buffer-overflow",
    "overflow": "runtime error: signed integer overflow",
    "leak": "byte(s) leaked in 1 allocation(s)",
    "hang": "libFuzzer: timeout",
    "untrue": "does not hold: a word has less than three bytes",
}


def test_every_harness_is_run() -> None:
    harnesses = {file.name[: -len("_fuzz.cpp")] for file in fuzzing.HERE.glob("*_fuzz.cpp")}
    assert harnesses - {"planted"} == set(fuzzing.NAMES) == set(INPUTS)


def expect_nothing(name: str, folder: Path) -> None:
    print("seed", SEED)
    inputs, wrong = fuzzing.run(name, folder, SEED, f"-runs={INPUTS[name]}")
    assert wrong == []
    assert inputs >= INPUTS[name]


@pytest.mark.parametrize("name", sorted({*fuzzing.NAMES} - {*fuzzing.OF_THE_HOST}))
def test_no_input_is_found_that_fails(name: str, tmp_path: Path) -> None:
    expect_nothing(name, tmp_path)


@pytest.mark.parametrize("name", fuzzing.OF_THE_HOST)
def test_no_input_of_the_host_is_found_that_fails(name: str, tmp_path: Path) -> None:
    expect_nothing(name, tmp_path)


@pytest.mark.parametrize("fault", FAULTS)
def test_what_is_planted_is_found(fault: str, tmp_path: Path) -> None:
    limits = ("-runs=1000000", "-max_len=64")
    _, wrong = fuzzing.run("planted", tmp_path, SEED, *limits, patience=2, planted=fault)
    assert len(wrong) == 1 and FAULTS[fault] in wrong[0]


def test_a_walk_of_the_host_past_the_end_is_found_and_seen_again(tmp_path: Path) -> None:
    _, wrong = fuzzing.run("planted_walk", tmp_path, SEED, "-runs=20000")
    assert "AddressSanitizer: heap-buffer-overflow" in wrong[0]
    again = re.search(r"to see it again: (\S+) (\S+)$", wrong[0])
    assert again is not None
    fuzzer, finding = again.groups()
    done = subprocess.run([fuzzer, finding], capture_output=True, text=True, check=False)
    assert done.returncode != 0 and "AddressSanitizer: heap-buffer-overflow" in done.stderr
    Path(finding).unlink()


def test_nothing_planted_is_nothing_found(tmp_path: Path) -> None:
    assert fuzzing.run("planted", tmp_path, SEED, "-runs=20000") == (20_000, [])
