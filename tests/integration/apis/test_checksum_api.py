"""QELO.Work.Checksum: digests of a directory's files as a background task."""

import hashlib
import os
import subprocess
import time
from concurrent.futures import ThreadPoolExecutor
from urllib.parse import urlencode

import pytest

from checksum import give_to_alice, home, put  # noqa: F401  (home is a fixture)
from conftest import BUILD, answer_of, needs_root, run_entry
from tasks import TASK, alice, started  # noqa: F401  (fixtures)

API = "QELO.Work.Checksum"


def put_large(directory):
    """A file that takes a minute to read and no room on the disk."""
    with open(directory / "large", "wb") as file:
        file.truncate(20 << 30)
    give_to_alice(directory / "large")


def run(user, **parameters):
    """The data of a task that has ended."""
    full_id = user.call(API, "start", **parameters).data["task_id"]
    user.started.append((user, full_id))
    status = user.wait_for_end(full_id)
    assert status["success"], status
    assert status["data"]["state"] == "done"
    return status["data"]


def test_Checksum_OfADirectory_IsWhatSha256sumChecks(alice, home):
    put(home / "b.bin", os.urandom(3_000_000))
    put(home / "a" / "deep" / "empty", b"")
    put(home / "a" / "blank in name", b"x")
    put(home / "back\\slash\nand line", b"y")
    put(home / "größe", b"z")
    data = run(alice, path=home)
    lines = data["manifest"].splitlines()
    assert len(lines) == 5
    assert data["manifest_complete"] is True
    assert data["files"] == {"done": 5, "total": 5}
    assert data["bytes"] == {"done": 3_000_003, "total": 3_000_003}
    assert (data["error_count"], data["errors"], data["current"]) == (0, [], "")
    assert data["path"] == str(home)
    check = subprocess.run(
        ["sha256sum", "--check", "--strict"],
        input=data["manifest"].encode(),
        cwd=home,
        capture_output=True,
        check=False,
    )
    assert check.returncode == 0, check


def test_Checksum_OrdersFilesByName(alice, home):
    for name in ("c", "a", "b/z", "b/y"):
        put(home / name, b"")
    names = [line.split("  ", 1)[1] for line in run(alice, path=home)["manifest"].splitlines()]
    assert names == ["a", "b/y", "b/z", "c"]


def test_Checksum_OfAnEmptyDirectory_IsEmpty(alice, home):
    data = run(alice, path=home)
    assert data["manifest"] == ""
    assert data["files"] == {"done": 0, "total": 0}


def test_Checksum_FollowsNoLinksAndOpensNoPipes(alice, home):
    put(home / "file", b"x")
    (home / "link").symlink_to(home / "file")
    (home / "up").symlink_to(home.parent)
    os.mkfifo(home / "pipe")
    data = run(alice, path=home)
    assert data["manifest"] == f"{hashlib.sha256(b'x').hexdigest()}  file\n"


def test_Checksum_OfALinkToADirectory_IsTheDirectorys(alice, home):
    put(home / "real" / "file", b"x")
    (home / "link").symlink_to("real")
    data = run(alice, path=home / "link")
    assert data["path"] == str(home / "real")
    assert data["files"]["done"] == 1


def test_Checksum_OfAForeignCharacterSet_ReplacesBytes(alice, home):
    path = os.path.join(os.fsencode(home), b"na\xefve")
    with open(path, "wb") as file:
        file.write(b"x")
    give_to_alice(path)
    data = run(alice, path=home)
    assert data["manifest"].endswith("  na�ve\n")


@needs_root
def test_Checksum_OfUnreadableFiles_TellsEach(alice, home):
    put(home / "locked", b"x", 0o000)
    put(home / "locked-dir" / "inner", b"x")
    os.chown(home / "locked-dir", 0, 0)
    (home / "locked-dir").chmod(0o700)
    put(home / "open", b"x")
    data = run(alice, path=home)
    assert data["errors"] == [
        {"path": "locked", "reason": "Permission denied"},
        {"path": "locked-dir", "reason": "Permission denied"},
    ]
    assert data["error_count"] == 2
    assert data["files"] == {"done": 1, "total": 1}


def test_Checksum_OfManyFiles_BoundsTheManifest(alice, home):
    directory = home / ("d" * 200)
    directory.mkdir()
    for number in range(3000):
        (directory / ("f" * 200 + str(number))).touch()
    data = run(alice, path=home)
    assert data["files"]["done"] == 3000
    assert data["manifest_complete"] is False
    assert 1_000_000 < len(data["manifest"]) <= 1 << 20
    assert data["manifest"].endswith("\n")


