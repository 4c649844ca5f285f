"""Input that no honest client sends: each gets a whole HTTP answer with its documented error."""

import json
import time

import pytest

from client import PATH, answer_in
from conftest import DESCRIPTIONS, PLUGINS, answer_of, run_entry

OPEN = "api=QELO.Test.Open&version=1&method=plain"
FORM = "Content-Type: application/x-www-form-urlencoded\r\n"
LARGEST_VARIABLE = 128 * 1024  # bytes with name and NUL that Linux lets one variable have


def parameters_of(client, line):
    """What a method gets to see of a parameter line."""
    return client.post(f"{OPEN}&{line}").data["parameters"]


def post_head(length):
    return (
        f"POST {PATH} HTTP/1.1\r\nHost: x\r\nConnection: close\r\n{FORM}"
        f"Content-Length: {length}\r\n\r\n"
    ).encode()


def is_http_answer(received):
    return received.startswith((b"HTTP/1.1 ", b"HTTP/1.0 ")) and b"\r\n\r\n" in received


@pytest.mark.parametrize("query", ["%zz", f"{OPEN}&x=%zz", f"{OPEN}&x=%", f"{OPEN}&x=%4"])
def test_UnparsableQuery_IsBadInput(client, query):
    answer = client.get(query)
    assert answer.status == 200
    assert answer.json == {"success": False, "error": {"code": 101}}


@pytest.mark.parametrize("body", [f"{OPEN}&x=%zz", "%"])
def test_UnparsableBody_IsBadInput(client, body):
    assert client.post(body).json == {"success": False, "error": {"code": 101}}


@pytest.mark.parametrize(
    "query, code",
    [
        ("", 101),
        ("api=QELO.Test.Open", 101),
        ("api=QELO.Test.Open&version=1", 101),
        ("api=&version=1&method=plain", 101),
        ("api=QELO.Test.Open&version=0&method=plain", 101),
        ("api=QELO.Test.Open&version=-1&method=plain", 101),
        ("api=QELO.Test.Open&version=x&method=plain", 101),
        ("api=QELO.Test.Open&version=99999999999999999999&method=plain", 101),
        ("api=QELO.Test.Open&version=[1]&method=plain", 101),
        ("api=QELO.Test.Open&version=1&method=[]", 101),
        ("api={}&version=1&method=plain", 101),
        ("api=QELO.Test.Open&version=2&method=plain", 104),
        ("api=QELO.Test.Open&version=1&method=no", 103),
        ("api=QELO.No.Such&version=1&method=plain", 102),
        ("api=QELO.Test.Identity&version=2&method=plain", 103),
    ],
)
def test_IncompleteOrUnknownCall_GetsItsCode(client, query, code):
    assert client.get(query).code == code


@pytest.mark.parametrize(
    "api",
    [
        "../../../../etc/passwd",
        "../QELO.Test.Open",
        "..",
        "../../secret",
        "..%2F..%2Fsecret",
        "/etc/passwd",
        "QELO.Test/../QELO.Test.Open",
        "QELO.Test.Open%00",
        "*",
        "QELO.%2A",
        "QELO%0a.Test",
        "QELO.Test.Open.lib",
        pytest.param("A" * 5000, id="long"),
    ],
)
def test_ApiNameThatIsNoName_IsNoSuchApi(client, api):
    assert client.get(f"api={api}&version=1&method=plain").code in (101, 102)


def test_DescriptionOutsideTheDirectory_IsNotRead(client, root, describe):
    secret = {"QELO": {"lib": "", "minVersion": 1, "maxVersion": 1, "authLevel": 0, "methods": {
        "1": ["run"]}}}
    for folder in (root, DESCRIPTIONS.parent):
        (folder / "secret.lib").write_text(json.dumps({**secret, "../secret": secret["QELO"]}))
    for api in ("../secret", f"{root}/secret", "../../../../secret"):
        assert client.get(f"api={api}&version=1&method=run").code == 102, api
    for folder in (root, DESCRIPTIONS.parent):
        (folder / "secret.lib").unlink()


def entries_below(*directories):
    """All that stands there with its size and time, but for logs."""
    paths = [path for top in directories for path in (top, *top.rglob("*")) if path.suffix != ".log"]
    states = {path: path.lstat() for path in paths}
    return {path: (state.st_size, state.st_mtime_ns) for path, state in states.items()}


@pytest.fixture(scope="module")
def descriptions_out_of_reach(root):
    """Of APIs that are named as paths, where the names would lead."""
    description = {"lib": str(PLUGINS / "identity.so"), "minVersion": 1, "maxVersion": 1,
                   "authLevel": 0, "methods": {"1": ["plain"]}}
    above, below = DESCRIPTIONS.parent / "x.lib", DESCRIPTIONS / "a" / "b.lib"
    below.parent.mkdir()
    above.write_text(json.dumps({"../x": description}))
    below.write_text(json.dumps({"a/b": description}))
    yield
    above.unlink()
    below.unlink()
    below.parent.rmdir()


