"""QELO.Files.Item and visitors who want more than is theirs: nothing outside of the shared folder is
read or written, and the error says why."""

import json
import os
import shutil
import subprocess
import threading
from urllib.parse import urlencode

import pytest

from conftest import ENTRY, answer_of, needs_root
from files import (API, BAD_NAMES, alice, bob, common, give, give_folder, home,  # noqa: F401
                   outside, put)

WAYS_OUT = ["/own/..", "/own/../bob", "/own/a/../../bob", "/..", "../etc", "/own/./a", "//etc",
            "/own//a", "", "home", "/etc/../home", "/own/\x00/a", "/own/a\x00"]


@pytest.mark.parametrize("path", WAYS_OUT)
def test_PathThatLeadsElsewhere_IsRefused(alice, path):
    for method in ("list", "stat", "create_folder"):
        answer = alice.call(method, path=path)
        assert answer.json["error"]["errors"]["reason"] in ("bad_path", "no_share", "bad_name")
    assert alice.refused("rename", path=path, name="x")[0] in ("bad_path", "no_share")


@pytest.mark.parametrize("name", BAD_NAMES)
def test_NameThatIsNone_IsRefused(alice, home, name):
    put(home / "file")
    before = sorted(os.listdir(home))
    assert alice.refused("rename", path="/own/file", name=name)[0] == "bad_name"
    assert alice.call("create_folder", path=f"/own/{name}").code in (400, 401, 402, 404, 420)
    assert sorted(os.listdir(home)) == before


def test_LongestName_IsServedAndOneMoreIsRefused(alice, home):
    name = "x" * 255
    assert alice.call("create_folder", path=f"/own/{name}").code == 0
    assert alice.names(f"/own/{name}") == []
    assert alice.refused("stat", path=f"/own/{name}x")[0] == "bad_path"
    assert alice.refused("list", path="/" + "x/" * 3000)[0] == "bad_path"
    assert alice.refused("list", path="/own" + "/x" * 64)[0] == "too_deep"


def test_NotUtf8_IsNoNewName(alice, home):
    query = f"api={API}&version=1&method=create_folder&_sid={alice.sid}&path=/own/na%EFve"
    answer = alice.client.get(query)
    assert answer.json["error"]["errors"]["reason"] == "bad_name"
    assert b"\xef\xbf\xbd" in answer.body, "what is shown of it is UTF-8"


def test_LinkOutOfTheFolder_IsNotFollowed(alice, home, outside):
    (home / "link").symlink_to(outside)
    (home / "file").symlink_to(outside / "secret")
    (home / "up").symlink_to("..")
    (home / "magic").symlink_to("/proc/self/root")
    for name in ("link", "up", "magic"):
        assert alice.refused("list", path=f"/own/{name}") == ("link", f"/own/{name}")
    assert alice.refused("stat", path="/own/link/secret")[0] == "link"
    assert alice.refused("list", path="/own/file")[0] == "link"
    assert alice.refused("rename", path="/own/link/secret", name="x")[0] == "link"
    assert alice.refused("create_folder", path="/own/link/x")[0] == "link"
    assert alice.call("stat", path="/own/file").data["items"][0]["type"] == "link"


def test_LinkPlantedDuringTheCall_LeadsNowhere(alice, home, outside):
    give_folder(home / "swap")
    give_folder(home / "swap" / "inner")
    (home / "link").symlink_to(outside)
    ends = threading.Event()

    def plant():
        while not ends.is_set():
            os.rename(home / "swap", home / "kept")
            os.rename(home / "link", home / "swap")
            os.rename(home / "swap", home / "link")
            os.rename(home / "kept", home / "swap")

    planter = threading.Thread(target=plant)
    planter.start()
    try:
        for number in range(40):
            answer = alice.call("list", path="/own/swap")
            if answer.code == 0:
                assert "secret" not in [item["name"] for item in answer.data["items"]]
            alice.call("create_folder", path=f"/own/swap/made{number}")
            alice.call("rename", path="/own/swap/secret", name="taken")
    finally:
        ends.set()
        planter.join()


def test_SharedFolderReplacedByALink_IsRefused(alice, root, outside):
    common = root / "srv" / "common"
    aside = root / "srv" / "aside"
    common.rename(aside)
    try:
        common.symlink_to(outside)
        assert alice.refused("list", path="/common") == ("share_broken", "/common")
        assert alice.refused("create_folder", path="/common/x")[0] == "share_broken"
        assert alice.refused("stat", path="/common/secret")[0] == "share_broken"
        common.unlink()
        assert alice.refused("list", path="/common") == ("share_broken", "/common")
        common.write_text("a file")
        assert alice.refused("list", path="/common") == ("share_broken", "/common")
    finally:
        common.unlink(missing_ok=True)
        aside.rename(common)


