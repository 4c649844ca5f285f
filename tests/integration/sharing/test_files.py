"""A folder shared by a link: exactly that folder, for anybody who has the link."""

import json

import pytest

from conftest import ROOT
from sharing import Visitor, alice, folder, stranger, visit  # noqa: F401

API = "QELO.Files.Item"


@pytest.fixture
def visitor(alice, visit, folder):
    return visit(alice.make(project="files", protect="owner", path=folder))


def names(visitor, path):
    data = visitor.call("list", API, path=path).data
    return [item["name"] for item in data["items"]]


def test_SharedFolder_IsListedAndDownloaded(visitor, folder):
    assert sorted(names(visitor, folder)) == ["a.txt", "deep", "out"]
    assert names(visitor, folder + "/deep") == ["b.txt"]
    assert visitor.call("stat", API, path=folder + "/a.txt").code == 0
    assert visitor.call("download", API, path=folder + "/a.txt").body == b"shared"
    paths = json.dumps([folder + "/a.txt", folder + "/deep"])
    assert visitor.call("download", API, path=paths).body.startswith(b"PK")


@pytest.mark.parametrize("path", [
    "/", "/own", "/own/d.txt", "/own/shared-not", "/own/shared-not/c.txt", "/own/shared/../d.txt",
    "/own/shared/./../d.txt", "/own/shared//../d.txt", "own/shared", "", "/own/share", "/OWN/shared",
    "/own/shared/..", '["/own/shared", "/own/d.txt"]', "[]", "[[]]", "5", "{}",
])
@pytest.mark.parametrize("method", ["list", "stat", "download"])
def test_EverythingElse_IsRefused(visitor, method, path):
    answer = visitor.call(method, API, path=path)
    assert answer.code == 127, answer.body


def test_LinkWithinTheFolder_LeadsNowhere(visitor, folder):
    assert b"secret" not in visitor.call("download", API, path=folder + "/out").body


@pytest.mark.parametrize("method", ["create_folder", "rename", "copy", "move", "remove"])
def test_Changes_AreRefused(visitor, folder, method):
    answer = visitor.call(method, API, path=folder + "/a.txt", name="x", to=folder)
    assert answer.code == 126
    assert (ROOT / "home/alice/shared/a.txt").read_text() == "shared"


def test_LinkOfAnotherProject_SharesNoFiles(alice, visit, folder):
    other = visit(alice.make(project="notes", protect="owner", path=folder))
    assert other.call("list", API, path=folder).code == 127


def test_LinkToOneFile_SharesThatFile(alice, visit, folder):
    visitor = visit(alice.make(project="files", protect="owner", path=folder + "/a.txt"))
    assert visitor.call("download", API, path=folder + "/a.txt").body == b"shared"
    assert visitor.call("list", API, path=folder).code == 127


def test_WithoutASession_NothingIsShared(visitor, folder):
    assert Visitor(visitor.client, visitor.link).call("list", API, path=folder).code == 122


def test_LinkWithoutProtection_IsMadeInTheOwnersName(alice, visit, folder):
    link = alice.make(project="files", path=folder)
    assert link["protect"] == "owner"
    assert "a.txt" in names(visit(link), folder)


@pytest.mark.parametrize("protect", ["none", "session"])
def test_OtherProtection_IsRefused(alice, folder, protect):
    answer = alice.call("create", project="files", protect=protect, path=folder)
    assert answer.code == 101
    assert [fault["path"] for fault in answer.json["error"]["errors"]] == ["/protect"]
    link = alice.make(project="files", path=folder)
    assert alice.call("change", id=link["id"], protect=protect).code == 101


@pytest.mark.parametrize("path,reason", [
    ("/own/shared/no.txt", "not_found"), ("/no/such", "no_share"), ("/own/shared/out", "link"),
    ("own/shared", "bad_path")])
def test_PathThatLeadsToNothing_IsRefused(alice, folder, path, reason):
    answer = alice.call("create", project="files", path=path)
    assert answer.code == 409, answer.body
    assert answer.json["error"]["errors"] == {"path": path, "reason": reason}
    link = alice.make(project="files", path=folder)
    assert alice.call("change", id=link["id"], path=path).code == 409
    assert alice.call("change", id=link["id"], path=folder + "/deep").data["path"] == folder + "/deep"


def test_LinkWithoutAPath_IsRefused(alice):
    answer = alice.call("create", project="files")
    assert answer.code == 101
    assert [fault["path"] for fault in answer.json["error"]["errors"]] == ["/path"]
