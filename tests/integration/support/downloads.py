"""Downloads by curl, as people have them."""

import os
import shutil
import subprocess
import tempfile
from pathlib import Path
from urllib.parse import urlencode

import pytest

from client import PATH

API = "QELO.Test.Sending"
METHODS = ("file", "descriptor", "stream", "endless")


class Got:
    """What curl got: the last header, and the bytes."""

    def __init__(self, head, body, exit_code):
        lines = head.decode("latin-1").split("\r\n\r\n")[-2].split("\r\n") if head else [""]
        self.status = int(lines[0].split()[1]) if head else 0
        self.lines = [line.split(": ", 1) for line in lines[1:] if line]
        self.body = body
        self.exit_code = exit_code

    def __getitem__(self, name):
        """The value of a header of which there is one at most."""
        values = [value for key, value in self.lines if key.lower() == name.lower()]
        assert len(values) <= 1, self.lines
        return values[0] if values else None


class Downloads:
    def __init__(self, port, directory):
        self.port = port
        self.directory = directory

    def url(self, method, **parameters):
        query = urlencode({"api": API, "version": 1, "method": method, **parameters})
        return f"http://127.0.0.1:{self.port}{PATH}?{query}"

    def put(self, name, content):
        """A file that everybody may read, written long ago."""
        file = self.directory / name
        file.write_bytes(content)
        os.utime(file, (10**9, 10**9))
        return file

    def curl(self, url, *options, output=None):
        head, body = self.directory / "head", output or self.directory / "body"
        head.write_bytes(b"")
        if output is None:
            body.write_bytes(b"")
        done = subprocess.run(["curl", "-s", "-g", "-m", "30", "-D", head, "-o", body, *options, url],
                              check=False)
        return Got(head.read_bytes(), body.read_bytes(), done.returncode)

    def file(self, path, *options, **parameters):
        return self.curl(self.url("file", path=path, **parameters), *options)


@pytest.fixture
def folder():
    """A directory that everybody may enter."""
    directory = Path(tempfile.mkdtemp(prefix="webapi-download-"))
    directory.chmod(0o755)
    yield directory
    shutil.rmtree(directory)


@pytest.fixture
def sending(describe):
    """The API that sends."""
    describe(API, "sending.so",
             methods={"1": [{method: {"allowDownload": True}} for method in METHODS]})


@pytest.fixture
def downloads(server, folder, sending):
    return Downloads(server.port, folder)
