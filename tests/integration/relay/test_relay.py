"""Calls that another host serves: two private roots, each with a web server, one in front of the other
by TLS."""

import hashlib
import json
import shutil
import socket
import subprocess
import time
from urllib.parse import parse_qs, urlencode

import pytest
from conftest import BUILD, ROOT, needs_root
from tls import Authority, ScriptedHost, TlsFront, json_answer, openssl, public_key_pin
from upload import TYPE, Form
from webserver import WebServer

pytestmark = needs_root

TABLE = ROOT / "etc" / "webapi" / "relay.json"
TRUST = ROOT / "etc" / "webapi" / "relay"
API = "QELO.Test.Identity"
# The other root is at the first one's place for all that runs behind this.
AT_OTHER_ROOT = ["unshare", "-m", "sh", "-c", 'mount --bind "$0" "$1" && shift && exec "$@"']


@pytest.fixture(scope="module")
def authority(tmp_path_factory):
    return Authority(tmp_path_factory.mktemp("authority"))


@pytest.fixture(scope="module")
def good(authority):
    return authority.sign("good")


@pytest.fixture(scope="module")
def other(root, good, tmp_path_factory):
    """The other host: a root of its own, a web server, and TLS in front."""
    place = tmp_path_factory.mktemp("other") / "root"
    subprocess.run(["cp", "-a", root, place], check=True)  # with its owners
    for spare in (place / "run" / "webapi", place / "var" / "lib" / "webapi"):
        shutil.rmtree(spare, ignore_errors=True)
    at_other = [*AT_OTHER_ROOT, place, ROOT]
    token = subprocess.run(
        [*at_other, BUILD / "programs" / "webapi-token", "create", "--user", "alice"],
        check=True, capture_output=True, text=True).stdout.strip()
    server = WebServer(tmp_path_factory.mktemp("other-server"), BUILD / "programs" / "entry.cgi")
    server.start(*at_other)
    front = TlsFront(*good, server.port)
    front.token, front.place = token, place
    yield front
    front.stop()
    server.stop()


@pytest.fixture(scope="module")
def scripted(good):
    host = ScriptedHost(*good)
    yield host
    host.stop()


@pytest.fixture
def hosts(root, authority):
    """Writes the table of hosts: hosts(7, url, token, **more)."""
    TRUST.mkdir(exist_ok=True)
    table = {}

    def write(number, url, token="t" * 43, trust=authority.certificate, **more):
        if trust is not None:
            shutil.copy(trust, TRUST / f"{number}.pem")
            (TRUST / f"{number}.pem").chmod(0o644)
            more["trust"] = f"/etc/webapi/relay/{number}.pem"
        table[str(number)] = {"url": url, "token": token, **more}
        TABLE.write_text(json.dumps(table))
        TABLE.chmod(0o600)

    yield write
    shutil.rmtree(TRUST)
    TABLE.unlink(missing_ok=True)


def relayed(client, session, method="plain", number=7, **parameters):
    return client.call(API, method, _sid=session["sid"], relay_zt=number, **parameters)


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


def upload(client, session, body, **parameters):
    query = urlencode({"api": "QELO.Test.Upload", "version": 1, "method": "run", "_sid": session["sid"],
                       "relay_zt": 7, **parameters})
    return client.request("POST", f"/webapi/entry.cgi?{query}", body,
                          {"Content-Type": "multipart/form-data; boundary=b"})


def test_Upload_IsPassedOnWhole(client, admin, scripted, hosts, describe):
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    body = bytes(range(256)) * 40_000
    del scripted.requests[:]
    answer = upload(client, admin, body, x="a b", relay_timeout=20)
    assert answer.json == {"success": True}
    assert answer.headers["Content-type"] == 'text/plain; charset="UTF-8"'
    line, headers, _, digest = scripted.requests[0]
    assert line == ('POST /webapi/entry.cgi?api=%22QELO.Test.Upload%22&version=1&method=%22run%22'
                    '&x=%22a%20b%22 HTTP/1.1\r\n')
    assert headers["Content-Type"] == "multipart/form-data; boundary=b"
    assert headers["Content-Length"] == str(len(body))
    assert digest == hashlib.sha256(body).hexdigest()


