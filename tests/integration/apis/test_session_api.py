"""QELO.Access.Session: logging in and out, and who the caller is."""

import itertools
import json
import subprocess
from urllib.parse import quote

import pytest

from client import Client
from conftest import BUILD, PASSWORDS, needs_root, run_entry

API = "QELO.Access.Session"
fresh_addresses = (f"127.0.1.{last}" for last in itertools.count(1))


@pytest.fixture
def stranger(server):
    """A client at an address that has not failed to log in before."""
    return Client(server.port, next(fresh_addresses))


@pytest.fixture
def token(root):
    """An access token that stands for bob in all calls."""
    program = BUILD / "programs" / "webapi-token"
    made = subprocess.run([program, "create", "--user", "bob"], capture_output=True, check=True)
    return made.stdout.decode().strip()


def cookie_of(answer):
    cookies = answer.headers.get_all("Set-Cookie")
    assert len(cookies) == 1
    return cookies[0]


def test_Login_Right_AnswersTicketAndCookie(client):
    answer = client.login("alice", PASSWORDS["alice"])
    data = answer.data
    assert sorted(data) == ["sid", "token", "user"]
    assert data["user"] == "alice"
    assert cookie_of(answer) == f"id={data['sid']}; path=/; httponly; samesite=strict"
    assert answer.word is None
    assert answer.status == 200


def login_of(account):
    return f"api={API}&version=1&method=login&account={account}&password={PASSWORDS[account]}"


def test_Login_ByGet_IsRefused(client):
    """The password would stand in the server's log."""
    answer = client.get(login_of("alice"))
    assert answer.refusal == (405, None)
    assert answer.headers.get_all("Set-Cookie") is None
    entry = {"api": API, "version": 1, "method": "login", "account": "alice",
             "password": PASSWORDS["alice"]}
    whole = client.get("api=QELO.Entry.Request&version=1&method=request&compound="
                       + quote(json.dumps([entry])))
    assert whole.data["result"][0]["error"]["code"] == 405


@pytest.mark.parametrize("headers, code", [
    ({"Sec-Fetch-Site": "cross-site", "Content-Type": "text/plain"}, 403),
    ({"Origin": "http://evil.example"}, 403),
    ({"Origin": "null"}, 403),
    ({"Sec-Fetch-Site": "same-origin", "Origin": "http://127.0.0.1"}, 0),
    ({"Origin": "http://127.0.0.1:8080"}, 0),
])
def test_Login_FromAPage_IsForOwnPagesAlone(client, headers, code):
    answer = client.post(login_of("alice"), headers)
    assert answer.code == code
    assert (answer.headers.get_all("Set-Cookie") is None) == (code != 0)


def test_Login_WhileLoggedIn_MakesAnotherSession(client, alice):
    parameters = {"account": "admin", "password": PASSWORDS["admin"]}
    answer = client.call(API, "login", cookie=alice["sid"], **parameters)
    assert answer.data["user"] == "admin"
    assert answer.word is None


@pytest.mark.parametrize(
    "account, password",
    [("alice", "wrong"), ("alice", "12345"), ("nobody-here", "x"), ("system", "x"), ("root", "x")],
)
def test_Login_Wrong_IsRefused(stranger, account, password):
    answer = stranger.login(account, password)
    assert answer.refusal == (400, None)
    assert answer.headers.get_all("Set-Cookie") is None


def test_Login_WithPasswordOfAnother_IsRefused(stranger):
    assert stranger.login("alice", PASSWORDS["admin"]).code == 400


@pytest.mark.parametrize(
    "parameters",
    [
        {},
        {"account": "alice"},
        {"password": "x"},
        {"account": "", "password": "x"},
        {"account": "alice", "password": ""},
        {"account": "[]", "password": "x"},
        {"account": "alice", "password": '{"a": 1}'},
    ],
)
def test_Login_WithoutAccountOrPassword_IsBadInput(stranger, parameters):
    assert stranger.call(API, "login", **parameters).code == 101


