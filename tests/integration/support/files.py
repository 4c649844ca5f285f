"""Shared folders of the private root, and calls of the API of files."""

import json
import os
import shutil

import pytest

from accounts import account
from conftest import ROOT, session_of

API = "QELO.Files.Item"
# What nothing may be called.
BAD_NAMES = ["", ".", "..", "a/b", "../x", "/x", "a\x00b", "a\nb", "a\rb", "\x07", "\x1b[2J", "a\x7f",
             "x" * 256, "ü" * 128, ".qelo-part-x"]


class Visitor:
    """A logged-in user of the shared folders."""

    def __init__(self, client, name):
        self.client = client
        self.name = name
        self.sid = session_of(client, name)["sid"]

    def call(self, method, **parameters):
        """Parameters that are no text are sent as JSON, and so are texts, which keeps them texts."""
        sent = {key: json.dumps(value) for key, value in parameters.items()}
        return self.client.call(API, method, _sid=self.sid, **sent)

    def names(self, path, **parameters):
        return [item["name"] for item in self.call("list", path=path, **parameters).data["items"]]

    def refused(self, method, **parameters):
        """The error's reason and the item that it names."""
        answer = self.call(method, **parameters)
        assert answer.code >= 400, answer.body
        errors = answer.json["error"]["errors"]
        return errors["reason"], errors["path"]


@pytest.fixture
def alice(client, home):  # noqa: F811
    return Visitor(client, "alice")


@pytest.fixture
def bob(client):
    return Visitor(client, "bob")


@pytest.fixture
def home(root):
    """alice's home, empty but for what the system keeps there."""
    yield from emptied(root / "home" / "alice")


@pytest.fixture
def common(root):
    """The folder that alice and bob share."""
    yield from emptied(root / "srv" / "common")


@pytest.fixture
def outside(tmp_path):
    """Somewhere that all may write and no call may reach."""
    (tmp_path / "secret").write_text("secret")
    (tmp_path / "secret").chmod(0o666)
    tmp_path.chmod(0o777)
    before = sorted(path.name for path in tmp_path.iterdir())
    yield tmp_path
    assert sorted(path.name for path in tmp_path.iterdir()) == before
    assert (tmp_path / "secret").read_text() == "secret"


def emptied(folder):
    clear(folder)
    yield folder
    clear(folder)


def clear(folder):
    for path in folder.iterdir():
        if path.name == ".webapi":
            continue
        if path.is_dir() and not path.is_symlink():
            shutil.rmtree(path)
        else:
            path.unlink()


def give(path, name="alice"):
    os.chown(path, *account(name), follow_symlinks=False)
    return path


def put(path, content=b"", name="alice"):
    """A file of a user's, with the folders above it that are missing."""
    for folder in reversed(path.parents):
        if not folder.exists() and ROOT in folder.parents:
            give_folder(folder, name)
    path.write_bytes(content)
    return give(path, name)


def give_folder(path, name="alice"):
    path.mkdir()
    return give(path, name)
