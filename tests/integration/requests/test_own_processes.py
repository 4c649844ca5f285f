"""Processes that a method makes by itself, and whether its client waits for them."""

import time

import pytest

API = "QELO.Test.Forking"
SECONDS = 3


@pytest.mark.parametrize("method, attributes, waits", [
    ("keeping", {}, True),
    ("lettingGo", {}, False),
    ("program", {}, False),
    ("program", {"allowDownload": True}, True),
])
def test_Client_WaitsForWhoHoldsItsEnd(client, describe, method, attributes, waits):
    describe(API, "forking.so", methods={"1": [{method: attributes}]})
    began = time.monotonic()
    assert client.call(API, method, seconds=SECONDS).code == 0
    assert (time.monotonic() - began >= SECONDS - 0.5) == waits