def test_Login_TooManyAttempts_SaysWhenToTryAgain(stranger):
    answers = [stranger.login("bob", f"wrong-{i}") for i in range(40)]
    codes = [answer.code for answer in answers]
    assert codes[0] == 400
    assert codes[-1] == 407
    assert set(codes) == {400, 407}
    error = answers[-1].json["error"]
    assert error["errors"]["retry_after"] > 0
    assert answers[-1].headers["Retry-After"] == str(error["errors"]["retry_after"])
    assert stranger.login("bob", PASSWORDS["bob"]).code == 407


def test_Login_TooManyAttemptsElsewhere_DoesNotLockTheAccount(server, stranger):
    for i in range(40):
        stranger.login("alice", f"wrong-{i}")
    assert Client(server.port, next(fresh_addresses)).login("alice", PASSWORDS["alice"]).code == 0


def test_Current_TellsWhoTheCallerIs(client, alice):
    data = client.call(API, "current", _sid=alice["sid"]).data
    seconds = data.pop("secondsLeft")
    assert data == {
        "user": "alice",
        "class": "normal.local",
        "isAdmin": False,
        "language": "enu",
        "address": "127.0.0.1",
    }
    assert 890 <= seconds <= 900


def test_Current_OfAnAdministrator_SaysSo(client, admin):
    data = client.call(API, "current", _sid=admin["sid"]).data
    assert data["isAdmin"]
    assert data["class"] == "admin.local"


def test_Current_ByAccessToken_SpeaksTheCookiesLanguage(client, token):
    data = client.call(API, "current", tid=token, headers={"Cookie": "lang=ger"}).data
    assert data["user"] == "bob"
    assert data["language"] == "ger"


def test_Current_ByAccessToken_BesideARefusedSession_KeepsNothingOfItButTheLanguage(
    client, alice, token
):
    for cookies in (f"lang=ger; id={alice['sid']}", f"id={'A' * 43}; lang=ger", "id=x; lang=ger"):
        data = client.call(API, "current", tid=token, headers={"Cookie": cookies}).data
        assert data["user"] == "bob", cookies
        assert data["language"] == "ger", cookies
        assert data["secondsLeft"] == -1, cookies


@pytest.mark.parametrize("method", ["current", "logout"])
def test_WithoutSession_KeepsThePermissionChecksAnswer(client, alice, method):
    assert client.call(API, method).refusal == (105, "noprivilege")
    assert client.call(API, method, _sid="A" * 43).refusal == (119, "unauth")
    assert client.call(API, method, cookie=alice["sid"]).refusal == (105, "noprivilege")
    elsewhere = Client(client.port, "127.0.0.3")
    assert elsewhere.call(API, method, _sid=alice["sid"]).refusal == (150, "errorip")


def test_Logout_DeletesTheCookie(client, alice):
    answer = client.call(API, "logout", _sid=alice["sid"])
    assert answer.code == 0
    assert cookie_of(answer).startswith("id=; path=/; expires=Thu, 01-Jan-1970 00:00:01 GMT")


def test_Logout_Twice_IsUnauthenticated(client, alice):
    client.call(API, "logout", _sid=alice["sid"])
    assert client.call(API, "logout", _sid=alice["sid"]).refusal == (119, "unauth")


def test_Secrets_StayOutOfTheServersLogs(server, client, alice):
    client.get(f"api={API}&version=1&method=current&_sid={alice['sid']}")
    client.call(API, "current", cookie=alice["sid"], headers={"X-Qelo-Token": alice["token"]})
    log = server.log()
    assert "/webapi/entry.cgi" in log
    assert alice["sid"] not in log
    assert alice["token"] not in log
    assert PASSWORDS["alice"] not in log


@needs_root
def test_Login_OverHttps_MarksTheCookieSecure(root):
    body = f"api={API}&version=1&method=login&account=alice&password={PASSWORDS['alice']}"
    assert b"; secure; httponly" in run_entry(body=body.encode(), HTTPS="on")
    assert b"; secure" not in run_entry(body=body.encode())
