"""What demonstrations say, and pings that they show."""

import re
import time
from typing import Callable

from simhost import Client


def say(text: str) -> None:
    print(f"\n# {text}", flush=True)


def ping(client: Client, other: Client, count: int = 3) -> None:
    words = ["ping", "-c", str(count), "-i", "0.1", "-W", "0.3", other.address]
    print(f"$ {' '.join(words)}")
    lines = client.run(*words).stdout.splitlines()
    print("\n".join(line for line in lines if re.search("bytes from|received", line)), flush=True)


def ping_while(client: Client, other: Client, meanwhile: Callable[[], None]) -> None:
    """Three seconds of pings, and something that happens in the middle."""
    words = ["ping", "-c", "30", "-i", "0.1", "-W", "0.3", other.address]
    with client.start(*words, stdout=-1) as pinging:
        time.sleep(1)
        meanwhile()
        said = pinging.communicate()[0]
    print(f"$ {' '.join(words)}")
    print(next(line for line in said.splitlines() if "received" in line), flush=True)