@pytest.mark.parametrize("verb", ["GET", "POST"])
@pytest.mark.parametrize(
    "api, code",
    [
        ("", 101),
        ("a%20b", 102),
        ("%20", 102),
        ("+", 102),
        ("%C3%84", 102),
        ("..", 102),
        ("../x", 102),
        ("a%2Fb", 102),
        ("%00", 102),
        pytest.param("A" * 5000, 102, id="long"),
    ],
)
def test_ApiNameOfStrangeLetters_GetsItsCodeAndWritesNothing(
    server, client, root, descriptions_out_of_reach, verb, api, code
):
    before = entries_below(root, server.directory)
    line = f"api={api}&version=1&method=plain"
    answer = client.get(line) if verb == "GET" else client.post(line)
    assert answer.status == 200
    assert answer.headers.get_all("Content-Type") == ['application/json; charset="UTF-8"']
    assert answer.json == {"success": False, "error": {"code": code}}
    assert entries_below(root, server.directory) == before


def test_QueryOfTenMebibytes_IsRefusedByTheServer(client):
    answer = client.raw(
        b"GET " + PATH.encode() + b"?x=" + b"a" * (10 << 20) + b" HTTP/1.1\r\nHost: x\r\n\r\n"
    )
    assert is_http_answer(answer)
    assert answer.split()[1] in (b"400", b"413", b"414", b"431")


def test_QueryOfSixtyKilobytes_IsAnsweredThroughTheServer(client):
    assert client.get(f"{OPEN}&x={'a' * 60_000}").code == 0


def test_QueryOfTheLargestSize_IsAnswered(root):
    query = f"{OPEN}&x="
    query += "a" * (LARGEST_VARIABLE - len("QUERY_STRING=") - len(query) - 1)
    assert answer_of(run_entry(query))["success"]


def test_BodyOfTenMebibytes_IsTakenWhole(client):
    value = parameters_of(client, "x=" + "a" * (10 << 20))["x"]
    assert len(value) == 10 << 20


def test_BodyShorterThanItsLength_IsTakenAsFarAsItCame(root):
    answer = answer_of(run_entry(body=f"{OPEN}&x=1".encode(), length=5000))
    assert answer["data"]["parameters"]["x"] == 1


def test_BodyShorterThanItsLength_DoesNotHangTheServer(client):
    started = time.monotonic()
    client.raw(post_head(5000) + OPEN.encode(), end_of_sending=True)
    client.raw(post_head(5000) + OPEN.encode())
    assert time.monotonic() - started < 20
    assert client.post(OPEN).code == 0


def test_BodyLongerThanItsLength_IsCutThere(client):
    body = f"{OPEN}&x=1"
    answer = answer_in(client.raw(post_head(len(body)) + body.encode() + b"23&y=2"))
    assert answer.status == 200
    assert answer.data["parameters"]["x"] == 1
    assert "y" not in answer.data["parameters"]


@pytest.mark.parametrize("length", ["-1", "-9223372036854775808", "x", "1x", "0x10", ""])
def test_LengthThatIsNoLength_IsRefusedByTheServer(client, length):
    received = client.raw(post_head(length) + OPEN.encode())
    assert is_http_answer(received)
    assert received.split()[1] in (b"400", b"411")


@pytest.mark.parametrize("length", ["9" * 18, "9" * 19, "9" * 30])
def test_HugeLength_IsRefusedByTheServer(client, length):
    received = client.raw(post_head(length) + OPEN.encode())
    assert is_http_answer(received)
    assert received.split()[1] in (b"400", b"413")


@pytest.mark.parametrize(
    "length", ["-1", "-9223372036854775808", "0", "", "x", "1x", "9" * 30, "9223372036854775807"]
)
def test_LengthThatIsNoLength_PassedOn_IsBadInput(root, length):
    answer = answer_of(run_entry(body=OPEN.encode(), length=length))
    assert answer == {"success": False, "error": {"code": 101}}


def test_NulInABody_EndsTheLine(client):
    answer = client.post(f"{OPEN}&x=1".encode() + b"\0&y=2")
    assert answer.data["parameters"]["x"] == 1
    assert "y" not in answer.data["parameters"]


def test_NulInAValue_NeverSplitsTheAnswer(client):
    answer = client.post(f"{OPEN}&x=a%00b&y=2")
    assert answer.code == 0
    assert answer.data["parameters"]["y"] == 2
    assert answer.data["parameters"]["x"] in ("a", "a\0b")


@pytest.mark.parametrize("value", ["%ff", "%c3", "%c3%28", "%ed%a0%80", "%f8%88%80%80%80"])
def test_InvalidUtf8_GivesAnAnswerInUtf8(client, value):
    answer = client.post(f"{OPEN}&x=a{value}b")
    answer.body.decode("utf-8")
    assert answer.json["success"]


