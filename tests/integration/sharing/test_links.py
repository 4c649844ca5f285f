"""Calls by sharing links, from outside: each row of the table of results, and what owners may do."""

import re

import pytest

from accounts import account
from client import Client
from conftest import needs_root
from sharing import (API, DATABASE, PROJECT, Owner, Visitor, alice, bob, change_database,  # noqa: F401
                     fresh_addresses, shared, stranger, visit)

pytestmark = pytest.mark.usefixtures("shared")


def test_Visitor_WithASession_MayCall(alice, visit):
    visitor = visit(alice.make())
    data = visitor.call().data
    assert data["user"] == "" and data["isAuthorized"] is False
    assert data["authResult"] == 1


def test_Visitor_ByHeaderAndCookie_MayCall(alice, stranger):
    link = alice.make()
    answer = stranger.call(API, "open", link=link["link"])
    cookie = answer.headers.get_all("Set-Cookie")
    assert cookie == [f"sharing_sid={answer.data['sid']}; path=/; httponly; samesite=strict"]
    headers = {"X-Qelo-Sharing": link["link"], "Cookie": f"sharing_sid={answer.data['sid']}"}
    assert stranger.get("api=QELO.Test.Open&version=1&method=plain", headers).code == 0


def test_Visitor_InTheOwnersName_HasTheOwnersRights(alice, visit):
    visitor = visit(alice.make(protect="owner"))
    data = visitor.call("asUser", "QELO.Test.Identity").data
    assert data["euid"] == account("alice")[0]
    assert data["isAuthorized"] is True and data["isAdmin"] is False
    if account("alice") != account("bob"):
        assert data["user"] == "alice" and data["userVariable"] == "alice"


def test_LinkWithoutProtection_NeedsNoSession(alice, stranger):
    assert Visitor(stranger, alice.make(protect="none")["link"]).call().data["user"] == ""


def test_AnotherAddress_Is150(alice, visit, server):
    visitor = visit(alice.make())
    visitor.client = Client(server.port, next(fresh_addresses))
    assert visitor.call().code == 150
    assert visit(alice.make(matchAddress="false"), visitor.client).call().code == 0


def test_SessionOfAnotherLink_Is123(alice, bob, visit):
    visitor = visit(alice.make())
    for owner in (alice, bob):
        other = Visitor(visitor.client, owner.make()["link"], visitor.sid)
        assert other.call().code == 123


def test_ChangeOfThePassword_EndsVisitsWith123(alice, visit):
    link = alice.make()
    visitor = visit(link)
    assert alice.call("change", id=link["id"], password="secret").code == 0
    assert visitor.call().code == 123
    assert visitor.open().code == 404
    assert visitor.open("secret").code == 0
    assert visitor.call().code == 0


def test_ExpiredLink_Is124(alice, visit):
    link = alice.make()
    visitor = visit(link)
    assert alice.call("change", id=link["id"], expires=1).code == 0
    assert visitor.call().code == 124
    assert visitor.open().code == 402


def test_BodyBeyondTheLinksLimit_Is124(alice, visit):
    visitor = visit(alice.make(maxBytes=1000))
    assert visitor.call(padding="x").code == 0
    assert visitor.call(padding="x" * 1000).code == 124


def test_NoSession_Is122(alice, stranger):
    link = alice.make()
    assert Visitor(stranger, link["link"]).call().code == 122
    assert Visitor(stranger, link["link"], "A" * 43).call().code == 122


def test_MalformedIds_Are101(alice, visit):
    visitor = visit(alice.make())
    for link, sid in ((visitor.link[:-1], visitor.sid), (visitor.link, visitor.sid + "x"),
                      ("../" + visitor.link[3:], visitor.sid), (visitor.link, "%00" + "A" * 40)):
        assert Visitor(visitor.client, link, sid).call().code == 101


def test_BrokenDatabase_Is101(alice, visit):
    visitor = visit(alice.make())
    mode = DATABASE.stat().st_mode
    DATABASE.chmod(0o602)
    try:
        assert visitor.call().code == 101
    finally:
        DATABASE.chmod(mode)
    assert visitor.call().code == 0


def test_UnknownLink_Is126(alice, stranger):
    alice.make()
    assert Visitor(stranger, "A" * 43, "A" * 43).call().code == 126


def test_MethodWithoutAllowSharing_Is126(alice, visit):
    visitor = visit(alice.make(protect="owner"))
    assert visitor.call("plain", "QELO.Test.Identity").code == 126
    assert visitor.call("get", "QELO.Host.Info").code == 126


def test_SessionPastItsEnd_Is125(alice, visit):
    visitor = visit(alice.make())
    change_database("UPDATE sessions SET ends = 1 + strftime('%s', 'now') - 10")
    assert visitor.call().code == 125


def test_Application_DecidesWith127(alice, visit):
    visitor = visit(alice.make())
    assert visitor.call("asRoot", check="allow").code == 0
    assert visitor.call("asRoot", check="refuse").code == 127
    assert visitor.call("asRoot", check="throw").code == 127
    assert visitor.call("asRoot", check="print").json["success"] is True


def test_ProjectWithoutALibrary_Is127(alice, visit):
    assert visit(alice.make(project="no-such-project")).call("asRoot").code == 127


def test_CompoundRequest_AsksForEachEntry(alice, visit):
    visitor = visit(alice.make(protect="owner"))
    entries = [f'{{"api": "{api}", "version": 1, "method": "{method}"}}'
               for api, method in (("QELO.Test.Identity", "asUser"), (API, "list"),
                                   ("QELO.Test.Open", "plain"), ("QELO.Host.Info", "get"))]
    answer = visitor.call("request", "QELO.Entry.Request", compound=f"[{', '.join(entries)}]")
    codes = [entry.get("error", {}).get("code", 0) for entry in answer.data["result"]]
    assert codes == [0, 126, 0, 126]


def test_Owner_ListsChangesAndRemovesLinks(alice):
    link = alice.make(name="Holiday", path="/photos", maxUses=3)
    assert link["url"] == f"http://127.0.0.1:{alice.client.port}/webapi/sharing/#{link['link']}"
    listed = [each for each in alice.call("list").data["links"] if each["id"] == link["id"]]
    assert listed[0] == {key: link[key] for key in link if key not in ("link", "url")}
    changed = alice.call("change", id=link["id"], name="5", renew="true").data
    assert changed["name"] == "5" and changed["link"] != link["link"]
    assert alice.call("remove", id=link["id"]).code == 0
    assert alice.call("remove", id=link["id"]).code == 400


def test_NumberOfUses_EndsWith402(alice, stranger):
    visitor = Visitor(stranger, alice.make(maxUses=1)["link"])
    assert visitor.open().code == 0
    assert visitor.call().code == 0
    assert visitor.open().code == 402


@needs_root
def test_Database_IsRootsAlone(alice):
    alice.make()
    info = DATABASE.stat()
    assert (info.st_uid, info.st_mode & 0o777) == (0, 0o600)


def test_Secrets_StandInNoFile(alice, visit):
    link = alice.make(password="")
    visitor = visit(link)
    files = [DATABASE, *DATABASE.parent.glob("sharing.db-*")]
    for secret in (link["link"], visitor.sid):
        assert re.fullmatch(r"[\w-]{43}", secret)
        assert not any(secret.encode() in file.read_bytes() for file in files)
