#!/usr/bin/env python3
"""Runs the fuzzers, from seeds that are made here, and tells of an input that one fails on.

    fuzzing.py FUZZER [--seconds N] [--seed N]
"""

import argparse
import os
import random
import re
import subprocess
import sys
from pathlib import Path
from typing import Callable, Dict, List, NamedTuple

HERE = Path(__file__).parent
ROOT = HERE.parent.parent
BUILD = Path(os.environ.get("FUZZERS_DIR", ROOT / "build-fuzzers"))

OF_THE_HOST = ["mirror", "properties", "runtime_options", "scenario", "script", "state_image"]
"""Those that link a whole host: the simulated one, or what plays a recording."""
NAMES = sorted([*OF_THE_HOST, "decoded", "multicast", "openflow", "ovsdb", "tables", "texts"])
"""Each is a harness of this folder."""

# A run that takes so long hangs; all take far below a second, sanitizers included.
PATIENCE = 60

# What stands in a trace: records of each shape, and what calls take and give.
VALUES = [
    '{"record": "VSUplinkPorts", "value": {"nUplinkPorts": 2, "uplinkPortName": ["a", "b"]}}',
    '{"record": "VSMACLearning", "value": {"agingTime": 60, "learnStatic": 1, "reserved": 0,'
    ' "macLimit": 9}}',
    '{"record": "VSMcastFilters", "form": 2, "value": {"totalEntries": 1, "numEntries": 1,'
    ' "ipv4Entries": [7]}}',
    '{"record": "VSMACTable", "value": {"totalEntries": 1, "numEntries": 1, "macEntries":'
    ' [{"macAddress": "020000000001", "macAddrType": 0, "aging": 0, "vid": 7, "vni": 0,'
    ' "elapsed": 0}]}}',
    '{"record": "VSRuntimeOptions", "value": {"totalLength": 25, "VSRuntimeOptionHeader":'
    ' [{"type": 1, "length": 8, "data": "14000000"},'
    ' {"type": 13, "length": 13, "data": "31302e302e302e3900"}]}}',
    '{"record": "VSLAGTable", "value": {"numLAGs": 1, "VSLAGStatus": [{"state": 0, "id": 1,'
    ' "name": "lag1", "uplinkLinkupBitmap": 3, "numUplinks": 1, "uplinkNames":'
    ' [{"string": {"hex": "ff"}}]}]}}',
    '{"record": "DVMirrorEntity", "value": {"type": 3, "ip": {"isIPv6": 0, "pad": "000000",'
    ' "ipv4": {"s_addr": 117440522}}}}',
    '{"call": "DVSQEX_GlobalPropGet", "in": {"switchId": "a", "key": "b"},'
    ' "out": {"data": {"at": 7, "bytes": "28230000"}, "length": 4}}',
    '{"call": "VSDVS_SetPrivateVLANMap", "in": {"switchName": "lab", "entries": [{"primaryVID": 5,'
    ' "secondaryVID": 6, "pvlanType": 2, "pad": ""}], "count": 1}, "out": {}}',
    '{"call": "DVSData_Data", "in": {"item": {"at": 1}}, "out": {"data": {"at": 2, "bytes":'
    ' "0a0b"}}, "result": 2}',
    '{"call": "VSQEX_GetMcastFilterStats", "in": {"switchName": {"hex": "ff"}, "port": 1,'
    ' "mode": 3, "group": {"unread": "no memory"}, "stats": null}}',
]

MARKDOWN_EXAMPLE = re.compile(r"```json\n(.*?)```", re.DOTALL)


class Outcome(NamedTuple):
    """What became of a run."""

    inputs: int
    """How many were tried."""
    wrong: List[str]


def documents() -> List[str]:
    """The scenario documents that there are: the default host, and each example of a key."""
    simhost = ROOT / "simhost"
    examples = MARKDOWN_EXAMPLE.findall((simhost / "SCENARIOS.md").read_text(encoding="utf-8"))
    return [(simhost / "scenario" / "default_host.json").read_text(encoding="utf-8"), *examples]


# A trace with a call of each ending, a callback and a call within it.
TRACE = """\
{"vswitch trace": 1, "module": "1", "time": "", "command": ["x"], "libraries": {}}
{"process": 7, "parent": 1, "time": "", "program": "/x", "libraries": {}}
{"call": 1, "process": 7, "thread": 1, "function": "VSDVS_SetMTU", "at": 5, \
"in": {"switchName": "lab", "mtu": 9000}}
{"end": 1, "process": 7, "took": 8, "status": 0}
{"call": 2, "process": 7, "thread": 1, "function": "DVSState_SwitchForEach", "at": 5, \
"in": {"callback": {"at": 1}, "context": null}}
{"callback": 3, "process": 7, "thread": 1, "within": 2, "argument": "callback", "at": 6, \
"in": {"reached": {"at": 2}, "context": null}}
{"call": 4, "process": 7, "thread": 1, "within": 3, "function": "DVS_SwitchId", "at": 7, \
"in": {"handle": {"at": 2}}}
{"end": 4, "process": 7, "took": 8, "result": "lab-1"}
{"end": 3, "process": 7, "result": 1}
{"end": 2, "process": 7, "took": 1, "trap": {"type": "RuntimeError", "text": "late", "value": 1}}
{"call": 5, "process": 7, "thread": 2, "function": "DVSQEX_GlobalPropGet", "at": 9, \
"in": {"switchId": "a", "key": "b"}}
{"end": 5, "process": 7, "took": 1, "status": 0, \
"out": {"data": {"at": 7, "bytes": "28230000"}, "length": 4}}
"""

