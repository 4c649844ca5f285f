"""Files that visitors bring by a link: where it says so, into the shared folder alone."""

import subprocess
from urllib.parse import urlencode

import pytest

from accounts import account
from conftest import ROOT
from sharing import Visitor, alice, bob, folder, stranger, visit  # noqa: F401
from upload import TYPE, Form

API = "QELO.Files.Item"
HOME = ROOT / "home" / "alice"


@pytest.fixture
def terms(folder):
    return {"project": "files", "protect": "owner", "path": folder, "upload": "true"}


@pytest.fixture
def visitor(alice, visit, terms):
    return visit(alice.make(**terms))


def query_of(visitor, path, **more):
    return urlencode({"api": API, "version": 1, "method": "upload", "_sharing_id": visitor.link,
                      **({"_sharing_sid": visitor.sid} if visitor.sid else {}),
                      **({} if path is None else {"path": path}), **more})


def bring(visitor, path, form=None, **more):
    """Sends a form, by default one file "new.txt"."""
    form = form or Form().file("file", "new.txt", b"brought")
    return visitor.client.request("POST", f"/webapi/entry.cgi?{query_of(visitor, path, **more)}",
                                  form.body(), {"Content-Type": TYPE})


def all_files():
    """All files of alice's with their content."""
    return {str(path.relative_to(HOME)): path.read_bytes() for path in HOME.rglob("*")
            if path.is_file() and not path.is_symlink()}


def test_Curl_BringsAFile(visitor, folder, tmp_path):
    file = tmp_path / "photo.jpg"
    file.write_bytes(bytes(range(256)) * 8000)
    url = f"http://127.0.0.1:{visitor.client.port}/webapi/entry.cgi?{query_of(visitor, folder)}"
    answer = subprocess.run(["curl", "-s", "--interface", visitor.client.address, url, "-F",
                             f"file=@{file}"], capture_output=True, check=True).stdout
    assert b'"success":true' in answer, answer
    brought = HOME / "shared" / "photo.jpg"
    assert brought.read_bytes() == file.read_bytes()
    assert brought.stat().st_uid == account("alice")[0]
    brought.unlink()


def test_FileForAFolderBelow_ComesThere(visitor, folder):
    answer = bring(visitor, folder + "/deep", name="other.txt")
    assert [item["name"] for item in answer.data["items"]] == ["other.txt"]
    assert (HOME / "shared/deep/other.txt").read_bytes() == b"brought"


@pytest.mark.parametrize("path", [
    None, "/", "/own", "/own/shared-not", "/own/shared/..", "/own/shared/../shared-not", "own/shared", "",
    "/own/shared//deep", '["/own/shared"]', '["/own/shared", "/own"]', "/own/shared\0/../..", "/OWN/shared",
])
def test_OtherFolder_GetsNothing(visitor, path):
    before = all_files()
    assert bring(visitor, path).code in (101, 127)
    assert all_files() == before


def test_PathOfTheForm_LeadsNowhereElse(visitor, folder):
    """The check of the link knows the address alone; the form comes behind it."""
    before = all_files()
    for path in ("/own", "/own/shared-not", "/own/shared/../shared-not", "/", folder + "/out"):
        form = Form().field("path", path).file("file", "new.txt", b"brought")
        assert bring(visitor, folder, form).json["success"] is False, path
    form = Form().file("file", "new.txt", b"brought").field("path", "/own")
    assert bring(visitor, folder, form, name="kept.txt").code == 0
    assert set(all_files()) == set(before) | {"shared/kept.txt"}


def test_CredentialsOfTheForm_ChangeNothing(visitor, alice, bob, visit, terms, folder):
    """Another link's ids, or the method's name, in the form."""
    closed = visit(alice.make(**{**terms, "upload": "false"}), visitor.client)
    form = (Form().field("_sharing_id", visitor.link).field("_sharing_sid", visitor.sid)
            .field("_sid", alice.sid).file("file", "new.txt", b"brought"))
    before = all_files()
    assert bring(closed, folder, form).code == 127
    assert all_files() == before


@pytest.mark.parametrize("name", ["../new.txt", "/etc/new.txt", "..", ".", "a/../../new.txt", "a/b", "x" * 300])
@pytest.mark.parametrize("place", ["form", "parameter"])
def test_HostileName_IsRefused(visitor, folder, name, place):
    before = all_files()
    if place == "form":
        answer = bring(visitor, folder, Form().file("file", name, b"brought"))
    else:
        answer = bring(visitor, folder, name=name)
    after = all_files()
    if answer.json["success"]:  # browsers send whole paths, of which the last part is the name
        kept = {item["name"] for item in answer.data["items"]}
        assert place == "form" and kept == {name.split("/")[-1]}
    assert {file for file in after if after[file] == b"brought"} <= {"shared/new.txt", "shared/b"}
    assert {file: after[file] for file in before} == before


def test_WhatIsThere_IsNeverReplaced(visitor, folder):
    form = Form().field("existing", "replace").file("file", "a.txt", b"mine")
    assert bring(visitor, folder, form).code == 127
    assert bring(visitor, folder, Form().file("file", "a.txt", b"mine"), existing="replace").code == 127
    assert bring(visitor, folder, Form().file("file", "a.txt", b"mine")).json["success"] is False
    assert bring(visitor, folder, Form().file("file", "a.txt", b"mine"), existing="skip").code == 0
    assert (HOME / "shared/a.txt").read_text() == "shared"


def test_LinkThatDoesNotSaySo_TakesNothing(alice, visit, terms, folder):
    link = alice.make(**{**terms, "upload": "false"})
    visitor = visit(link)
    before = all_files()
    assert bring(visitor, folder).code == 127
    assert alice.call("change", id=link["id"], upload="true").code == 0
    assert bring(visitor, folder).code == 0
    assert alice.call("change", id=link["id"], upload="false").code == 0
    assert bring(visitor, folder, name="more.txt").code == 127
    assert set(all_files()) == set(before) | {"shared/new.txt"}


def test_LinkOfAnotherProject_TakesNothing(alice, visit, terms, folder):
    assert bring(visit(alice.make(**{**terms, "project": "notes"})), folder).code == 127


def test_LinkToAFile_TakesNothing(alice, visit, terms, folder):
    visitor = visit(alice.make(**{**terms, "path": folder + "/a.txt"}))
    before = all_files()
    assert bring(visitor, folder).code == 127
    assert bring(visitor, folder + "/a.txt").json["success"] is False
    assert all_files() == before


def test_LargerThanTheLinkTakes_Is124(alice, visit, terms, folder):
    visitor = visit(alice.make(**terms, maxBytes=1000))
    assert bring(visitor, folder, Form().file("file", "large", b"x" * 1000)).code == 124
    assert bring(visitor, folder, Form().file("file", "small", b"x" * 500)).code == 0
    assert not (HOME / "shared/large").exists()


def test_WithoutASession_NothingIsTaken(visitor, folder):
    before = all_files()
    assert bring(Visitor(visitor.client, visitor.link), folder).code == 122
    assert all_files() == before


def test_Slices_AreNotForVisitors(visitor):
    assert visitor.call("tus", API).code == 126
