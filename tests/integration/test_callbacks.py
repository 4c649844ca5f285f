"""Work that a method leaves for after the answer."""

import os
import time
from urllib.parse import quote

import pytest

API = "QELO.Test.Call"


def wait_for(condition, seconds):
    deadline = time.monotonic() + seconds
    while time.monotonic() < deadline:
        if condition():
            return True
        time.sleep(0.05)
    return False


@pytest.fixture
def mark(tmp_path_factory):
    """A file that the account "system" can write, too."""
    directory = tmp_path_factory.mktemp("mark")
    for folder in (directory, *directory.parents[:2]):
        if os.stat(folder).st_uid == os.geteuid() and str(folder) != "/tmp":
            folder.chmod(0o711)
    file = directory / "mark"
    file.touch()
    file.chmod(0o666)
    return file


def test_Answer_IsCompleteWhileCallbacksSleep(client, describe, mark):
    describe(API, "late.so")
    started = time.monotonic()
    answer = client.get(f"api={API}&version=1&method=run&mark={quote(str(mark))}")
    took = time.monotonic() - started
    assert answer.body == b'{"data":%d,"success":true}' % answer.data
    assert took < 0.9
    assert mark.read_text() == ""

    assert wait_for(lambda: len(mark.read_text().splitlines()) == 2, 10)
    # A second passes before the callbacks, and each takes one.
    assert time.monotonic() - started >= 3
    lines = [line.split() for line in mark.read_text().splitlines()]
    assert [name for name, _ in lines] == ["first", "second"]
    assert len({process for _, process in lines}) == 1
    assert int(lines[0][1]) != answer.data