def test_UploadThatFails_AnswersAllTheSame(client, admin, scripted, hosts, describe):
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, "https://localhost:1/webapi/entry.cgi")
    assert upload(client, admin, b"x" * 3_000_000).code == 109
    hosts(7, scripted.url)
    assert upload(client, admin, b"x", long="x" * 6000).code == 109


def test_Upload_ReachesTheMethodOfTheOtherHost(client, admin, other, hosts):
    """A file, there and back again, and nothing of it here."""
    hosts(7, other.url, other.token)
    content = bytes(range(256)) * 8_000
    query = {"api": "QELO.Files.Item", "version": 1, "_sid": admin["sid"], "relay_zt": 7}
    target = f"/webapi/entry.cgi?{urlencode({**query, 'method': 'upload', 'path': '/own'})}"
    form = Form().field("existing", "refuse").file("file", "relayed.bin", content).body()
    answer = client.request("POST", target, form, {"Content-Type": TYPE})
    assert [item["path"] for item in answer.data["items"]] == ["/own/relayed.bin"]
    assert (other.place / "home/alice/relayed.bin").read_bytes() == content
    assert not list((ROOT / "home").rglob("relayed.bin"))
    back = client.call("QELO.Files.Item", "download", _sid=admin["sid"], relay_zt=7, path="/own/relayed.bin")
    assert back.body == content
    again = client.request("POST", target, form, {"Content-Type": TYPE})
    assert again.code == 406  # the other method's own error: it is there


def test_UploadWhoseCallStandsInTheForm_Is109(client, admin, scripted, hosts, describe):
    """Its body was begun to be read, so that it cannot be passed on whole."""
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    del scripted.requests[:]
    served = scripted.served
    form = Form()
    for name, value in (("api", "QELO.Test.Upload"), ("version", "1"), ("method", "run"),
                        ("_sid", admin["sid"]), ("relay_zt", "7")):
        form.field(name, value)
    form.file("file", "a", b"x" * 300_000)
    start = time.monotonic()
    answer = client.request("POST", "/webapi/entry.cgi", form.body(), {"Content-Type": TYPE})
    assert answer.code == 109
    assert time.monotonic() - start < 8
    assert (scripted.requests, scripted.served) == ([], served)


@pytest.mark.parametrize("relayed_call", ["upload", "call"])
def test_Answer_WaitsForTheBody(client, admin, other, scripted, hosts, describe, relayed_call):
    """The web server takes the answer when it has passed on the body; who reads it late gets it all."""
    describe("QELO.Test.Upload", "good.so", allowUser=["admin.local"], authLevel=1,
             methods={"1": [{"run": {"allowUpload": True}}]})
    hosts(7, scripted.url)
    scripted.answer = json_answer({"success": True, "data": "y" * 3_000_000})
    api, method, kind = (("QELO.Test.Upload", "run", TYPE) if relayed_call == "upload" else
                         (API, "plain", "application/octet-stream"))
    query = urlencode({"api": api, "version": 1, "method": method, "_sid": admin["sid"], "relay_zt": 7})
    size = 8_000_000
    with socket.create_connection(("127.0.0.1", client.port), timeout=60) as connection:
        connection.sendall(f"POST /webapi/entry.cgi?{query} HTTP/1.0\r\nHost: localhost\r\n"
                           f"Content-Type: {kind}\r\nContent-Length: {size}\r\n\r\n".encode())
        for _ in range(size // 1_000_000):  # not a byte is read meanwhile
            connection.sendall(b"x" * 1_000_000)
            time.sleep(0.1)
        received = b"".join(iter(lambda: connection.recv(65536), b""))
    scripted.answer = None
    assert received.endswith(b'"}') and received.count(b"y" * 1000) == 3000
