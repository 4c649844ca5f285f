"""Work that a method leaves for after the answer."""

import time
from urllib.parse import quote

from marks import mark, wait_for  # noqa: F401  (mark is a fixture)

API = "QELO.Test.Call"


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
