"""What the server's figures tell of processes that stay."""

import os
import signal

import pytest

from conftest import session_of
from marks import wait_for
from metrics import figures, state
from scgi import staying, start_workers  # noqa: F401  (fixtures)

ENDS = {
    "idle": (["--worker-idle", 1], ["who"]),
    "calls": (["--worker-calls", 2], ["who", "who"]),
    "memory": ([], ["leave&what=memory"]),
    "remains": ([], ["leave&what=descriptor"]),
    "crash": ([], ["crash", "finish"]),
    "time_out": (["--time-limit", 1], ["slow&ms=60000"]),
}


@pytest.fixture
def ask(client, staying):
    sid = session_of(client, "alice")["sid"]
    return lambda server, method: server.call(f"{staying}{method}&_sid={sid}")


def of_workers(path):
    return state(path)["staying"]["worker"]


@pytest.mark.parametrize("reason", ENDS)
def test_Workers_AreCountedByTheirEnd(start_workers, tmp_path, ask, reason):
    options, methods = ENDS[reason]
    path = tmp_path / "metrics.sock"
    server = start_workers("--fronts", 1, "--metrics", path, *options)
    for method in methods:
        ask(server, method)
    ends = len(methods) if reason == "crash" else 1
    assert wait_for(lambda: of_workers(path)["ended"][reason] == ends, 5), state(path)
    told = of_workers(path)
    assert told["now"] == 0 and told["started"] == ends == sum(told["ended"].values())
    assert figures(path)[f'webapi_server_ended_total{{process="worker",reason="{reason}"}}'] == ends


def test_Calls_AreCountedByTheirRoad(start_workers, tmp_path, ask):
    path = tmp_path / "metrics.sock"
    server = start_workers("--fronts", 1, "--metrics", path)
    for method in ("who", "who", "who", "apart", "asRoot"):
        assert ask(server, method)["success"]
    assert wait_for(lambda: state(path)["requests"]["served"] == 5, 5)
    assert state(path)["calls"] == {"worker": 3, "forked": 2}
    assert of_workers(path)["now"] == 1
    assert figures(path)['webapi_server_calls_total{road="worker"}'] == 3


def test_Fronts_AreCountedByTheirEnd(start_workers, tmp_path):
    path = tmp_path / "metrics.sock"
    server = start_workers("--fronts", 2, "--metrics", path)
    fronts = server.children()
    assert state(path)["staying"]["front"]["now"] == len(fronts) == 2
    os.kill(fronts[0], signal.SIGKILL)
    assert wait_for(lambda: state(path)["staying"]["front"]["started"] == 3, 5)
    told = state(path)["staying"]["front"]
    assert (told["now"], told["ended"]["crash"]) == (2, 1)
