"""Compound requests that would have the host do more than a person ever asks for."""

import json
import os
import subprocess
import time
from pathlib import Path
from urllib.parse import urlencode

import pytest

from client import PATH
from compound import OUTER, Compound, code, entry, modes
from conftest import ENTRY, session_of
from marks import wait_for
from webserver import WebServer

METHODS = ["echo", "slow"]
MANY = {"success": False, "error": {"code": 110, "errors": "too many compound entries."}}
TOO_LARGE = {"success": False, "error": {"code": 101}}  # more JSON values than a request may hold


@pytest.fixture(autouse=True)
def described(describe):
    grantable = [{name: {"grantable": True}} for name in METHODS]
    describe("QELO.Test.Entries", "entries.so", methods={"1": METHODS, "2": grantable})


@pytest.fixture
def settings(root):
    """Adds settings for one test."""
    file = root / "etc" / "qeloinfo.conf"
    before = file.read_text()
    yield lambda **values: file.write_text(
        before + "".join(f'{key}="{value}"\n' for key, value in values.items())
    )
    file.write_text(before)


@pytest.fixture
def anonymous(server):
    return Compound(server, None)


@pytest.fixture
def alice(server, client):
    return Compound(server, session_of(client, "alice")["sid"])


def nested(entries):
    return entry("request", api=OUTER, compound=entries)


def spread(count):
    """So many entries on three levels."""
    return [nested([nested([entry("echo", version=2)] * (count - 2))])]


@modes
def test_Flood_ByNobody_IsRefusedBeforeAnythingRuns(anonymous, mode):
    for entries, refusal in (
        ([{}] * 257, MANY),
        (spread(257), MANY),
        ([{}] * 40_000, MANY),
        ([nested([{}] * 100)] * 100, MANY),
        ([{}] * 500_000, TOO_LARGE),
        ([nested([{}] * 1000)] * 1000, TOO_LARGE),
    ):
        begin = time.monotonic()
        assert anonymous(entries, mode=mode) == refusal
        assert time.monotonic() - begin < 5


def test_Flood_ByAUser_HasItsOwnLimit(alice):
    results = alice.results([entry("echo", version=2)] * 1000)
    assert {code(result) for result in results} == {0}
    assert alice([entry("echo", version=2)] * 1025) == MANY


def test_Flood_AtTheLimit_IsAnswered(anonymous):
    results = anonymous.results([entry("echo", version=2)] * 256)
    assert {code(result) for result in results} == {0}
    inner = anonymous.results(spread(256))[0]["data"]["result"][0]["data"]["result"]
    assert len(inner) == 254
    assert {code(result) for result in inner} == {0}


def test_Flood_IsBoundedBySettings(anonymous, alice, settings):
    settings(compound_entries=5, compound_entries_anonymous=2)
    echo = entry("echo", version=2)
    assert anonymous([echo] * 3) == MANY
    assert len(anonymous.results([echo] * 2)) == 2
    assert alice([echo] * 6) == MANY
    assert len(alice.results([echo] * 5)) == 5
    assert alice(spread(6)) == MANY
    settings(compound_entries_anonymous=0)
    assert anonymous([echo]) == MANY


def run_slowly(count, version):
    """entry.cgi with entries that take 0.2 s each, one after the other."""
    entries = json.dumps([entry("slow", version=version, ms=200)] * count)
    query = {"api": OUTER, "version": 1, "method": "request", "compound": entries}
    return subprocess.Popen(
        [ENTRY],
        env={"REQUEST_METHOD": "GET", "REMOTE_ADDR": "127.0.0.1", "QUERY_STRING": urlencode(query)},
        stdin=subprocess.DEVNULL,
        stdout=subprocess.PIPE,
    )


@pytest.mark.parametrize("version", [1, 2])
def test_ClientWhoHasGone_GetsNoFurtherEntries(root, version):
    process = run_slowly(30, version)
    time.sleep(0.4)
    process.stdout.close()
    begin = time.monotonic()
    process.wait(timeout=20)
    assert time.monotonic() - begin < 3


def children_of(pid):
    found = subprocess.run(["ps", "-o", "pid=", "--ppid", str(pid)], capture_output=True, text=True)
    return found.stdout.split()


@pytest.fixture
def impatient(root, tmp_path_factory):
    """A web server that ends the program when its client hangs up."""
    limits = '("read-timeout" => 300, "tcp-fin-propagate" => "SIGTERM")'
    extra = f'$HTTP["url"] =~ "^/webapi/" {{ cgi.limits = {limits} }}\n'
    server = WebServer(tmp_path_factory.mktemp("server"), ENTRY, extra).start()
    yield server
    server.stop()


def count_of_programs():
    """How many processes of entry.cgi there are."""
    count = 0
    for link in Path("/proc").glob("[0-9]*/exe"):
        try:
            count += os.readlink(link) == str(ENTRY)
        except OSError:
            continue
    return count


@modes
def test_ClientOfAServerWhoHasGone_GetsNoFurtherEntries(impatient, mode):
    assert wait_for(lambda: count_of_programs() == 0, 20)
    slow = entry("slow", version=2, ms=200)
    entries = json.dumps([slow] * 50 if mode == "sequential" else [nested([slow] * 50)] * 3)
    command = ["curl", "-sS", "--max-time", "1", f"http://127.0.0.1:{impatient.port}{PATH}",
               "-d", f"api={OUTER}&version=1&method=request&mode={mode}", "--data-urlencode",
               f"compound={entries}"]
    assert subprocess.run(command, capture_output=True, check=False).returncode == 28
    assert wait_for(lambda: count_of_programs() == 0, 10)
