"""What demonstrations say, and pings that they show."""

import itertools
import re
import signal
import subprocess
import threading
from typing import Callable

from simhost import Client
from simhost._namespaces import PATIENCE


def say(text: str) -> None:
    print(f"\n# {text}", flush=True)


def ping(client: Client, other: Client, count: int = 3) -> None:
    words = ["ping", "-c", str(count), "-i", "0.1", "-W", "0.3", other.address]
    print(f"$ {' '.join(words)}")
    lines = client.run(*words).stdout.splitlines()
    print("\n".join(line for line in lines if re.search("bytes from|received", line)), flush=True)


def ping_while(client: Client, other: Client, meanwhile: Callable[[], None]) -> None:
    """Pings, and something that happens in the middle and after which they go on."""
    words = ["ping", "-i", "0.1", "-W", "0.3", other.address]
    # Those that were replied to before and are read after it are fewer.
    before, after = 10, 20
    with client.start(*words, stdout=subprocess.PIPE) as pinging:
        assert pinging.stdout is not None
        ending = threading.Timer(PATIENCE, pinging.kill)
        ending.start()
        replies = (line for line in pinging.stdout if "bytes from" in line)
        had = len(list(itertools.islice(replies, before)))
        meanwhile()
        had += len(list(itertools.islice(replies, after)))
        pinging.send_signal(signal.SIGINT)
        said = pinging.communicate()[0]
        ending.cancel()
    assert had == before + after, f"after {had} pings no more were replied to"
    print(f"$ {' '.join(words)}")
    print(next(line for line in said.splitlines() if "received" in line), flush=True)
