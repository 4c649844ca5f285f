"""QELO.Files.Item: uploads that go on where they were broken off, by the protocol tus 1.0."""

import base64
import fcntl
import hashlib
import json
import os
import subprocess
import time

import pytest

from client import Client
from conftest import ENTRY
from files import Visitor, bob, common, give, give_folder, home, put  # noqa: F401  (fixtures)
from tus import BODY, Uploader, wait_for_offset
from webserver import WebServer

@pytest.fixture(scope="module")
def streaming(root, tmp_path_factory):
    """A web server that passes a body on while it arrives."""
    server = WebServer(tmp_path_factory.mktemp("streaming"), ENTRY,
                       "server.stream-request-body = 2\nserver.max-read-idle = 3\n")
    yield server.start()
    server.stop()


@pytest.fixture
def alice(streaming, home):  # noqa: F811
    visitor = Visitor(Client(streaming.port), "alice")
    uploads = home / ".webapi" / "uploads"
    for file in uploads.glob("*"):
        file.unlink()
    return visitor


def unfinished(folder):
    return [name for name in os.listdir(folder) if name.startswith(".qelo-part-")]


def states(home):  # noqa: F811
    return sorted((home / ".webapi" / "uploads").glob("*.json"))


def test_Options_TellsWhatThereIs(alice):
    answer = Uploader(alice).request("OPTIONS", Uploader(alice).endpoint, Tus_Resumable=None)
    assert answer.status == 204
    assert answer.headers["Tus-Version"] == "1.0.0"
    assert set(answer.headers["Tus-Extension"].split(",")) == {
        "creation", "termination", "checksum", "expiration"}
    assert "sha1" in answer.headers["Tus-Checksum-Algorithm"].split(",")


def test_Upload_InTwoPieces_IsAFileWhenItIsWhole(alice, home):
    content = os.urandom(700_001)
    upload = Uploader(alice)
    answer = upload.create("größe.bin", len(content))
    assert answer.status == 201
    assert answer.headers["Tus-Resumable"] == "1.0.0"
    assert answer.headers["Upload-Expires"].endswith("GMT")
    assert upload.offset() == 0
    answer = upload.patch(0, content[:300_000])
    assert (answer.status, answer.headers["Upload-Offset"], answer.content) == (204, "300000", b"")
    assert upload.offset() == 300_000
    assert not (home / "größe.bin").exists()
    assert "größe.bin" not in alice.names("/own")
    (part,) = unfinished(home)
    assert (home / part).stat().st_mode & 0o777 == 0o600
    assert (states(home)[0].stat().st_mode & 0o777) == 0o600
    answer = upload.patch(300_000, content[300_000:])
    assert (answer.status, answer.headers["Upload-Offset"]) == (204, "700001")
    assert (home / "größe.bin").read_bytes() == content
    assert (home / "größe.bin").stat().st_uid == home.stat().st_uid
    assert (home / "größe.bin").stat().st_mode & 0o777 == 0o644
    assert unfinished(home) == []
    assert upload.offset() == len(content), "a client that missed the last answer learns it"


def test_EmptyUpload_IsAFileAtOnce(alice, home):
    assert Uploader(alice).create("empty", 0).status == 201
    assert (home / "empty").read_bytes() == b""
    assert unfinished(home) == []


def test_BrokenConnection_KeepsWhatHasArrived(alice, home):
    content = os.urandom(4 << 20)
    upload = Uploader(alice)
    upload.create("file", len(content))
    upload.break_off(0, content[:1_500_000], len(content))
    offset = wait_for_offset(upload)
    assert 0 < offset <= 1_500_000
    assert not (home / "file").exists()
    assert upload.patch(offset, content[offset:]).status == 204
    assert (home / "file").read_bytes() == content


def test_WrongOffset_IsRefused(alice):
    upload = Uploader(alice)
    upload.create("file", 10)
    assert upload.patch(3, b"x").status == 409
    assert upload.patch("x", b"x").status == 400
    assert upload.patch(0, b"12345").status == 204
    assert upload.patch(0, b"12345").status == 409
    assert upload.offset() == 5


def test_MoreThanAnnounced_IsRefused(alice, home):
    upload = Uploader(alice)
    upload.create("file", 10)
    assert upload.patch(0, b"x" * 11).status == 413
    assert not (home / "file").exists()


def test_AnotherTypeOrVersion_IsRefused(alice):
    upload = Uploader(alice)
    upload.create("file", 10)
    assert upload.patch(0, b"x", Content_Type="text/plain").status == 415
    answer = upload.request("HEAD", Tus_Resumable="0.2.2")
    assert (answer.status, answer.headers["Tus-Version"]) == (412, "1.0.0")
    assert upload.request("GET").status == 405


