"""QELO.Files.Item: looking at shared folders, making folders and renaming."""

import json
import os
import re

import pytest

from conftest import SOURCE, needs_root
from files import API, alice, bob, common, give_folder, home, put  # noqa: F401  (fixtures)


def test_List_OfTheRoot_IsTheSharedFolders(alice, root):
    items = alice.call("list", path="/").data["items"]
    assert [(item["name"], item["path"], item["type"], item["read_only"]) for item in items] == [
        ("own", "/own", "share", False),
        ("common", "/common", "share", False),
        ("public", "/public", "share", True),
    ]
    assert alice.names("/", pattern="*o*", offset=1) == ["common"]


def test_List_TellsOfEachItem(alice, home):
    put(home / "file.txt", b"12345")
    os.utime(home / "file.txt", (0, 1_000_000))
    (home / "file.txt").chmod(0o640)
    give_folder(home / "folder")
    (home / "link").symlink_to("/etc/passwd")
    os.mkfifo(home / "pipe")
    data = alice.call("list", path="/own", pattern="[!.]*").data
    assert data["total"] == 0, "sets of characters are none of the pattern's"
    items = {item["name"]: item for item in alice.call("list", path="/own").data["items"]}
    file = items["file.txt"]
    assert (file["path"], file["type"], file["size"], file["mtime"], file["mode"]) == (
        "/own/file.txt", "file", 5, 1_000_000, "0640")
    assert items["folder"]["type"] == "folder"
    assert items["link"]["type"] == "link"
    assert items["pipe"]["type"] == "special"
    assert "passwd" not in json.dumps(items)


def test_List_IsPagedSortedAndFiltered(alice, common):
    for number in range(30):
        put(common / f"f{number:02}", b"x" * number)
    put(common / "d" / "inner")
    data = alice.call("list", path="/common", offset=10, limit=5, type="file").data
    assert [item["name"] for item in data["items"]] == ["f10", "f11", "f12", "f13", "f14"]
    assert (data["total"], data["offset"], data["path"]) == (30, 10, "/common")
    assert alice.names("/common", sort_by="size", sort_order="desc", limit=2) == ["f29", "f28"]
    assert alice.names("/common", pattern="F2?", limit=2) == ["f20", "f21"]
    assert alice.names("/common", type="folder") == ["d"]


@pytest.mark.parametrize(
    "parameters",
    [
        {},
        {"path": 5},
        {"path": None},
        {"path": "/own", "limit": 5001},
        {"path": "/own", "limit": -1},
        {"path": "/own", "offset": 99_999, "limit": 2},
        {"path": "/own", "sort_by": "color"},
        {"path": "/own", "sort_order": True},
        {"path": "/own", "type": "link"},
        {"path": "/own", "pattern": "x" * 256},
    ],
)
def test_List_OfMalformedParameters_IsBadInput(alice, parameters):
    assert alice.call("list", **parameters).code == 101


def test_List_OfAForeignCharacterSet_ShowsWhatCannotBeNamed(alice, home):
    with open(os.path.join(os.fsencode(home), b"na\xefve"), "wb"):
        pass
    items = [item for item in alice.call("list", path="/own").data["items"] if "na" in item["name"]]
    assert [(item["name"], item["path"]) for item in items] == [("na�ve", None)]


def test_Stat_OfSeveral_TellsOfEachOrWhichIsMissing(alice, home):
    put(home / "a", b"1")
    give_folder(home / "b")
    items = alice.call("stat", path=["/own/a", "/own/b", "/own"]).data["items"]
    assert [(item["name"], item["type"]) for item in items] == [
        ("a", "file"), ("b", "folder"), ("own", "folder")]
    assert alice.call("stat", path="/own/a").data["items"][0]["size"] == 1
    assert alice.refused("stat", path=["/own/a", "/own/none"]) == ("not_found", "/own/none")
    assert alice.refused("stat", path="/") == ("no_share", "/")
    assert alice.refused("stat", path="/none/a") == ("no_share", "/none/a")
    assert alice.refused("stat", path="/own/a/b") == ("not_a_folder", "/own/a/b")
    assert alice.call("stat", path=[]).code == 101
    assert alice.call("stat", path=["/own"] * 1001).code == 418


