"""API libraries that are wrong: each call gets a whole answer, and takes its own process at most."""

import re
import time
from pathlib import Path

import pytest

from conftest import BUILD, PLUGINS, answer_of, run_entry

CALL = "api=QELO.Test.Call&version=1&method=run"


def call(client, version=1):
    return client.get(f"api=QELO.Test.Call&version={version}&method=run")


def test_LibraryThatIsMissing_IsNoLibrary(client, describe):
    describe("QELO.Test.Call", "no-such-library.so")
    assert call(client).json == {"success": False, "error": {"code": 111}}


def test_LibraryWithoutAPath_IsNoLibrary(client, describe):
    describe("QELO.Test.Call")
    assert call(client).code == 111


def test_LibraryThatIsNoLibrary_IsNoLibrary(client, describe):
    describe("QELO.Test.Call", "../../CMakeCache.txt")
    assert (BUILD / "CMakeCache.txt").exists()
    assert call(client).code == 111


@pytest.mark.parametrize("library", ["no_table.so", "null_table.so", "throwing_table.so"])
def test_LibraryWithoutATable_IsNoLibrary(client, describe, library):
    describe("QELO.Test.Call", library)
    assert call(client).code == 111


def test_MethodThatTheTableLacks_IsMissing(client, alice):
    assert client.call("QELO.Test.Identity", "missing", _sid=alice["sid"]).code == 121


@pytest.mark.parametrize("version", [1, 2])
def test_MethodThatThrows_IsNoAnswer(client, describe, version):
    describe("QELO.Test.Call", "throwing.so")
    answer = call(client, version)
    assert answer.status == 200
    assert answer.json == {"success": False, "error": {"code": 117}}


def test_MethodThatCrashes_IsTheServersError(client, describe):
    describe("QELO.Test.Call", "crashing.so")
    assert call(client).status == 500
    describe("QELO.Test.Call", "throwing.so")
    assert call(client).status == 200


def test_LibraryWhoseConstructorThrows_IsTheServersError(client, describe):
    describe("QELO.Test.Call", "throwing_constructor.so")
    assert call(client).status == 500
    describe("QELO.Test.Call", "throwing.so")
    assert call(client).status == 200


@pytest.mark.parametrize("method, code", [("echo", 0), ("fail", 400), ("silent", 117)])
def test_Method_AnswersWhatItSet_OrNoAnswer(client, describe, method, code):
    describe("QELO.Test.Good", "good.so", methods={"1": ["echo", "fail", "silent"]})
    assert client.get(f"api=QELO.Test.Good&version=1&method={method}").code == code


@pytest.mark.parametrize("priority", [5, 0])
def test_Priority_IsTheDescriptions(client, describe, priority):
    describe("QELO.Test.Call", "state.so", priority=priority)
    assert call(client).data["priority"] == priority


def test_LibraryThatPrints_DoesNotReachTheAnswer(client, describe):
    describe("QELO.Test.Call", "printing.so")
    answer = call(client)
    assert answer.body == b'{"data":"printed","success":true}'
    assert answer_of(run_entry(CALL)) == {"data": "printed", "success": True}


def test_LibraryThatReads_SeesTheEndAtOnce(client, describe):
    describe("QELO.Test.Call", "reading.so")
    started = time.monotonic()
    assert client.post(CALL + "&x=left+over").data == {"stream": "", "file": 0, "descriptor": 0}
    assert time.monotonic() - started < 5


def test_LibraryThatChangesTheProcess_IsUndone(client, describe):
    describe("QELO.Test.Call", "wandering.so")
    assert call(client).data == "gone"


@pytest.mark.parametrize("how", [
    "closed", "descriptors", "wide", "wideCpp", "reopened", "lent", "dead", "tied", "throwing",
    "unsynchronised", "replaced"])
def test_LibraryThatMistreatsTheStreams_KeepsItsAnswer(client, server, describe, how):
    describe("QELO.Test.Call", "mistreating.so")
    crashes = server.log().count("died with signal")
    answer = client.get(f"{CALL}&how={how}")
    assert (answer.status, answer.body) == (200, b'{"data":"done","success":true}')
    assert server.log().count("died with signal") == crashes  # after the answer, either


def test_LibraryThatClosesAllDescriptors_LosesItsOwnAnswer(client, describe):
    describe("QELO.Test.Call", "mistreating.so")
    assert client.get(f"{CALL}&how=rest").status == 500
    assert client.get(f"{CALL}&how=wide").status == 200


@pytest.mark.parametrize("version, code", [(1, 444), (2, 0), (3, 117)])
def test_CheckFunction_StopsTheCallOrNot(client, describe, version, code):
    describe("QELO.Test.Call", "checked.so")
    assert call(client, version).code == code


def test_NullCheckTable_IsNoTable(client, describe):
    describe("QELO.Test.Call", "null_check_table.so")
    assert call(client).code == 0


def test_EveryLibrary_IsUsedByATest():
    folder = Path(__file__).parents[2]
    users = [*folder.rglob("*Test.cpp"), *folder.rglob("*.h"), *folder.rglob("test_*.py"),
             *folder.rglob("support/*.py"), *folder.rglob("descriptions/*.lib")]
    text = "".join(path.read_text() for path in users)
    libraries = [library.stem for library in PLUGINS.glob("*.so")]
    assert "crashing" in libraries
    unused = [name for name in libraries if not re.search(rf'["/]{name}(\.so)?"', text)]
    assert unused == []
