"""QELO.Files.Item: copy, move and remove, at once and in the background."""

import os
import shutil
import signal
import time

import pytest

from conftest import needs_root
from files import API, alice, bob, common, give, give_folder, home, put  # noqa: F401  (fixtures)
from tasks import TASK, assert_ends

DONE = {"state": "done", "error_count": 0, "errors": [], "skipped": 0}


@pytest.fixture
def tasks(alice):
    """Runs a call in the background; what is left of it is stopped after the test."""
    ids = []

    def start(method, **parameters):
        full_id = alice.call(method, **parameters).data["task_id"]
        ids.append(full_id)
        return full_id

    yield start
    for full_id in ids:
        task(alice, "stop", task_id=full_id, remove="true")


def task(user, method, **parameters):
    return user.client.call(TASK, method, _sid=user.sid, **parameters)


def end_of(user, full_id):
    state = ""
    for _ in range(20):
        status = task(user, "wait", task_id=full_id, state=state, timeout=5).data
        if status["finish"]:
            return status
        state = status["state"]
    raise AssertionError("it does not end")


def put_many(folder, count=300):
    give_folder(folder)
    for number in range(count):
        put(folder / str(number), b"x")


def has(data, **members):
    return {key: data[key] for key in members} == members


def test_Copy_OfFilesAndFolders_IsDoneAtOnce(alice, home, common):
    put(home / "file", b"text")
    put(home / "folder" / "inner" / "deep", b"deep")
    data = alice.call("copy", path=["/own/file", "/own/folder"], to="/common").data
    assert has(data, **DONE)
    assert data["items"] == {"done": 4, "total": 4}
    assert data["bytes"] == {"done": 8, "total": 8}
    assert (common / "file").read_bytes() == b"text"
    assert (common / "folder" / "inner" / "deep").read_bytes() == b"deep"
    assert (home / "file").exists()


def test_Copy_UnderAnotherName_StandsBesideTheFirst(alice, home):
    put(home / "file", b"text")
    assert alice.call("copy", path="/own/file", to="/own", name="second").code == 0
    assert (home / "second").read_bytes() == b"text"
    assert alice.refused("copy", path="/own/file", to="/own", name="a/b") == ("bad_name", "a/b")
    assert alice.call("copy", path=["/own/file", "/own/second"], to="/own", name="x").code == 101


def test_Copy_WhereTheNameIsTaken_DoesAsItIsTold(alice, home, common):
    put(home / "file", b"new")
    put(common / "file", b"old")
    assert alice.refused("copy", path="/own/file", to="/common") == ("exists", "/own/file")
    assert alice.call("copy", path="/own/file", to="/common", existing="skip").data["skipped"] == 1
    assert (common / "file").read_bytes() == b"old"
    assert alice.call("copy", path="/own/file", to="/common", existing="replace").code == 0
    assert (common / "file").read_bytes() == b"new"
    assert alice.call("copy", path="/own/file", to="/common", existing="maybe").code == 101


def test_Move_TakesItemsAlong(alice, home, common):
    put(home / "folder" / "file", b"x")
    put(home / "other", b"y")
    data = alice.call("move", path=["/own/folder", "/own/other"], to="/common").data
    assert has(data, **DONE)
    assert (common / "folder" / "file").read_bytes() == b"x"
    assert (common / "other").read_bytes() == b"y"
    assert not (home / "folder").exists() and not (home / "other").exists()


def test_Remove_OfAFolder_TakesAllThatIsInIt(alice, home):
    put(home / "folder" / "inner" / "file", b"x")
    put(home / "stays")
    assert has(alice.call("remove", path="/own/folder").data, **DONE)
    assert not (home / "folder").exists()
    assert (home / "stays").exists()


def test_NothingIsDone_WhenAnItemIsMissing(alice, home, common):
    put(home / "file")
    for method, parameters in (("remove", {}), ("move", {"to": "/common"}), ("copy", {"to": "/common"})):
        refused = alice.refused(method, path=["/own/file", "/own/none"], **parameters)
        assert refused == ("not_found", "/own/none")
    assert (home / "file").exists()
    assert list(common.iterdir()) == []