def test_CreateFolder_IsTheUsersOwn(alice, home):
    data = alice.call("create_folder", path="/own/größe").data
    assert (data["path"], data["type"]) == ("/own/größe", "folder")
    info = (home / "größe").stat()
    assert (info.st_uid, info.st_gid) == (home.stat().st_uid, home.stat().st_gid)
    assert alice.refused("create_folder", path="/own/größe") == ("exists", "/own/größe")
    assert alice.refused("create_folder", path="/own/x/y/z") == ("not_found", "/own/x/y/z")
    assert alice.call("create_folder", path="/own/x/y/z", parents=True).code == 0
    assert alice.call("create_folder", path="/own/x/y/w", parents=True).code == 0
    assert sorted(path.name for path in (home / "x" / "y").iterdir()) == ["w", "z"]


def test_CreateFolder_BelowAFileOrALink_IsRefused(alice, home, tmp_path):
    put(home / "file")
    (home / "link").symlink_to(tmp_path)
    tmp_path.chmod(0o777)
    assert alice.refused("create_folder", path="/own/file/x", parents=True)[0] == "not_a_folder"
    assert alice.refused("create_folder", path="/own/link/x") == ("link", "/own/link/x")
    assert alice.refused("create_folder", path="/own/link/x", parents=True)[0] == "link"
    assert list(tmp_path.iterdir()) == []


def test_Rename_ReplacesNothing(alice, home):
    put(home / "a", b"a")
    put(home / "b", b"b")
    assert alice.refused("rename", path="/own/a", name="b") == ("exists", "/own/b")
    assert (home / "b").read_bytes() == b"b"
    assert alice.call("rename", path="/own/a", name="c").data["path"] == "/own/c"
    assert (home / "c").read_bytes() == b"a"
    assert alice.refused("rename", path="/own/a", name="d") == ("not_found", "/own/a")


def test_Rename_OfALink_RenamesTheLink(alice, home):
    (home / "link").symlink_to("/etc/passwd")
    assert alice.call("rename", path="/own/link", name="other").data["type"] == "link"
    assert os.readlink(home / "other") == "/etc/passwd"


def test_SharedFolderItself_IsNeitherMadeNorRenamed(alice):
    for path in ("/", "/own", "/none"):
        assert alice.refused("create_folder", path=path) == ("share_itself", path)
        assert alice.refused("rename", path=path, name="x") == ("share_itself", path)


def test_ReadOnlyFolder_IsNotChanged(alice, root):
    put(root / "srv" / "public" / "read", b"text")
    try:
        assert alice.names("/public") == ["read"]
        assert alice.refused("create_folder", path="/public/x") == ("read_only", "/public/x")
        assert alice.refused("create_folder", path="/public/x/y", parents=True)[0] == "read_only"
        assert alice.refused("rename", path="/public/read", name="x")[0] == "read_only"
    finally:
        (root / "srv" / "public" / "read").unlink()


@needs_root
def test_Rights_AreTheUsersOwn(alice, bob, common, root):
    put(common / "alices" / "file", b"x")
    (common / "alices").chmod(0o700)
    assert bob.names("/common") == ["alices"]
    assert bob.refused("list", path="/common/alices") == ("denied", "/common/alices")
    assert bob.refused("stat", path="/common/alices/file")[0] == "denied"
    assert bob.refused("create_folder", path="/common/alices/x")[0] == "denied"
    assert alice.names("/common/alices") == ["file"]
    assert bob.call("create_folder", path="/common/bobs").code == 0
    assert (common / "bobs").stat().st_uid == (root / "home" / "bob").stat().st_uid


def test_Home_IsEachUsersOwn(alice, bob, home, root):
    put(home / "alices")
    assert "alices" in alice.names("/own")
    assert "alices" not in bob.names("/own")


def test_SharedFolderOfOthers_IsNone(client, root):
    from files import Visitor

    admin = Visitor(client, "admin")
    assert admin.names("/") == ["own", "public"]
    assert admin.refused("list", path="/common") == ("no_share", "/common")


def test_NobodyLoggedIn_IsRefused(client):
    assert client.call(API, "list", path="/").code == 105


def test_Errors_AreThoseOfTheReadme():
    readme = (SOURCE / "apis" / API / "README.md").read_text()
    told = dict(re.findall(r"^\| (4\d\d) \| `(\w+)` \|", readme, re.MULTILINE))
    numbers = re.findall(r"(k\w+) = (4\d\d),",
                         (SOURCE / "apis" / API / "paths" / "Reason.h").read_text())
    words = dict(re.findall(r"\{Reason::(k\w+), \"(\w+)\"\}",
                            (SOURCE / "apis" / API / "paths" / "Reason.cpp").read_text()))
    assert len(numbers) > 15
    assert told == {number: words[name] for name, number in numbers}
