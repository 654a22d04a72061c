"""The site: whatever the reference tables list has its place, no link is broken, the search
finds."""

import json
import re
import subprocess
from pathlib import Path
from typing import Any, Dict, List, Tuple

import check_links
import functions
import libvswitch as vs
import pytest
import records
from catalogue import Catalogue
from conftest import BUILD, build
from check_links import Page

HERE = Path(__file__).parent
SURFACE = HERE.parent / "surface"

Site = Dict[str, Page]


def place_of(site: Site, folder: str, anchor: str) -> Tuple[Page, str]:
    """The page of a part of the reference that has an anchor, and what stands there."""
    holders = [
        page
        for path, page in site.items()
        if path.startswith(f"reference/{folder}/") and anchor in page.starts
    ]
    assert len(holders) == 1, f"{anchor} stands on {len(holders)} pages"
    return holders[0], holders[0].below(anchor)


def of_kind(kind: str) -> List[str]:
    return sorted({one.name for one in functions.read() if one.kind == kind})


def entry(site: Site, folder: str, name: str) -> str:
    """What a page says of a function, up to the next one."""
    _, text = place_of(site, folder, f"_libvswitch.{name}")
    return text.partition("\nlibvswitch.")[0]


def test_every_call(site: Site) -> None:
    calls = of_kind("call")
    assert len(calls) == 146
    listed = {one.name: one for one in functions.read() if one.kind == "call"}
    for name in calls:
        place_of(site, "calls", f"libvswitch.{name}")
        text = entry(site, "calls", name)
        assert "Returns" in text, name
        assert "Ownership" in text, name
        assert "Simulated host" in text, name
        assert ("Statuses" in text) == ("status" in listed[name].result), name
        assert ("Parameter" in text) == bool(listed[name].arguments), name


def test_only_what_is_not_modelled_is_said_not_to_be(site: Site) -> None:
    fixed = [name for name in of_kind("call") if "always returns" in entry(site, "calls", name)]
    assert fixed == ["DVSQEX_CmdExec"]
    assert "always returns QEX_NOT_SUPPORTED" in entry(site, "calls", "DVSQEX_CmdExec")
    said = "Simulated host modelled."
    assert len([name for name in of_kind("call") if said in entry(site, "calls", name)]) == 145


def test_every_method_and_helper(site: Site) -> None:
    methods = of_kind("method")
    assert len(methods) == 44
    for name in methods:
        is_of_record = name.partition("_")[0] in records.read() or name.startswith("qex_Name_")
        assert "Returns" in entry(site, "records" if is_of_record else "calls", name)
    assert len(of_kind("helper")) == 3
    for name in of_kind("helper"):
        assert "Returns" in entry(site, "calls", name)


def test_every_record(site: Site) -> None:
    listed = records.read()
    assert len(listed) == 89
    for record in listed.values():
        page, text = place_of(site, "records", f"libvswitch.{record.name}")
        source = page.path.read_text(encoding="utf-8")
        assert source.count(f'aria-label="The {record.size} bytes of {record.name}:') == 1
        assert f"{record.size:,} bytes, declared in" in text
        assert f"new_{record.name}" in text
        for field in record.fields:
            assert f"libvswitch.{record.name}.{field.name}" in page.starts
            row = page.below(f"libvswitch.{record.name}.{field.name}", 2000)
            assert row.split()[0] == field.name
            place = f"\n{field.offset}\n{told_size(field)}\n"
            assert place in re.sub(r"\n+", "\n", row), (record.name, field.name)
            accessors = row[: row.index("_get") + 1500].split()
            assert f"{record.name}_{field.name}_get" in accessors
            writer = f"_libvswitch.{record.name}_{field.name}_set"
            assert (writer in page.starts) == field.writable


