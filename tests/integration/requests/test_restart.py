"""The restart of the web server that a method asks for."""

import time

from client import Client
from conftest import ENTRY, ROOT, needs_root
from webserver import WebServer

API = "QELO.Test.Entries"
DELAY = 1  # seconds from the answer to the signal


def test_Restart_AfterTheAnswer_ReachesTheServerThatItsPidFileNames(describe, tmp_path):
    describe(API, "entries.so", methods={"1": [{"restart": {"grantable": True}}, "echo"]})
    server = WebServer(tmp_path, ENTRY, pid=ROOT / "run" / "web-server.pid").start()
    try:
        client = Client(server.port)
        answer = client.get(f"api={API}&version=1&method=restart")
        assert answer.code == 0, answer.body
        assert "graceful" not in server.log()
        deadline = time.monotonic() + 10
        while "graceful" not in server.log() and time.monotonic() < deadline:
            time.sleep(0.05)
        assert "graceful" in server.log()
        # One that comes too early for the new state is refused at most.
        while time.monotonic() < deadline:
            try:
                assert client.get(f"api={API}&version=1&method=echo").code == 0
                break
            except OSError:
                time.sleep(0.05)
        assert server.process.poll() is None
    finally:
        server.stop()


@needs_root
def test_Restart_ByAMethodThatKeepsItsRights_ReachesNobody(describe, tmp_path):
    """The account that the method has become may not signal the server."""
    describe(API, "entries.so", methods={"1": ["restart"]})
    server = WebServer(tmp_path, ENTRY, pid=ROOT / "run" / "web-server.pid").start()
    try:
        answer = Client(server.port).get(f"api={API}&version=1&method=restart")
        assert answer.code == 0, answer.body
        time.sleep(2 * DELAY)
        assert "graceful" not in server.log()
    finally:
        server.stop()
