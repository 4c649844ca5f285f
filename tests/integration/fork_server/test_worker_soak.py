"""Many clients at once by workers, of which one is killed each second. Longer by
WEBAPI_SOAK_SECONDS (60), with more clients by WEBAPI_SOAK_CLIENTS."""

import asyncio
import os
import re
import signal
from collections import Counter
from pathlib import Path

from conftest import answer_of, session_of
from marks import wait_for
from metrics import state
from scgi import header, staying, start_workers, variables  # noqa: F401  (fixtures)

SECONDS = float(os.environ.get("WEBAPI_SOAK_SECONDS", "3"))
CLIENTS = int(os.environ.get("WEBAPI_SOAK_CLIENTS", "200"))
FRONTS = 3
SPREAD = 2048  # KiB that the load itself makes of difference
KILLED = {"success": False, "error": {"code": 117}}


def memory(process):
    """KiB of its own."""
    try:
        return int(re.search(r"RssAnon:\s+(\d+)", Path(f"/proc/{process}/status").read_text()).group(1))
    except (OSError, AttributeError):
        return 0


class Soak:
    """Asks for so many seconds. `wrong` lists what should not have been, `figures` what the server
    and its fronts had meanwhile.

    query: of a call, but for its number
    """

    def __init__(self, server, fronts, query, seconds, clients):
        self.server = server
        self.fronts = fronts
        self.query = query
        self.seconds = seconds
        self.clients = clients
        self.isOver = False
        self.number = 0
        self.counts = Counter()
        self.wrong = []
        self.figures = []

    def run(self):
        asyncio.run(self.everybody())
        return self

    async def everybody(self):
        tasks = [asyncio.create_task(self.client()) for _ in range(self.clients)]
        tasks.append(asyncio.create_task(self.killer()))
        for _ in range(4):
            await asyncio.sleep(self.seconds / 4)
            self.figures.append(self.measure())
        self.isOver = True
        await asyncio.gather(*tasks)

    async def client(self):
        while not self.isOver:
            self.number += 1
            number = self.number
            try:
                reader, writer = await asyncio.open_unix_connection(str(self.server.path))
                writer.write(header(variables(f"{self.query}&n={number}")))
                answer = answer_of(await asyncio.wait_for(reader.read(-1), 60))
                writer.close()
            except (AssertionError, OSError, ValueError) as error:
                answer = repr(error)
            if answer == KILLED:
                self.counts["lost"] += 1
            elif isinstance(answer, dict) and answer["success"] and answer["data"]["n"] == number:
                self.counts["right"] += 1
            else:
                self.wrong.append((number, str(answer)[:200]))
                self.isOver = len(self.wrong) > 10 or self.isOver

    def workers(self):
        """They alone have a timer for their calls."""
        return [child for child in self.server.children() if self.has_timer(child)]

    @staticmethod
    def has_timer(process):
        try:
            return Path(f"/proc/{process}/timers").read_text().startswith("ID:")
        except OSError:
            return False

    async def killer(self):
        while not self.isOver:
            await asyncio.sleep(min(1, self.seconds / 4))
            for worker in self.workers()[:1]:
                os.kill(worker, signal.SIGKILL)
                self.counts["killed"] += 1

    def measure(self):
        process = self.server.process.pid
        return {"right": self.counts["right"], "memory": memory(process),
                "fronts": max(memory(front) for front in self.fronts),
                "descriptors": len(os.listdir(f"/proc/{process}/fd")),
                "processes": len(self.server.children())}


def test_SoakByWorkers_LosesTheKilledCallsAlone(start_workers, staying, client, tmp_path):
    path = tmp_path / "metrics.sock"
    server = start_workers("--fronts", FRONTS, "--requests", 8, "--queue", CLIENTS, "--arriving", CLIENTS + 8,
                           "--metrics", path)
    fronts = server.children()
    sid = session_of(client, "alice")["sid"]
    query = f"{staying}echo&_sid={sid}"
    assert server.call(f"{query}&n=0")["data"]["n"] == 0
    idle = len(os.listdir(f"/proc/{server.process.pid}/fd"))
    soak = Soak(server, fronts, query, SECONDS, CLIENTS).run()
    print(f"{dict(soak.counts)} {soak.figures} {state(path)}")
    assert soak.wrong == []
    assert soak.counts["right"] > 100 * SECONDS and soak.counts["killed"] >= min(SECONDS, 3) - 1
    assert soak.counts["lost"] <= soak.counts["killed"]
    told = state(path)
    assert told["calls"]["worker"] > 50  # the rest found no front free in time
    assert told["staying"]["worker"]["ended"]["crash"] == soak.counts["killed"]
    assert told["staying"]["front"]["ended"]["crash"] == 0
    first, *_, last = soak.figures
    assert last["memory"] <= first["memory"] + SPREAD and last["fronts"] <= first["fronts"] + SPREAD
    most = FRONTS + 16 + 8  # an account's quarter of the workers, requests at once
    assert max(figure["processes"] for figure in soak.figures) <= most
    assert wait_for(lambda: len(os.listdir(f"/proc/{server.process.pid}/fd")) <= idle + 2, 5)
    assert wait_for(lambda: len(server.children()) <= FRONTS + 16, 5)
