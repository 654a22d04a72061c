"""Programs of threads that release and read the same memory, for AddressSanitizer to look at.

threads.py [NAME...]: runs those named, or all; ends well if nothing but the errors that it expects
came about.
"""

import random
import sys
import threading
from typing import Any, Callable, Dict, List

import libvswitch as vs

ROUNDS = 150
SWITCH = "threads"
# What reading or releasing says of memory that is gone.
GONE = ("is gone", "memory is gone", "null reference", "the pointer is null", "is null")


def together(*works: Callable[[], Any]) -> None:
    """Runs functions at the same time, each until it finds its memory gone."""
    start = threading.Barrier(len(works))
    wrong: List[BaseException] = []

    def until_gone(work: Callable[[], Any]) -> None:
        start.wait()
        try:
            for _ in range(200):
                work()
        except ValueError as error:
            if not any(text in str(error) for text in GONE):
                wrong.append(error)
        except BaseException as error:
            wrong.append(error)

    threads = [threading.Thread(target=until_gone, args=(work,)) for work in works]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    if wrong:
        raise wrong[0]


def once(work: Callable[[], Any]) -> Callable[[], Any]:
    """After a while, whenever that is."""
    left = [random.randrange(20)]

    def later() -> None:
        left[0] -= 1
        if left[0] == 0:
            work()

    return later


def elements() -> None:
    _, uplinks = vs.VSQEX_GetUplinks(SWITCH)
    entries = uplinks.entries
    together(
        once(lambda: vs.VSQEX_FreeMemory(uplinks)),
        lambda: [entry.portID for entry in entries],
        lambda: bytes(entries),
        lambda: list(uplinks),
        lambda: repr(uplinks.entries[0].name),
    )
    end(uplinks)


def views_of_views() -> None:
    _, uplinks = vs.VSQEX_GetUplinks(SWITCH)
    entry = uplinks.entries[0]
    together(
        once(lambda: vs.VSQEX_FreeMemory(uplinks)),
        lambda: entry.name.string,
        lambda: setattr(entry, "portID", 5),
        lambda: setattr(entry.name, "string", "x"),
    )
    end(uplinks)


def two_that_release() -> None:
    _, uplinks = vs.VSQEX_GetUplinks(SWITCH)
    cell = vs.Cell("void *", uplinks)
    together(
        once(lambda: vs.VSQEX_FreeMemory(uplinks)),
        once(lambda: vs.owned(uplinks).__exit__()),
        lambda: cell.read(4),
        lambda: len(uplinks),
    )
    end(uplinks)


def cells() -> None:
    groups: Any = vs.Cell("VSLAGTable *")
    assert vs.VSQEX_GetLAGTable(SWITCH, groups) == vs.QEX_OK

    def look() -> None:
        table = groups.value
        if table is None:
            raise ValueError("the pointer is null")
        table.numLAGs

    together(once(lambda: vs.owned(groups).__exit__()), look, look, lambda: groups.read(4), look)
    end(groups.value)


def properties() -> None:
    data, length = vs.Cell("void *"), vs.Cell("int")
    info = vs.VSInfo()
    assert vs.VSQEX_GetVSInfo(SWITCH, info) == vs.QEX_OK
    identifier = bytes(info.nebID).split(b"\0")[0].decode()
    assert vs.DVSQEX_GlobalPropGet(identifier, vs.VSPROP_MTU, data, length) == vs.QEX_OK
    together(once(lambda: vs.owned(data).__exit__()), lambda: data.read(4), lambda: data.read(4))
    end(data.value)


def copies() -> None:
    _, uplinks = vs.VSQEX_GetUplinks(SWITCH)
    entry: Any = uplinks.entries[0]
    together(
        once(lambda: vs.VSQEX_FreeMemory(uplinks)), entry.__copy__, lambda: list(uplinks.entries)
    )
    end(uplinks)


def arrays() -> None:
    ranges = vs.new_vidrangeArray(4)
    together(
        once(lambda: vs.delete_vidrangeArray(ranges)),
        lambda: ranges[3].minVID,
        lambda: ranges.__setitem__(0, ranges[1]),
        lambda: bytes(ranges.first(2)),
    )
    end(ranges, vs.delete_vidrangeArray)


def made_again() -> None:
    """The memory of a record stays while its views do, whatever is done to the record."""
    info: Any = vs.VSPortInfo()
    stats, name = info.stats, info.dvPortId

    def again() -> None:
        for forbidden in (
            info.__init__,
            lambda: setattr(info, "this", vs.VSPortInfo().this),
            lambda: delattr(info, "this"),
            lambda: setattr(info.stats, "this", None),
        ):
            try:
                forbidden()
            except (AttributeError, TypeError):
                continue
            raise AssertionError("a record took other memory")

    together(again, lambda: stats.pktsTx, lambda: name[0], lambda: setattr(stats, "pktsTx", 1))
    info.__dict__.clear()
    [vs.VSPortInfo() for _ in range(50)]
    assert stats.pktsTx == 1 and name[0] == 0


def end(one: Any, deallocator: Any = None) -> None:
    if one is not None and int(one):
        vs.owned(one, deallocator).__exit__()


PROGRAMS: Dict[str, Callable[[], None]] = {
    one.__name__: one
    for one in (
        elements,
        views_of_views,
        two_that_release,
        cells,
        properties,
        copies,
        arrays,
        made_again,
    )
}


def main(names: List[str]) -> None:
    sys.setswitchinterval(1e-6)
    assert vs.VSDVS_CreateVSwitch(SWITCH, None, None, 64, 1, 0, 0, 2) == vs.QEX_OK
    for name in names or PROGRAMS:
        for _ in range(ROUNDS):
            PROGRAMS[name]()


if __name__ == "__main__":
    main(sys.argv[1:])
