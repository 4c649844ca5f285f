"""Calls that another host serves."""

import json
import shutil
import subprocess
import time
from urllib.parse import parse_qs

import pytest
from conftest import BUILD, ROOT, needs_root
from relay_hosts import (API, TABLE, authority, good, hosts, other, relayed,  # noqa: F401
                         scripted)
from tls import Authority, ScriptedHost, TlsFront, json_answer, openssl, public_key_pin

pytestmark = needs_root


def test_Call_IsServedByTheOtherHost(client, admin, other, hosts):
    hosts(7, other.url, other.token)
    answer = relayed(client, admin, text='"5"', list="[1,null,{}]", odd="a&b=%41+ä")
    assert answer.status == 200
    assert answer.headers["Content-type"] == 'application/json; charset="UTF-8"'
    assert answer.headers["Pragma"] == "no-cache"
    assert answer.data["user"] == "alice"  # the token's, there
    assert answer.data["isAdmin"] is False
    assert answer.data["parameters"] == {
        "api": API, "method": "plain", "version": 1, "text": "5", "list": [1, None, {}],
        "odd": "a&b=%41+ä"}
    assert relayed(client, admin, "missing").code == 121
    assert relayed(client, admin, "asAlice").data["euid"] == 1002


def test_OtherHost_ChecksWhatItsTokenMay(client, admin, other, hosts):
    hosts(7, other.url, other.token)
    answer = relayed(client, admin, "adminOnly")  # here admin might
    assert answer.code == 105
    hosts(7, other.url, "t" * 43)
    assert relayed(client, admin).code == 119


def test_HostsOfATable_AreToldByTheirNumbers(client, admin, other, scripted, hosts):
    hosts(7, scripted.url)
    hosts(8, other.url, other.token)
    assert relayed(client, admin, number=8).data["user"] == "alice"
    for unknown in (9, 0, -7, "x"):
        assert relayed(client, admin, number=unknown).code == 109


def test_Table_ThatOthersMayRead_IsNotUsed(client, admin, other, hosts):
    hosts(7, other.url, other.token)
    TABLE.chmod(0o640)
    assert relayed(client, admin).code == 109


@pytest.mark.parametrize("kind", ["expired", "wrong name", "self-signed", "other authority", "wrong pin"])
def test_HostThatIsNotTheOneMeant_IsSentNothing(kind, client, admin, hosts, authority, good, tmp_path):
    certificate, key, trust, more = *good, authority.certificate, {}
    if kind == "expired":
        certificate, key = authority.sign("expired", expired=True)
    elif kind == "wrong name":
        certificate, key = authority.sign("elsewhere", host="elsewhere.example")
    elif kind == "other authority":
        trust = Authority(tmp_path).certificate
    elif kind == "self-signed":
        foreign = Authority(tmp_path)
        certificate, key = foreign.certificate, tmp_path / "authority.key"
    else:
        more = {"pin": public_key_pin(authority.certificate)}
    host = ScriptedHost(certificate, key)
    hosts(7, host.url, trust=trust, **more)
    assert relayed(client, admin).code == 109
    assert host.requests == []
    host.stop()


def test_CertificateThatIsTrustedItself_WillDo(client, admin, hosts, tmp_path):
    certificate, key = tmp_path / "own.pem", tmp_path / "own.key"
    openssl("req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-nodes", "-subj",
            "/CN=localhost", "-addext", "subjectAltName=DNS:localhost", "-days", "30", "-keyout", key,
            "-out", certificate)
    host = ScriptedHost(certificate, key)
    hosts(7, host.url, trust=certificate, pin=public_key_pin(certificate))
    assert relayed(client, admin).code == 0
    hosts(7, host.url, trust=None)  # the host's own authorities do not know it
    assert relayed(client, admin).code == 109
    assert len(host.requests) == 1
    host.stop()


def test_Request_HasTheTokenInAHeaderAndNoCredentialOfOurs(client, admin, scripted, hosts):
    hosts(7, scripted.url)
    del scripted.requests[:]
    relayed(client, admin, relay_timeout=20, x=1, tid="T", _sharing_id="S")
    line, headers, body, _ = scripted.requests[0]
    assert line == "POST /webapi/entry.cgi HTTP/1.1\r\n"
    assert headers["X-Qelo-Access-Token"] == "t" * 43
    assert headers["X-Qelo-Relay"] == "1"
    assert set(headers) == {"Host", "Accept", "X-Qelo-Relay", "X-Qelo-Access-Token", "Content-Type",
                            "Content-Length"}
    assert parse_qs(body.decode()) == {
        "api": [f'"{API}"'], "version": ["1"], "method": ['"plain"'], "x": ["1"]}


def test_Answer_ComesAsItIs(client, admin, scripted, hosts):
    hosts(7, scripted.url)
    for text in (b"", b'{"success" : true}\n\n', b"\x00\xff no JSON", b"x" * 3_000_000):
        scripted.answer = (f"HTTP/1.1 200 OK\r\nContent-Length: {len(text)}\r\n"
                           "X-Theirs: 1\r\nSet-Cookie: id=theirs\r\n\r\n").encode() + text
        answer = relayed(client, admin)
        assert answer.body == text
        assert "X-Theirs" not in answer.headers and "Set-Cookie" not in answer.headers
    scripted.answer = json_answer({"success": False, "error": {"code": 400}}, "404 Not Found")
    assert relayed(client, admin).code == 400
    scripted.answer = None


