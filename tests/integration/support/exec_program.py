"""Running webapi-exec, and what its tests call."""

import json
import os
import pty
import subprocess

import pytest

from conftest import BUILD
from webserver import SOURCE

EXEC = BUILD / "programs" / "webapi-exec"
COMPLETION = SOURCE / "packaging" / "completion" / "webapi-exec.bash"
ENTRIES = "QELO.Test.Entries"
IDENTITY = "QELO.Test.Identity"
DOWNLOAD = "QELO.Test.Download"


@pytest.fixture
def described(describe):
    describe(ENTRIES, "entries.so", methods={"1": ["echo", "fail", "large"], "2": ["process"]})
    printing = [{name: {"allowDownload": True}} for name in ("print", "bytes", "bare", "broken")]
    describe(DOWNLOAD, "downloads.so", methods={"1": printing})
    describe("QELO.Test.Losing", "losing.so", methods={"1": ["killed"]})


def run(*arguments, text=None, **options):
    return subprocess.run(
        [EXEC, *map(str, arguments)],
        input=text,
        capture_output=True,
        text=True,
        timeout=60,
        check=False,
        **options,
    )


def call(api, method, *arguments, user="alice", **options):
    return run("--api", api, "--method", method, "--user", user, *arguments, **options)


def data_of(process):
    assert process.returncode == 0, process
    return json.loads(process.stdout)["data"]


def on_terminal(*arguments):
    """What the program prints to a terminal, and its exit status."""
    leader, terminal = pty.openpty()
    with subprocess.Popen(
        [EXEC, *map(str, arguments)], stdin=subprocess.DEVNULL, stdout=terminal, stderr=terminal
    ) as process:
        os.close(terminal)
        printed = b""
        while True:
            try:
                piece = os.read(leader, 65536)
            except OSError:
                break
            if not piece:
                break
            printed += piece
    os.close(leader)
    return printed.decode().replace("\r\n", "\n"), process.returncode