# Messages of multicast of each kind, IPv4's and IPv6's, without the checksums.
IGMP = [
    "1164000000000000",
    "110a0000ef010101027d00010a000009",
    "16000000ef010101",
    "17000000ef010101",
    "220000000000000206000002ef0101010a0000090a00000a01010001ef0202020a00000900000000",
    "30140000007d0002",
    "32000000",
]
MLD = [
    "820000002710000000000000000000000000000000000000",
    "8200000083e80000ff150000000000000000000000000101027d000120010db8000000000000000000000009",
    "8300000000000000ff150000000000000000000000000101",
    "8400000000000000ff150000000000000000000000000101",
    "8f0000000000000105000001ff15000000000000000000000000010120010db8000000000000000000000009",
    "97140000007d0002",
    "99000000",
]
ROUTER_ALERT = bytes([5, 2, 0, 0, 1, 0])


def messages() -> List[bytes]:
    """Those as the harness takes them: numbers come from the end."""
    of_ipv4, of_ipv6 = ([bytes.fromhex(digits) for digits in family] for family in (IGMP, MLD))
    return [
        *(one + bytes([0, 0, 1, 0, 0, 10, len(one), 1, 1]) for one in of_ipv4),
        *(one + ROUTER_ALERT + bytes([0, 0, 1, len(one), 1, 0]) for one in of_ipv6),
    ]


TEXTS: Dict[str, Callable[[], List[str]]] = {
    "decoded": lambda: VALUES,
    "scenario": documents,
    "script": lambda: [TRACE],
}
"""The harnesses that read texts, and some for each."""


def vocabulary(name: str) -> List[str]:
    """The keys and texts of all of a harness."""
    return sorted(set(re.findall(r'"[^"\\]*"', "\n".join(TEXTS[name]()))))


def write_seeds(name: str, folder: Path) -> None:
    """Texts and messages for the harnesses that read them, what a real Open vSwitch sends for those
    that read that, and for the others, whose inputs are rows of choices, choices at random."""
    if name in ("openflow", "ovsdb"):
        subprocess.run([BUILD / "fuzzers" / "openvswitch_seeds", name, folder], check=True)
        return
    if name in TEXTS:
        for number, document in enumerate(TEXTS[name]()):
            (folder / f"seed-{number}").write_text(document, encoding="utf-8")
        return
    if name == "multicast":
        for number, message in enumerate(messages()):
            (folder / f"seed-{number}").write_bytes(message)
        return
    chance = random.Random(name)
    for number in range(24):
        size = 16 << number % 8
        (folder / f"seed-{number}").write_bytes(bytes(chance.choices(range(256), k=size)))


def write_dictionary(name: str, file: Path) -> None:
    lines = [text.replace('"', '\\"') for text in vocabulary(name)]
    file.write_text("".join(f'"{line}"\n' for line in lines if line.isascii()), encoding="ascii")


def _findings() -> Path:
    folder = BUILD / "findings"
    folder.mkdir(parents=True, exist_ok=True)
    return folder


def run(
    name: str, corpus: Path, seed: int, *limits: str, patience: int = PATIENCE, planted: str = ""
) -> Outcome:
    """Run a fuzzer on a corpus, which it adds to, until it finds something or reaches a limit.

    An input that it fails on stays in the folder of findings.
    """
    corpus.mkdir(parents=True, exist_ok=True)
    write_seeds(name, corpus)
    options = [f"-seed={seed}", f"-timeout={patience}", "-max_len=4096", "-close_fd_mask=1"]
    if name in TEXTS:
        dictionary = BUILD / f"{name}.dict"
        write_dictionary(name, dictionary)
        options.append(f"-dict={dictionary}")
    fuzzer = BUILD / "fuzzers" / name
    prefix = f"{_findings() / name}-"
    done = subprocess.run(
        [fuzzer, *options, f"-artifact_prefix={prefix}", "-print_final_stats=1", *limits, corpus],
        env={**os.environ, "PLANTED": planted},
        stdout=subprocess.DEVNULL,
        stderr=subprocess.PIPE,
        text=True,
        errors="replace",
        check=False,
    )
    tried = re.search(r"stat::number_of_executed_units: +(\d+)", done.stderr)
    return Outcome(
        int(tried[1]) if tried else 0, [] if done.returncode == 0 else [told(fuzzer, done.stderr)]
    )


def told(fuzzer: Path, said: str) -> str:
    """What a fuzzer said of the input that it failed on, and how to see it again."""
    what = re.findall(r"does not hold: .*|\S*: runtime error: .*|SUMMARY: .*|^==.*ERROR: .*", said)
    left = re.search(r"Test unit written to (\S+)", said)
    again = f"to see it again: {fuzzer} {left[1]}" if left else said[-2000:]
    return "\n".join([*dict.fromkeys(what), again])


def main() -> int:
    """Run one fuzzer on a corpus that lasts."""
    parser = argparse.ArgumentParser()
    parser.add_argument("fuzzer", choices=NAMES)
    parser.add_argument("--seconds", type=int, default=60)
    parser.add_argument("--seed", type=int, default=random.randrange(1, 2**31))
    options = parser.parse_args()
    print(f"seed {options.seed}", flush=True)
    corpus = BUILD / "corpus" / options.fuzzer
    done = run(options.fuzzer, corpus, options.seed, f"-max_total_time={options.seconds}")
    print(f"{done.inputs:,} inputs", *done.wrong, sep="\n")
    return 1 if done.wrong else 0


if __name__ == "__main__":
    sys.exit(main())