def test_SharedFoldersThemselves_AreLeftAlone(alice):
    for path in ("/", "/own"):
        assert alice.refused("remove", path=path) == ("share_itself", path)
        assert alice.refused("move", path=path, to="/common") == ("share_itself", path)
        assert alice.refused("copy", path=path, to="/common") == ("share_itself", path)


def test_FolderThatIsReadOnly_GivesButTakesNothing(alice, home, root):
    put(root / "srv" / "public" / "read", b"text")
    put(home / "file")
    try:
        assert alice.call("copy", path="/public/read", to="/own").code == 0
        assert alice.refused("copy", path="/own/file", to="/public") == ("read_only", "/public")
        assert alice.refused("move", path="/public/read", to="/own")[0] == "read_only"
        assert alice.refused("remove", path="/public/read")[0] == "read_only"
    finally:
        (root / "srv" / "public" / "read").unlink()


def test_FolderIntoItself_IsRefused(alice, home):
    put(home / "a" / "b" / "file")
    for method in ("copy", "move"):
        assert alice.refused(method, path="/own/a", to="/own/a/b") == ("into_itself", "/own/a")
        assert alice.refused(method, path="/own/a", to="/own/a") == ("into_itself", "/own/a")
    assert sorted(os.listdir(home / "a")) == ["b"]


def test_Links_AreCopiedAndRemovedAsLinks(alice, home, common, tmp_path):
    (tmp_path / "secret").write_text("secret")
    (home / "link").symlink_to(tmp_path)
    assert alice.call("copy", path="/own/link", to="/common").code == 0
    assert os.readlink(common / "link") == str(tmp_path)
    assert alice.call("remove", path="/own/link").code == 0
    assert alice.refused("remove", path="/common/link/secret")[0] == "link"
    assert alice.refused("copy", path="/common/link/secret", to="/own")[0] == "link"
    assert alice.refused("copy", path="/own", to="/common/link")[0] in ("share_itself", "link")
    assert (tmp_path / "secret").exists()


def test_PipesAndDevices_AreNotCopied(alice, home, common):
    os.mkfifo(home / "pipe")
    assert alice.refused("copy", path="/own/pipe", to="/common") == ("special", "/own/pipe")
    assert alice.call("remove", path="/own/pipe").code == 0


@needs_root
def test_WhatIsDenied_IsToldAndTheRestIsDone(alice, home, common):
    put(home / "folder" / "locked", b"x")
    put(home / "folder" / "open", b"x")
    os.chown(home / "folder" / "locked", 0, 0)
    (home / "folder" / "locked").chmod(0o600)
    answer = alice.call("copy", path="/own/folder", to="/common")
    assert answer.code == 405
    errors = answer.json["error"]["errors"]
    assert (errors["path"], errors["reason"]) == ("/own/folder/locked", "denied")
    assert errors["errors"] == [{"path": "/own/folder/locked", "reason": "denied"}]
    assert errors["items"] == {"done": 1, "total": 3}
    assert os.listdir(common / "folder") == ["open"]


@needs_root
def test_AnothersItems_AreNotRemoved(alice, bob, common):
    put(common / "alices" / "file")
    (common / "alices").chmod(0o755)
    answer = bob.call("remove", path="/common/alices")
    assert answer.code == 405
    assert answer.json["error"]["errors"]["path"] == "/common/alices/file"
    assert (common / "alices" / "file").exists()


def test_Copy_OfManyItems_IsABackgroundTask(alice, home, common, tasks):
    put_many(home / "many")
    full_id = tasks("copy", path="/own/many", to="/common")
    assert full_id.startswith("alice/files_")
    status = end_of(alice, full_id)
    assert status["success"] and has(status["data"], **DONE)
    assert status["data"]["items"] == {"done": 301, "total": 301}
    assert status["data"]["bytes"] == {"done": 300, "total": 300}
    assert len(os.listdir(common / "many")) == 300
    full_id = tasks("remove", path="/common/many")
    assert end_of(alice, full_id)["success"]
    assert not (common / "many").exists()


