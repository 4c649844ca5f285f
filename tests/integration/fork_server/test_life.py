"""How the fork server starts, reloads and stops, and what becomes of libraries that change."""

import os
import shutil
import signal
import socket
import stat
import subprocess
import time

import pytest

from conftest import BUILD, PLUGINS, answer_of
from marks import wait_for
from scgi import ForkServer, header, rest, start, variables  # noqa: F401  (a fixture)

ECHO = "api=QELO.Test.Entries&version=1&method=echo&a=1"
SLOW = "api=QELO.Test.Entries&version=1&method=slow&ms=1000"
RUN = "api=QELO.Test.Call&version=1&method=run"


@pytest.fixture(autouse=True)
def entries(describe):
    describe("QELO.Test.Entries", "entries.so", methods={"1": ["echo", "slow"]})


@pytest.fixture
def library(describe, tmp_path):
    """A library of its own for one test, long settled."""
    path = tmp_path / "changing.so"

    def put(name, overwrite=False):
        if overwrite:
            with open(PLUGINS / name, "rb") as source, open(path, "r+b") as target:
                target.truncate()
                shutil.copyfileobj(source, target)
        else:
            shutil.copy(PLUGINS / name, f"{path}.new")
            os.replace(f"{path}.new", path)
        return path

    describe("QELO.Test.Call", lib=str(put("state.so")), methods={"1": ["run"]})
    return put


def mapped(process, name):
    return name in open(f"/proc/{process}/maps", encoding="ascii", errors="replace").read()


def test_Libraries_AreLoadedAheadAsCopies(start, library):
    time.sleep(2.1)  # one that was written just now is left alone
    server = start()
    assert mapped(server.process.pid, "memfd:api library")
    assert not mapped(server.process.pid, "changing.so") and not mapped(server.process.pid, "entries.so")
    assert server.call(RUN)["data"]["code"] == 117


@pytest.mark.parametrize("overwrite", [False, True], ids=["replaced", "overwritten"])
@pytest.mark.parametrize("settled", [True, False], ids=["settled", "fresh"])
def test_LibraryThatChanges_IsUsedAtOnceAndNeverBreaksTheServer(start, library, overwrite, settled):
    if settled:
        time.sleep(2.1)
    server = start()
    for _ in range(3):
        assert server.call(RUN)["data"]["code"] == 117
    library("null_check_table.so", overwrite)
    for _ in range(4):  # by then it has been loaded anew
        assert server.call(RUN)["data"] == "ran"
        time.sleep(0.7)
    library("state.so", overwrite)
    assert server.call(RUN)["data"]["code"] == 117
    assert server.call(ECHO)["data"]["a"] == 1
    assert server.process.poll() is None


def test_LibraryThatIsNone_IsRefusedByItsCallsAlone(start, library, tmp_path):
    (tmp_path / "changing.so").write_bytes(b"\x7fELF but no library" * 100)
    time.sleep(2.1)
    server = start()
    server.log_line("not loaded ahead")
    assert server.call(RUN)["error"]["code"] == 111
    assert server.call(ECHO)["data"]["a"] == 1


def test_LibraryThatEndsWhoeverLoadsIt_EndsNotTheServer(start, describe):
    describe("QELO.Test.Call", "throwing_constructor.so")
    server = start()
    assert server.request(RUN) == b""
    assert server.call(ECHO)["data"]["a"] == 1


def test_Reload_DropsNoRequest(start, describe):
    server = start()
    with server.connect() as running:
        running.sendall(header(variables(SLOW)))
        assert wait_for(server.children, 5)
        for _ in range(3):
            server.signal(signal.SIGHUP)
            server.expect_state("RELOADING=1")
            server.expect_state("READY=1")
            assert server.call(ECHO)["data"]["a"] == 1
        assert answer_of(rest(running))["success"]


def test_Descriptions_CountAtOnce(start, describe):
    server = start()
    assert server.call("api=QELO.Test.New&version=1&method=run")["error"]["code"] == 102
    describe("QELO.Test.New", "state.so")
    assert server.call("api=QELO.Test.New&version=1&method=run")["error"]["code"] == 121


def test_Termination_FinishesWhatHasComeAndStops(start):
    server = start("--requests", 1)
    with server.connect() as running, server.connect() as queued, server.connect() as arriving:
        running.sendall(header(variables(SLOW)))
        assert wait_for(server.children, 5)
        queued.sendall(header(variables(ECHO)))
        text = header(variables(ECHO))
        arriving.sendall(text[:20])
        time.sleep(0.2)
        server.signal(signal.SIGTERM)
        server.expect_state("STOPPING=1")
        assert wait_for(lambda: not server.path.exists(), 5)
        arriving.sendall(text[20:])
        for connection in (running, queued, arriving):
            assert answer_of(rest(connection))["success"]
    assert server.wait() == 0


def test_ServerThatIsKilled_FinishesItsRequestsAndCanBeStartedAgain(start):
    server = start()
    with server.connect() as running:
        running.sendall(header(variables(SLOW)))
        assert wait_for(server.children, 5)
        server.process.kill()
        server.wait()
        start()
        assert server.raw(header(variables(ECHO))).endswith(b'"success":true}')
        assert answer_of(rest(running))["success"]


def test_Socket_IsItsOwnersAlone(start):
    server = start()
    info = os.stat(server.path)
    assert stat.S_IMODE(info.st_mode) == 0o600 and info.st_uid == os.geteuid()


@pytest.mark.parametrize("options", [
    [], ["--socket"], ["--socket", "relative"], ["--port", "0"], ["--client", "no-such-account"],
    ["--requests", "0"]], ids=range(6))
def test_WrongOptions_AreRefused(root, options):
    done = subprocess.run([BUILD / "programs" / "webapi-server", *options], capture_output=True,
                          text=True, timeout=10, check=False)
    assert done.returncode in (1, 2) and "usage: webapi-server" in done.stderr


def test_Help_IsAnAnswer(root):
    done = subprocess.run([BUILD / "programs" / "webapi-server", "--help"], capture_output=True,
                          text=True, timeout=10, check=False)
    assert (done.returncode, done.stderr) == (0, "") and done.stdout.startswith("usage: webapi-server")


def test_SocketsOfTheServiceManager_AreServedAndLeft(start, tmp_path):
    path = tmp_path / "handed.sock"
    server = ForkServer(tmp_path)
    server.path = path
    with socket.socket(socket.AF_UNIX) as listener:
        listener.bind(str(path))
        listener.listen()
        process = subprocess.Popen(
            ["bash", "-c", 'exec 3<&"$1"; LISTEN_PID=$$ exec "$0"', server.program,
             str(listener.fileno())],
            pass_fds=[listener.fileno()], env={"LISTEN_FDS": "1", "PATH": "/bin:/usr/bin"},
            stdin=subprocess.DEVNULL)
        try:
            assert server.call(ECHO)["data"]["a"] == 1
        finally:
            process.terminate()
            assert process.wait(timeout=10) == 0
    assert path.exists()
