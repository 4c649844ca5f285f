"""What the permission check makes of every way to come with a session, or without one."""

import os
import time

import pytest

from client import Client
from conftest import SESSIONS, needs_root, session_of

API = "QELO.Test.Identity"

AUTHORISED = (0, None)
NO_PRIVILEGE = (105, "noprivilege")
TIMED_OUT = (106, "timeout")
UNAUTHENTICATED = (119, "unauth")
OTHER_ADDRESS = (150, "errorip")


def grow_old(session):
    """Makes the session's last use an hour ago, past the idle time-out."""
    hour_ago = time.time() - 3600
    os.utime(SESSIONS / session["sid"], (hour_ago, hour_ago))


@pytest.fixture(scope="module")
def elsewhere(server):
    return Client(server.port, "127.0.0.2")


def test_SessionByParameter_Right_IsAuthorised(client, alice):
    answer = client.call(API, "plain", _sid=alice["sid"])
    assert answer.refusal == AUTHORISED
    assert answer.data["user"] == "alice"
    assert answer.data["authResult"] == 1
    assert not answer.data["isTimeout"]


def test_SessionByCookie_WithToken_IsAuthorised(client, alice):
    headers = {"X-Qelo-Token": alice["token"]}
    answer = client.call(API, "plain", cookie=alice["sid"], headers=headers)
    assert answer.refusal == AUTHORISED
    assert answer.data["user"] == "alice"


def test_SessionByCookie_WithoutToken_IsRefused(client, alice):
    assert client.call(API, "plain", cookie=alice["sid"]).refusal == NO_PRIVILEGE


@pytest.mark.parametrize("change", [lambda t: t[:-1], lambda t: t + "A", lambda t: "A" * len(t)])
def test_SessionByCookie_WithWrongToken_IsRefused(client, alice, change):
    headers = {"X-Qelo-Token": change(alice["token"])}
    answer = client.call(API, "plain", cookie=alice["sid"], headers=headers)
    assert answer.refusal == NO_PRIVILEGE


def test_SessionByCookie_WithTokenOfAnotherSession_IsRefused(client, alice, admin):
    headers = {"X-Qelo-Token": admin["token"]}
    answer = client.call(API, "plain", cookie=alice["sid"], headers=headers)
    assert answer.refusal == NO_PRIVILEGE


def test_SessionByParameter_BesideAnotherCookie_Counts(client, alice, admin):
    answer = client.call(API, "plain", cookie=admin["sid"], _sid=alice["sid"])
    assert answer.data["user"] == "alice"


def test_TimedOutSession_WithoutAllowance_IsRefused(client, alice):
    grow_old(alice)
    assert client.call(API, "plain", _sid=alice["sid"]).refusal == TIMED_OUT


def test_TimedOutSession_WithAllowance_IsAuthorised(client, alice):
    grow_old(alice)
    answer = client.call(API, "patient", _sid=alice["sid"])
    assert answer.refusal == AUTHORISED
    assert answer.data["authResult"] == 2
    assert answer.data["isTimeout"]


def test_TimedOutSession_UsedWithAllowance_StaysTimedOut(client, alice):
    grow_old(alice)
    client.call(API, "patient", _sid=alice["sid"])
    assert client.call(API, "plain", _sid=alice["sid"]).refusal == TIMED_OUT


def test_Session_Used_LivesOn(client, alice):
    almost = time.time() - 800
    os.utime(SESSIONS / alice["sid"], (almost, almost))
    client.call(API, "plain", _sid=alice["sid"])
    assert time.time() - (SESSIONS / alice["sid"]).stat().st_mtime < 60


def test_OtherAddress_IsRefused(elsewhere, alice):
    assert elsewhere.call(API, "plain", _sid=alice["sid"]).refusal == OTHER_ADDRESS


def test_OtherAddress_WithSkipCheckIP_IsAuthorised(elsewhere, alice):
    answer = elsewhere.call(API, "anywhere", _sid=alice["sid"])
    assert answer.refusal == AUTHORISED
    assert answer.data["user"] == "alice"
    assert answer.data["address"] == "127.0.0.2"


def test_OtherAddress_NamedByTheClient_IsRefused(elsewhere, alice):
    headers = {"X-Forwarded-For": "127.0.0.1", "X-Real-IP": "127.0.0.1", "Client-IP": "127.0.0.1"}
    answer = elsewhere.call(API, "plain", _sid=alice["sid"], headers=headers)
    assert answer.refusal == OTHER_ADDRESS


def test_NoSession_IsRefused(client):
    assert client.call(API, "plain").refusal == NO_PRIVILEGE


def test_ForgedSession_IsUnauthenticated(client):
    assert client.call(API, "plain", _sid="A" * 43).refusal == UNAUTHENTICATED
    assert client.call(API, "plain", cookie="A" * 43).refusal == UNAUTHENTICATED


@pytest.mark.parametrize(
    "sid", ["x", "../../../etc/passwd", "A" * 42, "A" * 44, "A" * 42 + "/", "A" * 42 + "\0", "ä"]
)
def test_MalformedSession_IsRefused(client, sid):
    assert client.call(API, "plain", _sid=sid).refusal == NO_PRIVILEGE


@needs_root
@pytest.mark.parametrize("record", ["", "{", "[]", '{"user": 5}', '{"user": "admin"}'])
def test_BrokenSessionRecord_IsRefused(client, alice, record):
    (SESSIONS / alice["sid"]).write_text(record)
    assert client.call(API, "plain", _sid=alice["sid"]).refusal == NO_PRIVILEGE


def test_AllowUserOfAMethod_RefusesOthers_WithoutAWord(client, alice, admin):
    assert client.call(API, "adminOnly", _sid=alice["sid"]).refusal == (105, None)
    assert client.call(API, "adminOnly", _sid=admin["sid"]).refusal == AUTHORISED


def test_AuthLevelNone_NeedsNoSession(client):
    answer = client.call("QELO.Test.Open", "plain")
    assert answer.refusal == AUTHORISED
    assert answer.data["user"] == ""


def test_LogOut_EndsTheSession(client, alice):
    client.call("QELO.Access.Session", "logout", _sid=alice["sid"])
    assert client.call(API, "plain", _sid=alice["sid"]).refusal == UNAUTHENTICATED


def test_Sessions_OfOneUser_AreIndependent(client, alice):
    other = session_of(client, "alice")
    assert other["sid"] != alice["sid"] and other["token"] != alice["token"]
    client.call("QELO.Access.Session", "logout", _sid=alice["sid"])
    assert client.call(API, "plain", _sid=other["sid"]).refusal == AUTHORISED
