"""Uploads behind a real web server, as curl and others send them."""

import subprocess

import pytest

from accounts import account
from conftest import needs_root, session_of
from marks import mark  # noqa: F401
from upload import API, Form, checksum, files_of, left_behind, post, uploading

pytestmark = pytest.mark.usefixtures("described")

BUFFER = 256 << 10
PIPE = 64 << 10


@pytest.fixture
def described(describe):
    uploading(describe)


@pytest.fixture(autouse=True)
def nothing_is_left():
    yield
    assert left_behind() == []


def curl(client, *arguments, method="take", query=True):
    url = f"http://127.0.0.1:{client.port}/webapi/entry.cgi"
    if query:
        url += f"?api={API}&version=1&method={method}"
    result = subprocess.run(["curl", "-sS", url, *arguments], capture_output=True, check=True, text=True)
    return result.stdout


@pytest.mark.parametrize("method", ["take", "defer"])
@pytest.mark.parametrize("size", sorted(
    {0, 1, *(edge + off for edge in (PIPE, BUFFER, 2 * BUFFER) for off in (-200, -74, -2, -1, 0, 1))}))
def test_FileOfAnySize_ArrivesWhole(client, method, size):
    content = bytes(index * 7 % 251 for index in range(1009)) * (size // 1009 + 1)
    content = content[:size]
    (file,) = files_of(post(client, Form().file("f", "x.bin", content), method))
    assert (file["size"], file["sum"], file["name"]) == (size, checksum(content), "x.bin")


@pytest.mark.parametrize("method", ["take", "defer"])
def test_FieldsAndFiles_InAnyOrder(client, method):
    form = (Form().field("n", "5").file("f", "a.txt", b"one").field("t", "text")
            .file("g", "ü 日本.txt", b"").field("last", "[1]"))
    data = post(client, form, method).data
    assert {"n": 5, "t": "text", "last": [1]}.items() <= data["params"].items()
    assert [(file["field"], file["name"], file["size"]) for file in data["files"]] == [
        ("f", "a.txt", 3), ("g", "ü 日本.txt", 0)]
    assert data["params"]["f"] == data["files"][0]["path"]


def test_Curl_SendsSeveralFilesOfOneField(client, tmp_path):
    for name in ("one.txt", 'with "quotes" and \\.txt'):
        (tmp_path / name).write_text(name)
    # A file name with quotes as curl escapes it, in either way.
    for escape in ([], ["--form-escape"]):
        quoted = str(tmp_path / 'with "quotes" and \\.txt').replace("\\", "\\\\").replace('"', '\\"')
        answer = curl(client, *escape, "-F", f"f=@{tmp_path}/one.txt", "-F", f'f=@"{quoted}"')
        assert '"one.txt"' in answer, answer
        assert 'f[1]' in answer, answer


def test_CallInFieldsInFrontOfTheFile_IsMade(client):
    sid = session_of(client, "alice")["sid"]
    form = (Form().field("_sid", sid).field("api", API).field("extra", "1").field("version", "1")
            .field("method", "user").file("f", "x", b"content").field("behind", "2"))
    data = post(client, form, None).data
    assert data["params"]["extra"] == 1
    assert data["params"]["behind"] == 2
    assert data["files"][0]["sum"] == checksum(b"content")


def test_CallInFields_WithoutAFile_IsMade(client):
    form = Form().field("api", API).field("version", "1").field("method", "take").field("n", "5")
    data = post(client, form, None).data
    assert data["params"]["n"] == 5
    assert data["files"] == []


def test_DeferredMethod_GetsTheFieldsThatNamedItsCall(client):
    form = (Form().field("api", API).field("version", "1").field("method", "defer").field("n", "5")
            .file("f", "x", b"content"))
    data = post(client, form, None).data
    assert data["params"]["n"] == 5
    assert data["files"][0]["size"] == 7


def test_FieldsBehindTheCheck_DoNotChangeTheCall(client):
    form = (Form().file("f", "x", b"").field("api", "QELO.Host.Info").field("method", "get")
            .field("version", "9"))
    data = post(client, form).data
    assert (data["params"]["api"], data["params"]["method"], data["params"]["version"]) == (API, "take", 1)


def test_PathOfAField_IsNoFile(client):
    data = post(client, Form().field("f", "/etc/passwd").file("g", "x", b"")).data
    assert data["params"]["f"] == "/etc/passwd"
    assert [file["field"] for file in data["files"]] == ["g"]


@needs_root
def test_Files_AreTheMethods(client):
    sid = session_of(client, "alice")["sid"]
    form = Form().file("f", "x", b"content")
    for method, owner in (("take", "system"), ("user", "alice"), ("root", "root"), ("defer", "system")):
        data = post(client, form, method, _sid=sid).data
        assert data["files"][0]["mode"] == 0o600
        assert (data["files"][0]["uid"], data["euid"]) == (account(owner)[0],) * 2, method


def test_RenamedFile_IsKept(client, mark):
    mark.parent.chmod(0o777)
    target = mark.parent / "kept"
    form = Form().file("f", "x", b"content")
    answer = post(client, form, "keep", target=str(target))
    if answer.code == 400:
        pytest.skip("the temporary directory is on another file system")
    assert target.read_bytes() == b"content"


def test_DeferredMethod_IsToldOfProgress(client):
    form = Form().file("f", "x", b"c" * 3_000_000)
    assert post(client, form, "defer").data["done"] == len(form.body())


@pytest.mark.parametrize("form, result", [
    (b"", -6),
    (b"rubbish", -3),
    (b"--other\r\n\r\n--other--", -3),
    (Form().file("f", "x", b"1").body()[:-4], -3),
    (Form().file("f", "..", b"1").body(), -3),
    (Form().file("f" * 64, "x", b"1").body(), -4),
    (Form().file("f", "x" * 491, b"1").body(), -4),
    (Form().field("f", "\0").body(), -3),
    (Form().field("f", "1" * (1 << 20)).body(), -4),
])
def test_BodyThatIsRefused_SaysWhy(client, form, result):
    answer = post(client, form)
    assert answer.json["error"] == {"code": 108, "errors": {"upload_err": result}}


def test_FieldsInFront_ThatCannotBeRead_Are101(client):
    assert post(client, b"rubbish", None).code == 101


def test_UnknownCaller_IsRefusedBeforeAFileIsMade(client, describe):
    uploading(describe, level=1)
    assert post(client, Form().file("f", "x", b"c" * 100_000), "user").code == 105
