"""Several processes on one host at once: no update is lost, and none is read by half."""

import subprocess
import sys
from typing import List

from simulated_host import PRELUDE, Host

WRITERS = 4
SESSIONS = 15

# One call reads the table of sessions, adds one, and writes it.
APPEND = """
for number in range(%d):
    table = vs.alloc_dvmirror_session_table(1, 0)
    vs.DVMirrorSessionTable_version_set(table, vs.VS_DVMIRROR_VERSION_V3)
    session = vs.DVMirrorSessionTable___getitem__(table, 0)
    vs.DVMirrorSession_sid_set(session, f"%s-{number}")
    vs.DVMirrorSession_type_set(session, vs.VS_DVMIRROR_SESSIONTYPE_DVPORT)
    assert vs.VSDVS_AppendDVMirrorSessions("vswitch0", "web-1", table) == vs.QEX_OK
    vs.free_dvmirror_session_table(table)
"""

# A record of 2,620 bytes, all of one letter; and two ports that come and go in one call.
WRITE = """
policy = vs.new_VSTeamPolicy()
names = [[f"{letter}{at:02}" for at in range(32)] for letter in "ab"]
documents = [
    ('{"switches": [{"alias": "vswitch0", "counters": {"txErrors": %d},'
     ' "ports": [{"id": "web-2", "counters": {"numMACsMoved": %d}}]}]}' % (n, n)).encode()
    for n in range(2)
]
print("ready", flush=True)
turn = 0
while True:
    turn = 1 - turn
    vs.VSTeamPolicy_numActive_set(policy, 32)
    for at, name in enumerate(names[turn]):
        vs.VSTeamPolicy___setitem__(policy, at, name)
    assert vs.VSDVS_SetTeamingPolicy("vswitch0", policy) == vs.QEX_OK
    assert simhost.simhost_apply(documents[turn]) == vs.QEX_OK
"""
READ = """
import json
policy = vs.new_VSTeamPolicy()
letters_seen, pairs_seen, reads = set(), set(), 0
# Both values of both must have been there, or nothing changed while this read.
while reads < 400 or len(letters_seen) < 2:
    reads += 1
    assert vs.VSDVS_GetTeamingPolicy("vswitch0", policy) == vs.QEX_OK
    letters = {vs.VSTeamPolicy___getitem__(policy, at)[:1] for at in range(32)}
    assert len(letters) == 1, letters
    letters_seen |= letters
vs.delete_VSTeamPolicy(policy)
reads = 0
while reads < 100 or len(pairs_seen) < 2:
    reads += 1
    text = ctypes.create_string_buffer(65536)
    assert 0 < simhost.simhost_describe(text, ctypes.c_size_t(65536)) < 65536
    switch = json.loads(text.value)["switches"][0]
    port = next(port for port in switch["ports"] if port["id"] == "web-2")
    pair = (switch["counters"]["txErrors"], port["counters"]["numMACsMoved"])
    assert pair in ((0, 0), (1, 1)), pair
    pairs_seen.add(pair)
"""


def started(host: Host, code: str) -> "subprocess.Popen[str]":
    return subprocess.Popen(
        [sys.executable, "-c", PRELUDE + code],
        env=host.environment,
        stdout=subprocess.PIPE,
        text=True,
    )


def test_no_update_is_lost(host: Host) -> None:
    host.ctl("show")
    writers = [started(host, APPEND % (SESSIONS, letter)) for letter in "abcd"[:WRITERS]]
    assert [writer.wait() for writer in writers] == [0] * WRITERS
    for writer in writers:
        writer.communicate()
    ports = host.described()["switches"][0]["ports"]
    sessions: List[str] = [
        session["sid"] for port in ports for session in port.get("mirror_sessions", [])
    ]
    wanted = [f"{letter}-{number}" for letter in "abcd"[:WRITERS] for number in range(SESSIONS)]
    assert sorted(sessions) == sorted(wanted)


def test_no_update_is_read_by_half(host: Host) -> None:
    host.ctl("show")
    writers = [started(host, WRITE) for _ in range(2)]
    try:
        for writer in writers:
            assert writer.stdout and writer.stdout.readline() == "ready\n"
        assert host.lines(READ) == []
    finally:
        for writer in writers:
            writer.kill()
            writer.communicate()