def test_HardLink_IsAFileLikeOthers(alice, home, root):
    """It cannot be told from the file's first name; the user's rights on the file decide."""
    os.link(put(root / "home" / "alice" / "first", b"x"), home / "second")
    give(home / "second")
    item = alice.call("stat", path="/own/second").data["items"][0]
    assert (item["type"], item["links"]) == ("file", 2)


def test_PipesAndDevices_AreShownAndNeverOpened(alice, home):
    os.mkfifo(home / "pipe")
    give(home / "pipe")
    assert alice.call("stat", path="/own/pipe").data["items"][0]["type"] == "special"
    assert alice.refused("list", path="/own/pipe") == ("not_a_folder", "/own/pipe")
    assert alice.refused("create_folder", path="/own/pipe/x")[0] == "not_a_folder"


@needs_root
def test_MountsInTheFolder_AreNotEntered(alice, home, outside):
    give_folder(home / "mnt")
    query = {"api": API, "version": 1, "_sid": alice.sid, "to": "/common"}

    def call(method, path):
        """From a process that sees a mount which nobody else sees."""
        variables = {"REQUEST_METHOD": "GET", "REMOTE_ADDR": "127.0.0.1",
                     "QUERY_STRING": urlencode({**query, "method": method, "path": path})}
        script = f'mount --bind "{outside}" "{home}/mnt" && exec "{ENTRY}"'
        result = subprocess.run(["unshare", "-m", "sh", "-c", script], capture_output=True, check=True,
                                timeout=30, env={**variables, "PATH": os.environ["PATH"]})
        return answer_of(result.stdout)

    if subprocess.run(["unshare", "-m", "true"], check=False).returncode != 0:
        pytest.skip("mounts of one's own are not allowed here")
    for method, path in (("list", "/own/mnt"), ("stat", "/own/mnt/secret"),
                         ("create_folder", "/own/mnt/x")):
        assert call(method, path)["error"]["errors"] == {"path": path, "reason": "mount"}
    assert call("stat", "/own/mnt")["data"]["items"] == [
        {"name": "mnt", "path": "/own/mnt", "type": "mount"}]
    assert "secret" not in json.dumps(call("list", "/own"))
    for method in ("copy", "move", "remove", "download"):
        assert call(method, "/own/mnt")["error"]["errors"]["reason"] == "mount"


def test_FolderThatGoesAwayDuringTheCall_IsNotFound(alice, home):
    ends = threading.Event()

    def come_and_go():
        while not ends.is_set():
            (home / "here").mkdir()
            shutil.rmtree(home / "here")

    thread = threading.Thread(target=come_and_go)
    thread.start()
    try:
        codes = {alice.call("list", path="/own/here").code for _ in range(30)}
    finally:
        ends.set()
        thread.join()
    assert codes <= {0, 404, 405}


@needs_root
def test_FullDisk_IsToldAndLeavesNothing(alice, home, root):
    """By processes that see a disk of 1 MiB in the place of a shared folder."""
    if subprocess.run(["unshare", "-m", "true"], check=False).returncode != 0:
        pytest.skip("mounts of one's own are not allowed here")
    put(home / "large", os.urandom(2 << 20))
    share = root / "srv" / "common"
    script = (f'mount -t tmpfs -o size=1m,mode=0777 none "{share}" && "{ENTRY}" && '
              f'test -z "$(ls -A "{share}")"')

    def call(method, body=b"", **variables):
        query = urlencode({"api": API, "version": 1, "_sid": alice.sid, "method": method,
                           **variables.pop("query")})
        result = subprocess.run(
            ["unshare", "-m", "sh", "-c", script], input=body, capture_output=True, check=True,
            timeout=30, env={"REQUEST_METHOD": "POST", "REMOTE_ADDR": "127.0.0.1",
                             "QUERY_STRING": query, "CONTENT_LENGTH": str(len(body)),
                             "PATH": os.environ["PATH"], **variables})
        return answer_of(result.stdout)["error"]

    query = {"path": "/own/large", "to": "/common"}
    errors = call("copy", REQUEST_METHOD="GET", query=query)["errors"]
    assert (errors["path"], errors["reason"]) == ("/own/large", "full")
    form = (b'--x\r\nContent-Disposition: form-data; name="f"; filename="file"\r\n\r\n'
            + os.urandom(2 << 20) + b"\r\n--x--\r\n")
    error = call("upload", form, CONTENT_TYPE="multipart/form-data; boundary=x",
                 query={"path": "/common"})
    assert error == {"code": 413, "errors": {"path": "/common/file", "reason": "full"}}
    error = call("tus", HTTP_TUS_RESUMABLE="1.0.0", HTTP_UPLOAD_LENGTH=str(2 << 20),
                 query={"path": "/common", "name": "file"})
    assert error["errors"]["reason"] == "full"
