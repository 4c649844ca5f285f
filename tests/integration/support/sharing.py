"""Sharing links of the private root: made by users, opened and used by visitors."""

import itertools
import os
import shutil
import sqlite3

import pytest

from accounts import account
from client import Client
from conftest import PLUGINS, ROOT, session_of

API = "QELO.Share.Link"
DATABASE = ROOT / "var" / "lib" / "webapi" / "sharing.db"
CHECKS = ROOT / "usr" / "lib" / "sharing" / "permission_lib"
PROJECT = "unit.test"
fresh_addresses = (f"127.0.7.{last}" for last in itertools.count(1))


class Owner:
    """A logged-in user who shares."""

    def __init__(self, client, name):
        self.client = client
        self.sid = session_of(client, name)["sid"]

    def call(self, method, **parameters):
        return self.client.call(API, method, _sid=self.sid, **parameters)

    def make(self, **terms):
        """A new link's data; of a project whose check library lets all pass, unless told otherwise."""
        return self.call("create", **{"project": PROJECT, **terms}).data


class Visitor:
    """Somebody without an account, at an address of his own."""

    def __init__(self, client, link, sid=None):
        self.client = client
        self.link = link
        self.sid = sid

    def open(self, password=None, **headers):
        """Opens the link; the visitor's session is the answer's from then on."""
        parameters = {"link": self.link} | ({} if password is None else {"password": password})
        answer = self.client.call(API, "open", headers=headers, **parameters)
        if answer.code == 0:
            self.sid = answer.data["sid"]
        return answer

    def call(self, method="plain", api="QELO.Test.Open", **parameters):
        session = {} if self.sid is None else {"_sharing_sid": self.sid}
        return self.client.call(api, method, _sharing_id=self.link, **session, **parameters)


@pytest.fixture
def alice(client):
    return Owner(client, "alice")


@pytest.fixture
def bob(client):
    return Owner(client, "bob")


@pytest.fixture
def stranger(server):
    """A client at an address that nobody else has."""
    return Client(server.port, next(fresh_addresses))


@pytest.fixture
def visit(stranger):
    """Opens a link for a visitor."""

    def opened(link, client=None):
        visitor = Visitor(client or stranger, link["link"])
        assert visitor.open().code == 0
        return visitor

    return opened


@pytest.fixture
def shared(describe):
    """Methods that take links: "plain" without asking the application, "asRoot" with, "asUser" with
    the rights of the user."""
    unchecked = {"allowSharing": True, "skipSharingAppCheck": True}
    describe("QELO.Test.Open", "identity.so", authLevel=1, methods={"1": [
        {"plain": unchecked}, {"asRoot": {"allowSharing": True, "grantByDefault": True}}]})
    describe("QELO.Test.Identity", "identity.so", authLevel=1, allowUser=["normal.local"], methods={
        "1": [{"asUser": {**unchecked, "grantByUser": True}}, "plain"]})
    CHECKS.mkdir(parents=True, exist_ok=True)
    shutil.copy(PLUGINS / "link_checks.so", CHECKS / f"{PROJECT}.so")
    yield
    (CHECKS / f"{PROJECT}.so").unlink()


@pytest.fixture
def folder(root):
    """A folder of alice's with a file, beside one that is not shared."""
    home = root / "home" / "alice"
    made = []
    for path, text in (("shared/a.txt", "shared"), ("shared/deep/b.txt", "deep"),
                       ("shared-not/c.txt", "secret"), ("d.txt", "secret")):
        file = home / path
        file.parent.mkdir(parents=True, exist_ok=True)
        file.write_text(text)
        made.append(home / path.split("/")[0])
    (home / "shared" / "out").symlink_to(home / "d.txt")
    for path in (path for name in made for path in [name, *name.rglob("*")]):
        os.chown(path, *account("alice"), follow_symlinks=False)
    yield "/own/shared"
    for path in set(made):
        if path.is_dir():
            shutil.rmtree(path)
        else:
            path.unlink()


def change_database(sql):
    """Does to the database what no call can."""
    with sqlite3.connect(DATABASE, timeout=5) as database:
        database.execute(sql)
    database.close()
