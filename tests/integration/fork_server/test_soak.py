"""Good requests among slow senders, hang-ups, headers that are too long and processes that are killed,
the server among them. Longer by WEBAPI_SOAK_CALLS (100000), with more clients by WEBAPI_SOAK_CLIENTS."""

import asyncio
import os
import re
import signal
from pathlib import Path

from marks import wait_for
from scgi import header, start, status, variables  # noqa: F401  (a fixture)

QUERY = "api=QELO.Test.Entries&version=1&method="
NOT_THERE = (ConnectionError, FileNotFoundError)
CALLS = int(os.environ.get("WEBAPI_SOAK_CALLS", "1500"))
CLIENTS = int(os.environ.get("WEBAPI_SOAK_CLIENTS", "200"))
OF_THE_LOAD = CLIENTS + 8  # descriptors that clients hold at most
SPREAD = 1024  # KiB that the load itself makes of difference


def call_of(process):
    """What it serves, as far as the soak is concerned; None when it has ended."""
    try:
        command = Path(f"/proc/{process}/cmdline").read_bytes()
    except OSError:
        return None
    return "slow" if b"slow" in command else "other" if command else None


class Soak:
    """Asks until so many good requests have their answer. `wrong` lists what should not have been,
    `figures` the server's own at several times.

    start: starts the server, which is killed and started again once
    """

    def __init__(self, start, clients, calls):
        self.start_server = start
        self.server = start()
        self.clients = clients
        self.calls = calls
        self.answered = 0
        self.number = 0
        self.ends = 0  # of the server
        self.killed = 0  # processes of requests
        self.again = 0  # requests that were made again, as the server had ended
        self.misbehaved = 0
        self.idle = self.measure()
        self.wrong = []
        self.figures = []

    def run(self):
        asyncio.run(self.everybody())
        return self

    async def everybody(self):
        kinds = [self.slow_sender, self.hanging_up, self.too_long, self.nonsense]
        few = max(self.clients // 20, 1)
        tasks = [kind() for kind in kinds for _ in range(few)]
        tasks += [self.victim(), self.victim(), self.killer(), self.restarter(), self.watcher()]
        tasks += [self.good() for _ in range(self.clients - len(kinds) * few - 2)]
        await asyncio.gather(*tasks)

    @property
    def isOver(self):
        return self.answered >= self.calls or len(self.wrong) > 10

    async def ask(self, *pieces, pause=0.0):
        reader, writer = await asyncio.open_unix_connection(str(self.server.path))
        try:
            for piece in pieces:
                writer.write(piece)
                await writer.drain()
                await asyncio.sleep(pause)
            return await asyncio.wait_for(reader.read(-1), 60)
        finally:
            writer.close()

    async def make(self, pause=0.0):
        """A good request. It is made again when the server ended while it was under way."""
        self.number += 1
        number = self.number
        text = header(variables(f"{QUERY}echo&n={number}"))
        third = len(text) // 3
        pieces = [text[:third], text[third:2 * third], text[2 * third:]] if pause else [text]
        while True:
            ends = self.ends
            try:
                answer = await self.ask(*pieces, pause=pause)
            except NOT_THERE as error:
                answer = repr(error).encode()
            if b'"data":{' in answer and b'"n":%d' % number in answer:
                self.answered += 1
                return
            if ends == self.ends and self.server.process.poll() is None:
                self.wrong.append((number, answer[:200]))
                return
            self.again += 1
            await asyncio.sleep(0.05)

    async def good(self):
        while not self.isOver:
            await self.make()

    async def slow_sender(self):
        while not self.isOver:
            await self.make(pause=0.2)

    async def misbehave(self, text, expected, wait=True):
        ends = self.ends
        try:
            if wait:
                answer = await self.ask(text)
                if not expected(answer) and ends == self.ends and self.server.process.poll() is None:
                    self.wrong.append((text[:30], answer[:200]))
            else:
                _, writer = await asyncio.open_unix_connection(str(self.server.path))
                writer.write(text)
                await writer.drain()
                writer.close()
            self.misbehaved += 1
        except NOT_THERE:
            pass
        await asyncio.sleep(0.05)

    async def hanging_up(self):
        while not self.isOver:
            text = header(variables(QUERY + "slow&ms=20"))
            await self.misbehave(text, None, wait=False)
            await self.misbehave(text[:40], None, wait=False)

    async def too_long(self):
        while not self.isOver:
            await self.misbehave(b"600000:CONTENT_LENGTH\0", lambda answer: status(answer) == 431)

    async def nonsense(self):
        while not self.isOver:
            await self.misbehave(b"\0" * 100, lambda answer: status(answer) == 400)

    async def victim(self):
        """A request whose process is killed."""
        while not self.isOver:
            await self.misbehave(header(variables(QUERY + "slow&ms=600000")), lambda answer: answer == b"")

    def victims(self):
        """Processes of such requests, and of those that were hung up on at most."""
        return [child for child in self.server.children() if call_of(child) == "slow"]

    async def killer(self):
        while not self.isOver or self.victims():
            await asyncio.sleep(0.5)
            for child in self.victims():
                os.kill(child, signal.SIGKILL)
                self.killed += 1

    async def restarter(self):
        """Kills the server in the middle, and starts it again."""
        while self.answered < self.calls // 2 and not self.isOver:
            await asyncio.sleep(0.02)
        self.server.signal(signal.SIGSTOP)  # nothing is started between the look and the end
        os.waitpid(self.server.process.pid, os.WUNTRACED)
        left = self.server.children()
        self.server.process.kill()
        self.server.wait()
        self.server = self.start_server()
        self.ends += 1
        while left:  # what was under way is finished; but for the victims
            for child in left:
                if call_of(child) == "slow":
                    os.kill(child, signal.SIGKILL)
            await asyncio.sleep(0.1)
            left = [child for child in left if call_of(child) is not None]

    async def watcher(self):
        for part in (0.65, 0.8, 1.0):
            while self.answered < self.calls * part and not self.isOver:
                await asyncio.sleep(0.02)
            self.figures.append(self.measure())

    def measure(self):
        """What the server has: KiB of memory of its own, descriptors, processes."""
        process = self.server.process.pid
        memory = re.search(r"RssAnon:\s+(\d+)", Path(f"/proc/{process}/status").read_text())
        return {"answered": self.answered, "memory": int(memory.group(1)),
                "descriptors": len(os.listdir(f"/proc/{process}/fd")),
                "processes": len(self.server.children())}


def test_Soak_LosesNoAnswerAndLeavesNothing(start, describe):
    describe("QELO.Test.Entries", "entries.so", methods={"1": ["echo", "slow"]})
    soak = Soak(lambda: start("--requests", 8), CLIENTS, CALLS).run()
    print(f"{soak.answered} answers, {soak.again} asked again, {soak.misbehaved} misbehaved, "
          f"{soak.killed} killed; {soak.figures}")
    assert soak.wrong == []
    assert soak.answered >= CALLS and soak.ends == 1
    assert soak.killed > 0 and soak.misbehaved > 50
    assert wait_for(lambda: soak.server.children() == [], 10)
    before, *_, last = soak.figures
    assert last["memory"] <= before["memory"] + SPREAD
    assert last["descriptors"] <= before["descriptors"] + OF_THE_LOAD
    # One library more may have been loaded ahead.
    most = soak.idle["descriptors"] + 2
    assert wait_for(lambda: soak.measure()["descriptors"] <= most, 5), (soak.idle, soak.measure())