@pytest.mark.parametrize(
    "parameters",
    [{}, {"path": ""}, {"path": "home"}, {"path": "7"}, {"path": "/", "one_file_system": "x"}],
)
def test_Checksum_OfMalformedParameters_IsBadInput(alice, parameters):
    assert alice.call(API, "start", **parameters).code == 101


def refusal(answer):
    error = answer.json["error"]
    return error["code"], error["errors"]["reason"]


def test_Checksum_OfNoDirectory_TellsWhy(alice, home):
    put(home / "file", b"x")
    assert refusal(alice.call(API, "start", path=home / "none")) == (
        400, "No such file or directory")
    assert refusal(alice.call(API, "start", path=home / "file")) == (400, "Not a directory")


@needs_root
def test_Checksum_OfAnotherUsersDirectory_IsDenied(alice, root):
    for path in (root / "home" / "bob", "/root"):
        assert refusal(alice.call(API, "start", path=path)) == (400, "Permission denied")


def test_Checksum_WhileItReads_TellsHowFarItIs(alice, home):
    put_large(home)
    full_id = alice.call(API, "start", path=home).data["task_id"]
    alice.started.append((alice, full_id))
    state = ""
    for _ in range(30):
        status = alice.call(TASK, "wait", task_id=full_id, state=state, timeout=5).data
        state = status["state"]
        if status["data"].get("seconds_left") is not None:
            break
    data = status["data"]
    assert data["state"] == "reading"
    assert data["current"] == "large"
    assert data["files"] == {"done": 0, "total": 1}
    assert 0 < data["bytes"]["done"] < data["bytes"]["total"] == 20 << 30
    assert data["seconds_left"] > 0
    assert alice.call(TASK, "stop", task_id=full_id).code == 0
    assert alice.status(full_id).data["finish"] is True


def test_Checksum_IsRenewedAtMostFiveTimesASecond(alice, home):
    put_large(home)
    full_id = alice.call(API, "start", path=home).data["task_id"]
    alice.started.append((alice, full_id))
    states = {}
    begin = time.monotonic()
    while time.monotonic() - begin < 1.5:
        data = alice.status(full_id).data["data"]
        states[data["bytes"]["done"]] = data
    assert 3 <= len(states) <= 9


def test_Checksum_FiveAtOnce_IsRefused(alice, home):
    put_large(home)
    ids = []
    for _ in range(4):
        ids.append(alice.call(API, "start", path=home).data["task_id"])
        alice.started.append((alice, ids[-1]))
    assert alice.call(API, "start", path=home).code == 401
    assert alice.call(TASK, "stop", task_id=ids[0]).code == 0
    again = alice.call(API, "start", path=home)
    assert again.code == 0
    alice.started.append((alice, again.data["task_id"]))


def test_Checksum_ManyAtTheSameMoment_StartsFour(alice, home):
    put_large(home)
    with ThreadPoolExecutor(12) as pool:
        answers = list(pool.map(lambda _: alice.call(API, "start", path=home), range(12)))
    for answer in answers:
        if answer.code == 0:
            alice.started.append((alice, answer.data["task_id"]))
    assert sorted(answer.code for answer in answers) == [0] * 4 + [401] * 8


def test_Checksum_OfAUserWithoutTasks_LogsNoErrorOfTasks(alice, home, tmp_path):
    assert alice.call(TASK, "list", prefix="checksum_").data["user"] == []
    log = tmp_path / "log"
    environment = {
        "LD_PRELOAD": str(BUILD / "tests" / "integration" / "log_file.so"),
        "ASAN_OPTIONS": "verify_asan_link_order=0",
        "LOG_FILE": str(log),
    }

    def entry(**parameters):
        query = urlencode({"version": 1, "_sid": alice.sid, **parameters})
        return answer_of(run_entry(query, **environment))

    answer = entry(api=API, method="start", path=str(home))
    assert answer["success"], answer
    full_id = answer["data"]["task_id"]
    alice.started.append((alice, full_id))
    alice.wait_for_end(full_id)
    assert not log.exists() or "APIPolling.cpp:" not in log.read_text()
    assert not entry(api=TASK, method="status", task_id="alice")["success"]
    assert "APIPolling.cpp:" in log.read_text(), "what is logged is seen"
