"""The API daemon, started for a test, and an API whose calls it makes."""

import threading
from urllib.parse import urlencode

import pytest

from conftest import ROOT, answer_of, run_entry
from service import Service

ENTRIES = "QELO.Test.Entries"
PLACE = ROOT / "run" / "webapi" / "api"


@pytest.fixture
def path():
    """Where a test's socket is."""
    return PLACE / "test.sock"


@pytest.fixture
def describe_there(describe, path):
    """Describes an API whose calls the daemon makes."""

    def write(api, library="", **members):
        return describe(api, library, socket=str(path), **members)

    return write


@pytest.fixture
def entries(describe_there):
    describe_there(ENTRIES, "entries.so", methods={"1": [
        "echo", "process", "slow", "large", "fail", "restart", "mark",
        {"later": {"grantByDefault": True}}]})


@pytest.fixture
def start(root, tmp_path):
    """Starts the daemon with options; it ends with the test."""
    started = []

    def run(*options, **environment):
        service = Service(tmp_path, "qeloapid", *options, **environment)
        started.append(service)
        return service.start()

    yield run
    for service in started:
        service.stop()


def call(api, method, version=1, **parameters):
    query = urlencode({"api": api, "version": version, "method": method, **parameters})
    return answer_of(run_entry(query))


def in_background(function):
    """Runs it; the result is there after join()."""
    results = []
    thread = threading.Thread(target=lambda: results.append(function()))
    thread.start()
    return thread, results