def told_size(field: records.Field) -> str:
    if field.bit_count is not None:
        assert field.first_bit is not None
        last = field.first_bit + field.bit_count - 1
        return f"bit {last}" if field.bit_count == 1 else f"bits {field.first_bit} to {last}"
    if field.kind.startswith("flexible"):
        return "trailing"
    # A whole byte of bits is a field of its own to the table.
    return "bits 0 to 7" if field.name == "macAddrType" else f"{field.width:,}"


def test_every_constant(site: Site) -> None:
    lines = (SURFACE / "constants.txt").read_text().splitlines()
    listed = dict(line.split(" = ", 1) for line in lines if " = " in line and line[0] != "#")
    assert len(listed) == 919
    for name, value in listed.items():
        page, text = place_of(site, "constants", f"_libvswitch.{name}")
        words = text.split(None, 2)
        assert words[0] == name
        assert text[text.index(name) + len(name) :].strip().startswith(value), name


@pytest.mark.parametrize(
    "name, meaning",
    [
        ("MIRROR_ENTTYPE_IP", "3 an address: ip"),
        ("QEX_ETH_FILTER_SINK", "no other port takes; see VSDVS_IsSinkPortEnabled"),
        ("QEX_GENERIC_LINUX_ERROR", "Outside the run:"),
        ("QEX_MGMT_MAX_CALLBACK_PARMS", "4 parameters of a callback"),
        ("QEX_NOT_FOUND", "0xbad0003 Not found"),
        ("VSPROP_MTU", "see VSDVS_GetMTU"),
    ],
)
def test_what_a_constant_means(site: Site, name: str, meaning: str) -> None:
    _, text = place_of(site, "constants", f"_libvswitch.{name}")
    assert meaning in " ".join(text[:300].split())


def test_no_comment_is_said_twice(site: Site) -> None:
    device = " ".join(site["reference/constants/device.html"].text.split())
    title = (
        "Bytes of the name of a set of ports and of a port's identifier, terminating NULs included"
    )
    # In the list of the page's parts, and where it stands.
    assert device.count(title) == 2


def test_statuses_have_the_texts_of_the_host(site: Site, catalogue: Catalogue) -> None:
    (family,) = (
        one
        for one in catalogue.headers["qexapi/status.h"].families
        if one.title == "QEX_ReturnStatus"
    )
    names = [name for name in family.names if name not in family.remarks]
    assert len(names) > 350
    for name in names:
        _, text = place_of(site, "constants", f"_libvswitch.{name}")
        told = re.split(r"\n\s*\n", text)[0].splitlines()[-1]
        assert told == vs.QEX_ReturnStatusToString(getattr(vs, name)), name


def test_what_headers_say_beyond_their_headings(site: Site) -> None:
    text = " ".join(site["reference/records/tunnels.html"].text.split())
    assert text.count("The 24-bit fields read low byte first") == 1
    frames = " ".join(site["reference/records/frames.html"].text.split())
    assert frames.count("The records lie over the bytes of a frame") == 1
    protocols = " ".join(site["reference/constants/protocols.html"].text.split())
    assert "Names that end in _NBO hold the value as it reads from a frame" in protocols
    mirror = site["reference/constants/mirror.html"].text
    assert "A table is one block of memory" not in mirror


def test_links(site: Site) -> None:
    assert check_links.broken(site) == []
    assert sum(len(page.links) for page in site.values()) > 1000


@pytest.mark.parametrize("link", ["nowhere.html", "index.html#nowhere", "#nowhere"])
def test_a_broken_link_would_be_found(site: Site, link: str) -> None:
    planted = Page(site["index.html"].path.with_name("planted.html"), links=[link, "index.html"])
    planted.path.touch()
    assert check_links.broken({**site, "planted": planted}) == [f"planted.html: {link}"]


