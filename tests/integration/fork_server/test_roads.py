"""What users do, by entry.cgi, by the fork server and by its workers: the answers are the same bytes, dates and ids aside.
Requests that say who calls, send files and get files; test_requests.py has those that anybody makes."""

import json
import os
import re
from urllib.parse import quote, urlencode

import pytest

from conftest import ROOT, answer_of, run_entry, session_of
from files import home, put  # noqa: F401  (a fixture)
from scgi import start, start_workers  # noqa: F401  (fixtures)

FILES = "api=QELO.Files.Item&version=1&method="
SESSION = "api=QELO.Access.Session&version=1&method=current"
MULTIPART = "multipart/form-data; boundary=x"
FAULTY = ["printing.so", "throwing.so", "state.so", "no_table.so", "null_table.so", "throwing_table.so",
          "holed_table.so", "null_check_table.so", "wandering.so", "losing.so", "mistreating.so",
          "no_such_file.so"]


def alike(answer):
    """An answer without what differs from call to call."""
    answer = re.sub(rb'(id=|"sid":"|"token":"|boundary=|\n--)[\w-]{20,}', rb"\1", answer)
    return re.sub(rb'("(?:secondsLeft|created|used|mtime|modified|changed|time|expires|id)":)\d+', rb"\1", answer)


@pytest.fixture
def both(start, start_workers):
    """Makes a request by all roads and gives the answer, which is the same."""
    servers = [start(), start_workers("--fronts", 1)]

    def ask(query=None, prepare=lambda: None, **request):
        prepare()
        expected = run_entry(query, **request)
        for server in servers:
            prepare()
            got = server.request(query, **request)
            assert alike(got) == alike(expected), (server.options, query, request)
        return got

    return ask


@pytest.fixture
def sid(client):
    return session_of(client, "alice")["sid"]


def test_WhoCalls_IsToldAlike(both, client, sid, admin):
    assert b'"alice"' in both(f"{SESSION}&_sid={sid}")
    both(f"{SESSION}&_sid={sid}", REMOTE_ADDR="192.0.2.1")
    both(SESSION, HTTP_COOKIE=f"id={sid}")  # without its token
    token = client.call("QELO.Access.Token", "create", _sid=sid, name="roads",
                        scopes='[{"api":"QELO.Access.*"}]').data["token"]
    assert b'"alice"' in both(f"{SESSION}&tid={token}")
    assert b'"alice"' in both(SESSION, HTTP_X_QELO_ACCESS_TOKEN=token)
    both(f"api=QELO.Host.Info&version=1&method=get&tid={token}")
    for who in (sid, admin["sid"]):
        assert b"QELO.Catalog.API" in both(f"api=QELO.Catalog.API&version=1&method=list&_sid={who}")
    both(f"api=QELO.Catalog.API&version=1&method=describe&name=QELO.Host.Info&_sid={sid}")
    both(f"api=QELO.Work.Task&version=1&method=list&_sid={sid}")


def test_Files_AreListedAndSentAlike(both, home, sid):
    for name, content in (("one.txt", b"1" * 70_000), ("zwei ü.bin", bytes(range(256)) * 300), ("none", b"")):
        os.utime(put(home / name, content), (10**9, 10**9))
    assert b"one.txt" in both(f"{FILES}list&path=/own&_sid={sid}")
    both(f"{FILES}stat&path=/own/one.txt&_sid={sid}")
    both(f"{FILES}stat&path=/own/missing&_sid={sid}")
    both(f"{FILES}list&path=/own/../..&_sid={sid}")
    download = f"{FILES}download&_sid={sid}&path="
    whole = both(download + "/own/one.txt")
    assert whole.endswith(b"1" * 70_000)
    tag = re.search(rb"ETag: (\S+)", whole, re.IGNORECASE).group(1).decode()
    for name in ("one.txt", quote("zwei ü.bin"), "none", "missing"):
        for condition in ({}, {"HTTP_RANGE": "bytes=5-9"}, {"HTTP_RANGE": "bytes=0-1,4-5"},
                          {"HTTP_RANGE": "bytes=99999999-"}, {"REQUEST_METHOD": "HEAD"},
                          {"HTTP_IF_NONE_MATCH": tag}):
            both(f"{download}/own/{name}", **condition)
    archive = both(f'{download}["/own/one.txt","/own/none"]')
    assert b"application/zip" in archive and b"one.txt" in archive


def test_Uploads_ArriveAlike(both, home, sid):
    content = os.urandom(200_000)
    body = (b'--x\r\nContent-Disposition: form-data; name="f"; filename="new"\r\n\r\n' + content
            + b"\r\n--x--\r\n")
    query = f"{FILES}upload&path=/own&_sid={sid}"

    def remove():
        (home / "new").unlink(missing_ok=True)

    answer = both(query, remove, body=body, CONTENT_TYPE=MULTIPART)
    assert answer_of(answer)["success"] and (home / "new").read_bytes() == content
    both(query, body=body, CONTENT_TYPE=MULTIPART)  # it is there
    both(f"{query}&existing=replace", body=body, CONTENT_TYPE=MULTIPART)
    both(query, remove, body=body[:-30], CONTENT_TYPE=MULTIPART)
    both(f"{FILES}upload&path=/own", body=body, CONTENT_TYPE=MULTIPART)


def test_CompoundRequests_OfAUser_AreAnsweredAlike(both, sid):
    entries = [{"api": "QELO.Access.Session", "version": 1, "method": "current"},
               {"api": "QELO.Files.Item", "version": 1, "method": "list", "path": "/own"},
               {"api": "QELO.Host.Info", "version": 1, "method": "get"},
               {"api": "QELO.No.Such", "version": 1, "method": "x"}]
    for mode in ("sequential", "parallel"):
        call = {"api": "QELO.Entry.Request", "version": 1, "method": "request", "_sid": sid,
                "mode": json.dumps(mode), "compound": json.dumps(entries)}
        answer = answer_of(both(body=urlencode(call).encode()))
        assert len(answer["data"]["result"]) == 4


@pytest.mark.parametrize("isolation", ["process", "worker"])
@pytest.mark.parametrize("library", FAULTY)
def test_LibrariesThatMisbehave_DoSoAlike(both, describe, library, isolation):
    describe("QELO.Test.Call", library, methods={"1": [{"run": {"isolation": isolation}}]})
    for _ in range(2):  # the second may have a worker that is there already
        both("api=QELO.Test.Call&version=1&method=run")


@pytest.mark.parametrize("isolation", ["process", "worker"])
def test_Redirects_AreAlike(both, describe, isolation):
    describe("QELO.Test.Call", "redirecting.so", methods={"1": [{"run": {"isolation": isolation}}]})
    answer = both("api=QELO.Test.Call&version=1&method=run&to=%22/there?x=1%22", HTTP_HOST="nas.example:81",
                  SERVER_NAME="nas.example", SERVER_PORT="81")
    assert b"Location: " in answer


def test_Settings_CountAlikeAtOnce(both, sid):
    settings = ROOT / "etc" / "qeloinfo.conf"
    former = settings.read_text()
    try:
        settings.write_text(former.replace('language="enu"', 'language="ger"'))
        assert b'"ger"' in both(f"{SESSION}&_sid={sid}")
    finally:
        settings.write_text(former)
