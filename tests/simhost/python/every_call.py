"""Makes every call of the host, and writes which of them were seen to do something, as JSON."""

import json

import libvswitch as vs

from calls_of_configuration import configure
from calls_of_queries import query
from calls_of_the_state import keep_state
from witness import call


def main() -> None:
    configure()
    query()
    keep_state()
    for status in (vs.QEX_OK, vs.QEX_BUSY):
        call.note("QEX_ReturnStatusToString", vs.QEX_ReturnStatusToString(status))
    for text in ("one", "two"):
        call.panic(text)
    print(json.dumps({"modelled": sorted(call.modelled()), "succeeded": sorted(call.succeeded())}))


if __name__ == "__main__":
    main()