def test_InvalidUtf8_InNamesOfTheCall_GivesAnAnswerInUtf8(client):
    for query in ("api=%ff&version=1&method=x", "api=QELO.Test.Open&version=1&method=%ff", "%ff"):
        answer = client.get(query)
        answer.body.decode("utf-8")
        assert answer.code in (101, 102, 103)


@pytest.mark.parametrize(
    "text",
    ["[" * 5000, "[" * 5000 + "]" * 5000, '{"a":' * 5000 + "1" + "}" * 5000],
    ids=["open lists", "lists", "objects"],
)
def test_ParameterThatNestsDeeply_StaysText(client, text):
    assert parameters_of(client, f"x={text}")["x"] == text


@pytest.mark.parametrize(
    "text, value",
    [
        ("1", 1),
        ("-7", -7),
        ("0.5", 0.5),
        ("true", True),
        ("null", None),
        ("[1,2]", [1, 2]),
        ('{"a":{}}', {"a": {}}),
        ('"text"', "text"),
        ("text", "text"),
        ("007", "007"),
        ("1e400", "1e400"),
        ("12345678901234567890123", "12345678901234567890123"),
        ("0.10000000000000000000001", "0.10000000000000000000001"),
        ("[1] x", "[1] x"),
        ("NaN", "NaN"),
        ("", ""),
    ],
)
def test_ParameterValues_BecomeJsonOnlyWhenTheyAreJsonWhole(client, text, value):
    assert parameters_of(client, f"x={text}")["x"] == value


@pytest.mark.parametrize(
    "header", [pytest.param("Cookie: " + "id=;" * 1000, id="many"), "Cookie: =;;;=", "Cookie: id=%zz", "X-Qelo-Token: \xff"]
)
def test_StrangeHeaders_AreAnswered(client, header):
    received = client.raw(
        f"GET {PATH}?{OPEN} HTTP/1.1\r\nHost: x\r\nConnection: close\r\n{header}\r\n\r\n".encode(
            "latin-1"
        )
    )
    assert received.startswith(b"HTTP/1.1 200")


def test_HeaderInjection_ByParameters_DoesNotReachTheWire(client):
    answer = client.get(f"{OPEN}&x=a%0d%0aSet-Cookie:%20id=stolen&_sid=a%0d%0aX-Bad:%201")
    assert "x-bad" not in answer.headers
    assert answer.headers.get_all("Set-Cookie") is None


@pytest.mark.parametrize("verb", ["HEAD", "PUT", "DELETE", "OPTIONS"])
def test_OtherMethods_AreAnswered(client, verb):
    answer = client.request(verb, f"{PATH}?{OPEN}")
    assert answer.status in (200, 405, 411, 501)


@pytest.mark.parametrize(
    "text",
    [
        "no json",
        "",
        pytest.param("[" * 5000, id="deep"),
        "[]",
        "null",
        "{}",
        '{"QELO.Test.Broken": 5}',
        '{"QELO.Test.Broken": {"lib": 5, "minVersion": 1, "maxVersion": 1, "methods": {}}}',
        '{"QELO.Test.Broken": {"lib": "", "minVersion": "1", "maxVersion": 1, "methods": {}}}',
        '{"QELO.Test.Broken": {"lib": "", "minVersion": 1, "maxVersion": 1, "methods": []}}',
        '{"QELO.Test.Broken": {"lib": "", "minVersion": 1, "maxVersion": 1, "methods": {},'
        ' "priority": 11}}',
    ],
)
def test_DescriptionThatIsNone_IsNoSuchApi(client, describe, text):
    describe("QELO.Test.Broken", text=text)
    assert client.get("api=QELO.Test.Broken&version=1&method=run").code == 102


@pytest.mark.parametrize("methods", [{"1": "run"}, {"1": 5}, {"1": {"run": {}}}, {"1": [5, None, []]}])
def test_DescriptionWithMethodsOfTheWrongType_IsNoSuchMethod(client, describe, methods):
    describe("QELO.Test.Broken", "identity.so", methods=methods)
    assert client.get("api=QELO.Test.Broken&version=1&method=run").code == 103


@pytest.mark.parametrize(
    "members",
    [
        {"authLevel": "x"},
        {"authLevel": []},
        {"authLevel": 1, "allowUser": "admin.local"},
        {"authLevel": 1, "allowUser": {"a": 1}},
        {"authLevel": 1, "appPriv": []},
    ],
)
def test_DescriptionWithPermissionsOfTheWrongType_IsRefusedWithoutLogin(client, describe, members):
    describe("QELO.Test.Open", "identity.so", methods={"1": ["plain"]}, **members)
    assert client.get(OPEN).code == 105


def test_DescriptionThatIsADirectory_IsNoSuchApi(client):
    directory = DESCRIPTIONS / "QELO.Test.Directory.lib"
    directory.mkdir()
    try:
        assert client.get("api=QELO.Test.Directory&version=1&method=run").code == 102
    finally:
        directory.rmdir()
