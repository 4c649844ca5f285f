"""Where the API daemon listens."""

import signal
import socket
import subprocess

from conftest import ROOT
from daemon import (  # noqa: F401  (fixtures among them)
    ENTRIES, PLACE, call, describe_there, entries, path, start)
from service import Service


def test_SocketThatWasLeft_IsReplaced(start, entries, path):
    daemon = start()
    daemon.process.kill()
    daemon.wait()
    assert path.exists()
    assert call(ENTRIES, "echo", a=1)["error"]["code"] == 117
    start()
    assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1


def test_PlaceThatAnotherHas_IsLeftToIt(start, entries, path):
    first = start()
    second = start()
    second.log_line(f"cannot listen at {path} [Address already in use]")
    second.stop()
    assert path.exists()
    assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1
    first.stop()
    path.write_text("a file")
    try:
        third = start()
        third.log_line(f"cannot listen at {path} [Address already in use]")
        third.stop()
        assert path.read_text() == "a file"
    finally:
        path.unlink()


def test_DirectoryThatOthersMayWrite_IsRefused(start, describe):
    place = ROOT / "run" / "open"
    place.mkdir(exist_ok=True)
    place.chmod(0o777)
    describe(ENTRIES, "entries.so", socket=str(place / "test.sock"), methods={"1": ["echo"]})
    daemon = start()
    daemon.log_line("cannot listen at")
    assert not (place / "test.sock").exists()


def test_DeadDaemon_Is117AndNotServedInProcess(start, entries, path):
    start().stop()
    assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1  # no socket: in process
    with socket.socket(socket.AF_UNIX) as left:
        left.bind(str(path))
    try:
        assert call(ENTRIES, "echo", a=1)["error"]["code"] == 117
    finally:
        path.unlink()


def test_SocketsOfTheServiceManager_AreServed(root, describe, tmp_path):
    path = PLACE / "handed.sock"
    PLACE.mkdir(parents=True, exist_ok=True)
    describe(ENTRIES, "entries.so", socket=str(path), methods={"1": ["echo"]})
    with socket.socket(socket.AF_UNIX) as listener:
        listener.bind(str(path))
        listener.listen()
        program = Service(tmp_path, "qeloapid").program
        process = subprocess.Popen(
            ["bash", "-c", 'exec 3<&"$1"; LISTEN_PID=$$ exec "$0"', program, str(listener.fileno())],
            pass_fds=[listener.fileno()],
            env={"LISTEN_FDS": "1", "PATH": "/bin:/usr/bin"}, stdin=subprocess.DEVNULL)
        try:
            assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1
            describe(ENTRIES, "entries.so", methods={"1": ["echo"]})
            process.send_signal(signal.SIGHUP)
            describe(ENTRIES, "entries.so", socket=str(path), methods={"1": ["echo"]})
            assert call(ENTRIES, "echo", a=1)["data"]["a"] == 1, "it is not the daemon's to close"
        finally:
            process.terminate()
            process.wait(timeout=10)
    assert path.exists(), "it is not the daemon's to remove"
    path.unlink()
