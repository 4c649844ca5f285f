"""Counting of calls, by many processes at once and by processes that are killed."""

import json
import random
import re
import subprocess
import time

import pytest

from conftest import BUILD, ROOT, needs_root

COUNT = BUILD / "tests" / "integration" / "count"
SPOOL = ROOT / "var" / "spool" / "webapi"
SETTINGS = ROOT / "etc" / "qeloinfo.conf"

PROCESSES = 64
TIMES = 200


def read(directory):
    return json.loads((directory / "QELO.Test.Count.Api.json").read_text())


def start(directory, times):
    return subprocess.Popen(
        [COUNT, directory, str(times)], stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True
    )


def test_ManyProcesses_LoseNoCountThatWasNotRefused(tmp_path):
    processes = [start(tmp_path, TIMES) for _ in range(PROCESSES)]
    outputs = [process.communicate(timeout=120) for process in processes]
    assert all(error == "" for _, error in outputs)
    written = sum(int(output) for output, _ in outputs)
    assert read(tmp_path)["QELO.Test.Count.Api.Long_1_run"]["count"] == written
    assert written > PROCESSES * TIMES / 2, "most counts were refused their lock"


def test_KilledAtAnyMoment_LeavesValidJsonAndNoLock(tmp_path):
    rng = random.Random(7)
    last = 0
    for _ in range(60):
        process = start(tmp_path, 100_000)
        time.sleep(rng.uniform(0.002, 0.03))
        process.kill()
        process.communicate(timeout=10)
        if (tmp_path / "QELO.Test.Count.Api.json").exists():
            count = read(tmp_path)["QELO.Test.Count.Api.Long_1_run"]["count"]
            assert count >= last
            last = count
    assert last > 0
    assert len(list(tmp_path.glob("*.json?*"))) <= 2, "the lock, and one file of a killed process"
    assert start(tmp_path, 1).communicate(timeout=10)[0] == "1\n"
    assert [path.suffix for path in tmp_path.glob("*.json?*")] == [".lock"]


@pytest.fixture
def allow_collecting(root):
    """allow_collecting("yes") or ("no"): the administrator's choice, for one test."""
    before = SETTINGS.read_text()

    def choose(choice):
        SETTINGS.write_text(re.sub(r'(?m)^enable_data_collect=.*$', "", before)
                            + f'enable_data_collect="{choice}"\n')

    yield choose
    SETTINGS.write_text(before)


def counts(api):
    file = SPOOL / f"{api}.json"
    return json.loads(file.read_text()) if file.exists() else {}


@needs_root
def test_Calls_AreCountedWhenCollectionIsAllowed(client, alice, allow_collecting):
    allow_collecting("yes")
    key = "QELO.Test.Identity_1_plain"
    before = counts("QELO.Test.Identity").get(key, {"count": 0})["count"]
    for _ in range(3):
        client.call("QELO.Test.Identity", "plain", _sid=alice["sid"])
    entry = counts("QELO.Test.Identity")[key]
    assert entry["count"] == before + 3
    assert abs(entry["ctime"] - time.time()) < 3600


@needs_root
def test_Calls_ThatAllowTimeout_AreNotCounted(client, alice, allow_collecting):
    allow_collecting("yes")
    client.call("QELO.Test.Identity", "patient", _sid=alice["sid"])
    assert "QELO.Test.Identity_1_patient" not in counts("QELO.Test.Identity")


def test_Calls_AreNotCountedWhenCollectionIsNotAllowed(client, alice, allow_collecting):
    allow_collecting("no")
    before = counts("QELO.Access.Session")
    client.call("QELO.Access.Session", "current", _sid=alice["sid"])
    assert counts("QELO.Access.Session") == before
