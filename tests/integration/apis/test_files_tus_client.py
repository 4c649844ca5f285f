"""QELO.Files.Item: the stock client of resumable uploads, tus-js-client in node. It is no package of
the host's, so who wants these tests installs it somewhere (npm install tus-js-client) and names that
place's node_modules in WEBAPI_TUS_CLIENT."""

import json
import os
import shutil
import signal
import subprocess
import time
from pathlib import Path
from urllib.parse import urlencode

import pytest

from files import API, home  # noqa: F401  (fixture)
from test_files_tus import alice, streaming, unfinished  # noqa: F401  (fixtures)
from webserver import SOURCE

CLIENT = SOURCE / "tests" / "integration" / "support" / "tus_client.mjs"
MODULES = os.environ.get("WEBAPI_TUS_CLIENT", "")

pytestmark = pytest.mark.skipif(
    not (Path(MODULES) / "tus-js-client").exists() or shutil.which("node") is None,
    reason="WEBAPI_TUS_CLIENT names no node_modules with tus-js-client, or there is no node")


def start(user, file, name, break_at=0):
    endpoint = f"http://127.0.0.1:{user.client.port}/webapi/entry.cgi?" + urlencode(
        {"api": API, "version": 1, "method": "tus", "_sid": user.sid, "path": json.dumps("/own")})
    return subprocess.Popen(["node", CLIENT, MODULES, endpoint, file, name, str(break_at)],
                            stdout=subprocess.PIPE, stderr=subprocess.STDOUT, text=True)


def end(process):
    output, _ = process.communicate(timeout=60)
    assert process.returncode == 0, output


@pytest.fixture
def content(tmp_path):
    file = tmp_path / "content"
    file.write_bytes(os.urandom(1 << 20) * 40)
    return file


@pytest.mark.parametrize("break_at", [0, 10 << 20])
def test_StockClient_UploadsWholeAndAfterABreak(alice, home, content, break_at):
    end(start(alice, content, "größe.bin", break_at))
    assert (home / "größe.bin").read_bytes() == content.read_bytes()
    assert unfinished(home) == []


def test_StockClient_GoesOnWhenTheProcessIsKilled(alice, home, content):
    process = start(alice, content, "file")
    deadline = time.monotonic() + 30
    killed = False
    while not killed and time.monotonic() < deadline and process.poll() is None:
        parts = unfinished(home)
        if parts and (home / parts[0]).exists() and (home / parts[0]).stat().st_size > 1 << 20:
            killed = kill_writer(home / parts[0])
    assert killed
    end(process)
    assert (home / "file").read_bytes() == content.read_bytes()


def kill_writer(file):
    for fd in Path("/proc").glob("[0-9]*/fd/*"):
        try:
            if os.readlink(fd) == str(file):
                os.kill(int(fd.parts[2]), signal.SIGKILL)
                return True
        except OSError:
            pass
    return False