def test_Delete_EndsTheUpload(alice, home):
    upload = Uploader(alice)
    upload.create("file", 10)
    upload.patch(0, b"12345")
    assert upload.request("DELETE").status == 204
    assert unfinished(home) == [] and states(home) == []
    assert upload.request("HEAD").status == 404
    assert upload.request("DELETE").status == 404
    assert upload.patch(5, b"67890").status == 404


def test_MethodOverride_DoesAsTheMethod(alice, home):
    upload = Uploader(alice)
    upload.create("file", 5)
    answer = upload.request("POST", body=b"12345", X_HTTP_Method_Override="PATCH",
                            Upload_Offset="0", Content_Type=BODY)
    assert answer.status == 204
    assert (home / "file").read_bytes() == b"12345"
    upload.create("other", 5)
    assert upload.request("POST", X_HTTP_Method_Override="DELETE").status == 204


@pytest.mark.parametrize("algorithm", ["sha1", "sha256"])
def test_Checksum_IsCheckedBeforeAnythingCounts(alice, home, algorithm):
    def checksum(data):
        digest = hashlib.new(algorithm, data).digest()
        return {"Upload_Checksum": f"{algorithm} {base64.b64encode(digest).decode()}"}

    upload = Uploader(alice)
    upload.create("file", 10)
    assert upload.patch(0, b"12345", **checksum(b"12345")).status == 204
    assert upload.patch(5, b"67890", **checksum(b"other")).status == 460
    assert upload.offset() == 5
    upload.break_off(5, b"678", 5, **checksum(b"67890"))
    assert wait_for_offset(upload) == 5
    assert upload.patch(5, b"x", Upload_Checksum="crc7 AAAA").status == 400
    assert upload.patch(5, b"x", Upload_Checksum=algorithm).status == 400
    assert upload.offset() == 5
    assert upload.patch(5, b"67890", **checksum(b"67890")).status == 204
    assert (home / "file").read_bytes() == b"1234567890"


def test_ProcessKilledBeforeTheChecksum_LeavesNothingUnchecked(alice, home):
    upload = Uploader(alice)
    upload.create("file", 10)
    upload.patch(0, b"12345")
    (state,) = states(home)
    (part,) = unfinished(home)
    record = json.loads(state.read_text())
    record["checked"] = 5  # as a process leaves it that dies in the middle
    state.write_text(json.dumps(record))
    with open(home / part, "ab") as file:
        file.write(b"???")
    assert upload.offset() == 5
    assert (home / part).read_bytes() == b"12345"


def test_NameThatIsTaken_IsRefusedReplacedOrLeft(alice, home):
    put(home / "file", b"old")
    refused = Uploader(alice).create("file", 3)
    assert refused.status == 409
    assert json.loads(refused.content)["error"]["errors"] == {"path": "/own/file", "reason": "exists"}
    skipped = Uploader(alice, query={"existing": "skip"})
    assert skipped.create("file", 3).status == 201
    assert skipped.patch(0, b"new").status == 204
    assert (home / "file").read_bytes() == b"old"
    replaced = Uploader(alice, query={"existing": "replace"})
    replaced.create("file", 3)
    assert replaced.patch(0, b"ne").status == 204
    assert (home / "file").read_bytes() == b"old"
    assert replaced.patch(2, b"w").status == 204
    assert (home / "file").read_bytes() == b"new"
    assert unfinished(home) == []


def test_NameTakenMeanwhile_IsNotReplacedAndTheDataStays(alice, home):
    upload = Uploader(alice)
    upload.create("file", 3)
    put(home / "file", b"old")
    assert upload.patch(0, b"new").status == 409
    assert upload.request("HEAD").status == 409
    assert (home / "file").read_bytes() == b"old"
    (home / "file").unlink()
    assert upload.offset() == 3, "and it is finished"
    assert (home / "file").read_bytes() == b"new"


@pytest.mark.parametrize("name", ["", "..", "a/b", "../x", "a\x00b", "a\nb", "x" * 256, ".qelo-part-x"])
def test_NameThatIsNone_IsRefused(alice, home, name):
    before = sorted(os.listdir(home))
    assert Uploader(alice).create(name, 3).status == 400
    assert sorted(os.listdir(home)) == before


@pytest.mark.parametrize("length", ["", "-1", "x", "1" * 30])
def test_LengthThatIsNone_IsRefused(alice, length):
    assert Uploader(alice).create("file", length).status == 400


def test_TooLarge_IsRefused(alice, home):
    assert Uploader(alice).create("file", (1 << 44) + 1).status == 413
    assert Uploader(alice).create("file", 1 << 44).status == 507, "no disk has that much room"
    assert unfinished(home) == []


def test_FolderThatCannotBeWritten_IsRefused(alice, root):
    for folder, status in ((7, 400), ("/public", 403), ("/none", 404), ("/own/none", 404), ("/", 404),
                           ("/own/..", 400)):
        assert Uploader(alice, folder).create("file", 3).status == status, folder