@pytest.mark.parametrize(
    "text, warning",
    [
        ("See :py:func:`libvswitch.VSDVS_NoSuchCall`.", "reference target not found"),
        (".. calls:: vswitch/nothing.h", "vswitch/nothing.h"),
        ("Another title\n=====", "Title underline too short"),
    ],
)
def test_a_warning_would_be_an_error(tmp_path: Path, text: str, warning: str) -> None:
    source = tmp_path / "source"
    source.mkdir()
    (source / "index.rst").write_text(f"Planted\n=======\n\n{text}\n")
    done = build(source, tmp_path)
    assert done.returncode != 0
    assert warning in done.stderr


def test_no_page_is_in_two_places(site: Site) -> None:
    for page in site.values():
        assert len(page.anchors) == len(set(page.anchors)), page.path


@pytest.mark.parametrize(
    "query, page",
    [
        ("VSDVS_SetPortVLANPolicy", "reference/calls/configuration"),
        ("VSMACLearning", "reference/records/mac"),
        ("VSMACLearning_agingTime_get", "reference/records/mac"),
        ("QEX_NICTEAMING_SLAVE", "reference/constants/status"),
        ("VSUplinks___len__", "reference/records/uplinks"),
        ("reverse-ARP announcements", "reference/calls/queries"),
        ("scenario", "guides/describing_a_host"),
        ("SIMHOST_STATE share", "guides/tasks"),
        ("trap", "guides/errors"),
    ],
)
def test_search(site: Site, query: str, page: str) -> None:
    assert page in search(site, query)[:3]


@pytest.mark.parametrize(
    "query",
    [
        "lag",
        "forged transmits",
        "change vlan",
        "enum",
        "unset default",
        "running configured",
        "keywords",
    ],
)
def test_search_of_a_task(site: Site, query: str) -> None:
    assert search(site, query)[0] == "guides/tasks"


def test_search_of_nothing(site: Site) -> None:
    assert search(site, "VSDVS_NoSuchCall") == []


def search(site: Site, query: str) -> List[str]:
    """The pages that the site's own search finds, as a browser would run it."""
    static = next(iter(site.values())).path.parents[0]
    while not (static / "searchindex.js").exists():
        static = static.parent
    command = ["node", str(HERE / "search.js"), str(static), query]
    done = subprocess.run(command, capture_output=True, text=True, timeout=60)
    assert done.returncode == 0, done.stderr
    found: Any = json.loads(done.stdout)
    return [str(page) for page in found]


def test_the_picture_of_the_bench(site: Site) -> None:
    page = site["guides/performance.html"]
    is_shown = any(link.endswith("calls.svg") for link in page.links)
    assert is_shown == (BUILD / "bench/calls.svg").exists()
    assert ("has not run on this machine" in page.text) != is_shown


def test_what_is_written_by_hand(site: Site) -> None:
    import libvswitch

    for name in ("Cell", "Callback", "Pointer", "Array", "owned", "Record", "Table"):
        page = site["reference/memory.html"]
        assert f"libvswitch.{name}" in page.anchors
        documented = getattr(libvswitch, name).__doc__.split(".")[0].splitlines()[0]
        assert documented.split("`")[0] in page.text
    import simhost
    import vswitch

    objects = site["reference/objects.html"].anchors
    kinds = [getattr(vswitch, name) for name in vswitch.__all__]
    own = [kind for kind in kinds if kind.__module__.startswith("vswitch.")]
    assert len(own) > 20
    for kind in own:
        assert f"vswitch.{kind.__name__}" in objects
    for kind in (vswitch.Host, vswitch.Switch, vswitch.Port, vswitch.UplinkPort, vswitch.Uplink):
        said = [name for name, one in vars(kind).items() if name[0] != "_" and one.__doc__]
        assert len(said) > 3
        for name in said:
            assert f"vswitch.{kind.__name__}.{name}" in objects

    page = site["reference/testing.html"]
    for host in (simhost.Host, simhost.SharedHost):
        for base in host.__mro__[:-1]:
            for member in (one for one in vars(base) if not one.startswith("_")):
                assert f"simhost.{base.__name__}.{member}" in page.anchors