def test_AnswerThatIsNone_Is109(client, admin, scripted, hosts):
    hosts(7, scripted.url)
    page = b"HTTP/1.1 %s\r\nContent-Type: text/html\r\nContent-Length: 5\r\n%s\r\nhello"
    for answer in (
        page % (b"500 Internal Server Error", b""),
        page % (b"302 Found", b"Location: https://localhost/\r\n"),
        b"HTTP/1.1 200 OK\r\nContent-Length: 50\r\n\r\ncut",
        b"HTTP/1.1 200 OK\r\nContent-Length: 40000000\r\n\r\n" + b"x" * 40_000_000,
        b"garbage\r\n\r\n",
        lambda connection: connection.close(),
    ):
        scripted.answer = answer
        assert relayed(client, admin).code == 109
    scripted.answer = None


def test_AnswerThatIsLate_Is109(client, admin, scripted, hosts):
    def trickle(connection):
        connection.sendall(b"HTTP/1.1 200 OK\r\n\r\n")
        for _ in range(40):
            connection.sendall(b"x")
            time.sleep(0.2)

    hosts(7, scripted.url)
    for answer in (lambda connection: time.sleep(8), trickle):
        scripted.answer = answer
        start = time.monotonic()
        assert relayed(client, admin, relay_timeout=1).code == 109
        assert 0.9 < time.monotonic() - start < 6
    scripted.answer = lambda connection: (time.sleep(1.5), connection.sendall(json_answer({"success": True})))
    hosts(7, scripted.url, timeout=1)
    assert relayed(client, admin).code == 109
    for default in (0, -1):
        assert relayed(client, admin, relay_timeout=default).code == 109
    assert relayed(client, admin, relay_timeout=20).code == 0
    scripted.answer = None


def test_CallerWithoutPermission_ReachesNobody(client, alice, admin, scripted, hosts):
    hosts(7, scripted.url)
    del scripted.requests[:]
    assert relayed(client, alice).code == 109
    anonymous = client.call(API, "plain", relay_zt=7)
    assert anonymous.refusal == (105, None)
    assert client.call("QELO.Test.Open", "run", relay_zt=7).code != 0
    assert client.call(API, "plain", _sid="s" * 43, relay_zt=7).code == 119
    assert client.call(API, "plain", tid="t" * 43, relay_zt=7).code == 119
    cookie = client.call(API, "plain", cookie=admin["sid"], relay_zt=7)  # without the header's token
    assert cookie.code == 105
    assert scripted.requests == []
    privileges = ROOT / "etc" / "webapi" / "appprivs.json"
    before = privileges.read_text() if privileges.exists() else None
    privileges.write_text('{"QELO.Relay.7": {"allow": [{"user": "alice"}]}}')
    try:
        assert relayed(client, alice).code == 0
    finally:
        if before is None:
            privileges.unlink()
        else:
            privileges.write_text(before)


def test_Circle_EndsAtItsFirstRound(client, admin, server, good, hosts):
    """A web server between the hosts that makes each call a call of the next host."""
    def rewrite(first):
        return first.replace(b"/webapi/entry.cgi ", b"/webapi/entry.cgi?relay_zt=7 ", 1)

    token = subprocess.run([BUILD / "programs" / "webapi-token", "create", "--user", "admin"],
                           check=True, capture_output=True, text=True).stdout.strip()
    front = TlsFront(*good, server.port, rewrite)
    hosts(7, front.url, token)
    assert relayed(client, admin).code == 109
    assert front.served == 1
    front.stop()


def test_RelayedCall_CannotAskForAnother(client, admin, other, hosts):
    hosts(7, other.url, other.token)
    answer = client.call(API, "plain", _sid=admin["sid"], relay_zt=7, headers={"X-Qelo-Relay": "1"})
    assert answer.code == 109
    entries = json.dumps([{"api": API, "version": 1, "method": "plain", "relay_zt": 7},
                          {"api": API, "version": 1, "method": "plain"}])
    answer = client.call("QELO.Entry.Request", "request", _sid=admin["sid"], relay_zt=7, compound=entries)
    results = answer.data["result"]
    assert results[0]["error"]["code"] == 109
    assert results[1]["data"]["user"] == "alice"


def test_CompoundRequest_ByAnAccessToken_IsNotRelayed(client, scripted, hosts):
    """Nobody here could ask whether the token is for its entries."""
    token = subprocess.run([BUILD / "programs" / "webapi-token", "create", "--user", "admin"],
                           check=True, capture_output=True, text=True).stdout.strip()
    hosts(7, scripted.url)
    del scripted.requests[:]
    entries = json.dumps([{"api": API, "version": 1, "method": "plain"}])
    answer = client.call("QELO.Entry.Request", "request", tid=token, relay_zt=7, compound=entries)
    assert answer.code == 119
    assert scripted.requests == []
    assert client.call(API, "plain", tid=token, relay_zt=7).code == 0


def test_WithoutTheTransport_Is109(client, admin, scripted, hosts):
    """A module that others may write is not loaded."""
    hosts(7, scripted.url)
    module = BUILD / "modules" / "relay.so"
    mode = module.stat().st_mode
    module.chmod(0o757)
    try:
        assert relayed(client, admin).code == 109
    finally:
        module.chmod(mode)
    assert relayed(client, admin).code == 0