def test_RecordThatTheUserHasForged_LeadsNowhere(alice, home, root):
    upload = Uploader(alice)
    upload.create("file", 3)
    (state,) = states(home)
    record = json.loads(state.read_text())
    for forged in ({"path": "/own/../x"}, {"path": "/public/file"}, {"data": "file"},
                   {"data": ".qelo-part-/../../../bob/x"}, {"path": "/own/a\nb"}, {"data": 7}):
        state.write_text(json.dumps({**record, **forged}))
        assert upload.patch(0, b"new").status in (403, 404), forged
    state.write_text("no JSON")
    assert upload.patch(0, b"new").status == 404
    assert os.listdir(root / "srv" / "public") == []
    state.write_text(json.dumps(record))
    assert upload.patch(0, b"new").status == 204


def test_UploadOfAnother_IsNotFound(alice, streaming, common):
    upload = Uploader(alice, "/common")
    upload.create("file", 10)
    other = Visitor(Client(streaming.port), "bob")
    thief = Uploader(other, "/common")
    thief.location = upload.location.replace(alice.sid, other.sid)
    for answer in (thief.request("HEAD"), thief.patch(0, b"x"), thief.request("DELETE")):
        assert answer.status == 404
    assert upload.offset() == 0


def test_PartReplacedByALinkOrAnotherFile_IsNotWritten(alice, home, tmp_path):
    secret = put(tmp_path / "secret", b"secret")
    tmp_path.chmod(0o777)
    upload = Uploader(alice)
    plants = [lambda part: part.symlink_to(secret), lambda part: os.link(secret, part),
              lambda part: os.mkfifo(part)]
    if os.geteuid() == 0:
        plants.append(lambda part: put(part, name="bob"))
    for plant in plants:
        upload.create("file", 10)
        (name,) = unfinished(home)
        (home / name).unlink()
        plant(home / name)
        assert upload.patch(0, b"1234567890").status in (403, 404, 409)
        assert secret.read_bytes() == b"secret"
        (home / name).unlink()
    assert not (home / "file").exists()


def test_SecondRequestOfAnUpload_IsToldThatItIsBusy(alice, home):
    upload = Uploader(alice)
    upload.create("file", 10)
    (name,) = unfinished(home)
    with open(home / name, "rb") as file:
        fcntl.flock(file, fcntl.LOCK_EX)
        assert upload.patch(0, b"1").status == 423
        assert upload.request("HEAD").status == 423
    assert upload.offset() == 0


def test_ExpiredUploads_AreSweptByLaterOnes(alice, home):
    old = Uploader(alice)
    old.create("old", 10)
    (name,) = unfinished(home)
    week = time.time() - 8 * 24 * 3600
    os.utime(home / name, (week, week))
    new = Uploader(alice)
    assert new.create("new", 10).status == 201
    assert len(unfinished(home)) == 1 and not (home / name).exists()
    assert old.request("HEAD").status == 404
    assert new.offset() == 0


def test_UnfinishedUploads_HaveALimit(alice, home):
    upload = Uploader(alice)
    upload.create("file", 10)
    (state,) = states(home)
    (part,) = unfinished(home)
    for number in range(99):
        copy = home / f"{part[:-3]}{number:03}"
        record = json.loads(state.read_text())
        record.update(data=copy.name, inode=put(copy).stat().st_ino)
        put(state.with_name(f"{number:032x}.json"), json.dumps(record).encode()).chmod(0o600)
    assert Uploader(alice).create("more", 10).status == 429
    assert upload.request("DELETE").status == 204
    assert Uploader(alice).create("more", 10).status == 201


def test_BodyOfTheAnnouncedLength_IsNotWaitedBehind(alice, home):
    """The server may keep the pipe open that the body comes by."""
    upload = Uploader(alice)
    upload.create("file", 100)
    variables = {"REQUEST_METHOD": "PATCH", "REMOTE_ADDR": "127.0.0.1", "CONTENT_TYPE": BODY,
                 "QUERY_STRING": upload.location.split("?", 1)[1], "CONTENT_LENGTH": "5",
                 "HTTP_TUS_RESUMABLE": "1.0.0", "HTTP_UPLOAD_OFFSET": "0"}
    with subprocess.Popen([ENTRY], stdin=subprocess.PIPE, stdout=subprocess.PIPE,
                          env=variables) as process:
        process.stdin.write(b"12345")
        process.stdin.flush()
        answer = process.stdout.read()
    assert b"Upload-Offset: 5" in answer
    assert upload.offset() == 5


def test_BodyLeftUnread_LosesNoAnswer(alice):
    upload = Uploader(alice)
    upload.create("file", 10)
    assert upload.patch(5, b"x" * 3_000_000).status == 409


def test_NobodyLoggedIn_IsRefused(alice):
    upload = Uploader(alice)
    upload.endpoint = upload.endpoint.replace(alice.sid, "x" * 20)
    assert json.loads(upload.request("POST", upload.endpoint, Upload_Length="3").content)["error"]["code"] in (
        105, 119)