def test_Move_OfManyItems_IsDoneAtOnceWhereRenamingDoes(alice, home, common):
    put_many(home / "many")
    assert has(alice.call("move", path="/own/many", to="/common").data, **DONE)
    assert len(os.listdir(common / "many")) == 300


def test_BackgroundTask_ThatFailsInPart_IsAnError(alice, home, common, tasks):
    put_many(home / "many")
    os.mkfifo(home / "many" / "pipe")
    status = end_of(alice, tasks("copy", path="/own/many", to="/common"))
    assert not status["success"]
    assert status["error"]["code"] == 411
    assert status["error"]["errors"]["errors"] == [{"path": "/own/many/pipe", "reason": "special"}]
    assert len(os.listdir(common / "many")) == 300


@pytest.fixture
def large(home):
    """A folder with a file that takes a while to copy."""
    give_folder(home / "large")
    with open(put(home / "large" / "file"), "wb") as file:
        for _ in range(160):
            file.write(os.urandom(1 << 20) * 4)
    yield "/own/large"
    shutil.rmtree(home / "large")


def processes():
    """The API's processes in the background."""
    found = []
    for entry in filter(str.isdigit, os.listdir("/proc")):
        try:
            with open(f"/proc/{entry}/comm", encoding="utf-8") as file:
                if file.read().startswith("QELO.Files.Item"):
                    found.append(int(entry))
        except OSError:
            pass  # it has ended
    return set(found)


@pytest.fixture
def halted(tasks, large):
    """Starts a copy and halts its process in the middle: halted(**parameters)."""
    pids = []

    def start(**parameters):
        before = processes()
        full_id = tasks("copy", path=large, to="/common", **parameters)
        deadline = time.monotonic() + 5
        while len(new := processes() - before) > 1 and time.monotonic() < deadline:
            time.sleep(0.001)  # the call's own process is about to end
        (pid,) = new
        os.kill(pid, signal.SIGSTOP)
        pids.append(pid)
        return full_id, pid

    yield start
    for pid in pids:
        try:
            os.kill(pid, signal.SIGKILL)
        except ProcessLookupError:
            pass
        assert_ends(pid)


def files_in(folder):
    return [str(path.relative_to(folder)) for path in folder.rglob("*") if path.is_file()]


def test_Copy_InTheMiddle_TellsHowFarItIsAndShowsNoHalfFile(alice, common, halted):
    full_id, pid = halted()
    status = task(alice, "status", task_id=full_id).data
    assert status["finish"] is False
    assert status["data"]["state"] in ("counting", "copying")
    assert files_in(common) == []
    os.kill(pid, signal.SIGCONT)
    assert end_of(alice, full_id)["success"]
    assert files_in(common) == ["large/file"]


def test_Stop_IsObeyedAndLeavesNoHalfFile(alice, common, halted):
    full_id, pid = halted()
    assert task(alice, "stop", task_id=full_id).code == 0
    os.kill(pid, signal.SIGCONT)
    assert_ends(pid)
    assert files_in(common) == []
    assert task(alice, "status", task_id=full_id).data["data"]["state"] != "done"


def test_KilledCopy_LeavesNoHalfFileAndIsAnError(alice, common, halted):
    full_id, pid = halted()
    os.kill(pid, signal.SIGKILL)
    assert_ends(pid)
    assert end_of(alice, full_id)["error"]["code"] == 117
    assert files_in(common) == []


def test_FifthTask_IsRefused(alice, halted):
    for number in range(4):
        halted(name=f"copy{number}")
    assert alice.refused("copy", path="/own/large", to="/common", name="copy4") == (
        "too_many_tasks", "/own/large")
