"""What the README shows works as it stands there."""

import json
import os
import re
import shutil
import subprocess
from pathlib import Path

from conftest import BUILD, DESCRIPTIONS, SOURCE
from documents import broken_links

README = (SOURCE / "README.md").read_text()
DOWNLOADS = (SOURCE / "docs" / "downloads.md").read_text()
PARAMETERS = (SOURCE / "docs" / "parameters.md").read_text()
SHARING = (SOURCE / "docs" / "sharing.md").read_text()
PORT = "127.0.0.1:8080"


def block(name, text=README):
    """The code blocks that are marked for a test, joined."""
    found = re.findall(rf"<!-- test: {name} -->\n```\w+\n(.*?)```", text, re.DOTALL)
    assert found, name
    return "".join(found)


def run(script, directory, port):
    script = "set -e\n" + script.replace(PORT, f"127.0.0.1:{port}")
    script = script.replace("build/dev", str(BUILD))
    result = subprocess.run(
        ["bash", "-c", script], cwd=directory, capture_output=True, text=True, check=False
    )
    assert result.returncode == 0, result.stderr
    return result.stdout


def test_FirstCalls_Work(server, tmp_path):
    output = run(block("calls"), tmp_path, server.port)
    decoder = json.JSONDecoder()
    answers = []
    while output:
        answer, end = decoder.raw_decode(output)
        answers.append(answer["data"])
        assert output[end] == "\n", "else the reader's prompt stands behind the answer"
        output = output[end + 1 :]
    login, current, catalogue = answers
    assert set(login) == {"sid", "token", "user"}
    assert current["user"] == "alice"
    assert "QELO.Catalog.API" in {api["api"] for api in catalogue["apis"]}


def test_CallWithAccessToken_Works(server, root, tmp_path):
    preamble = f"URL=http://{PORT}/webapi/entry.cgi\n"
    answer = json.loads(run(preamble + block("token"), tmp_path, server.port))
    assert "hostName" in answer["data"]


def test_Files_GoInAndOut(server, root, alice, tmp_path):
    (tmp_path / "README.md").write_bytes(b"some text")
    preamble = f"URL=http://{PORT}/webapi/entry.cgi\nSID={alice['sid']}\n"
    try:
        upload, listing = run(preamble + block("files"), tmp_path, server.port).splitlines()
        assert [item["path"] for item in json.loads(upload)["data"]["items"]] == ["/own/README.md"]
        assert [item["name"] for item in json.loads(listing)["data"]["items"]] == ["README.md"]
        assert (tmp_path / "copy.md").read_bytes() == b"some text"
    finally:
        (root / "home" / "alice" / "README.md").unlink(missing_ok=True)


def test_BackgroundTask_IsWaitedForAndStopped(server, root, alice, tmp_path):
    preamble = f"URL=http://{PORT}/webapi/entry.cgi\nSID={alice['sid']}\n"
    seen, stopped = run(preamble + block("task"), tmp_path, server.port).splitlines()
    assert json.loads(seen)["data"]["info"]["api"] == "QELO.Work.Checksum"
    assert json.loads(stopped)["success"]


def test_SharedFolder_IsListedAndCopiedByAVisitor(server, root, alice, tmp_path):
    folder = root / "home" / "alice" / "photos"
    owner = (root / "home" / "alice").stat()
    folder.mkdir()
    (folder / "a.jpg").write_bytes(b"some picture")
    (tmp_path / "b.jpg").write_bytes(b"another")
    for path in (folder, folder / "a.jpg"):
        os.chown(path, owner.st_uid, owner.st_gid)
    preamble = f"URL=http://{PORT}/webapi/entry.cgi\nSID={alice['sid']}\n"
    script = block("sharing-owner", SHARING) + block("sharing-visitor", SHARING)
    try:
        listing, upload = run(preamble + script, tmp_path, server.port).splitlines()
        assert [item["name"] for item in json.loads(listing)["data"]["items"]] == ["a.jpg"]
        assert (tmp_path / "a.jpg").read_bytes() == b"some picture"
        assert [item["name"] for item in json.loads(upload)["data"]["items"]] == ["b.jpg"]
        assert (folder / "b.jpg").read_bytes() == b"another"
    finally:
        shutil.rmtree(folder)


def test_CompoundExample_Works(server, alice, tmp_path):
    text = (SOURCE / "docs" / "compound.md").read_text()
    preamble = f"URL=http://{PORT}/webapi/entry.cgi\nSID={alice['sid']}\n"
    answer = json.loads(run(preamble + block("compound", text), tmp_path, server.port))
    assert not answer["data"]["has_fail"]
    assert [result["method"] for result in answer["data"]["result"]] == ["current", "list"]


def test_FirstApiLibrary_IsBuiltAndAnswers(server, tmp_path):
    library = block("library")
    code = [line for line in library.splitlines() if line.strip()]
    assert len(code) <= 20, "it is announced as twenty lines"
    (tmp_path / "Hello.cpp").write_text(library)
    (tmp_path / "QELO.Hello.World.lib").write_text(block("description"))
    shutil.copytree(SOURCE / "include", tmp_path / "include")
    try:
        run(block("build"), tmp_path, server.port)
        answer = json.loads(run(block("greeting"), tmp_path, server.port))
        assert answer == {"success": True, "data": {"greeting": "Hello, Ann"}}
        number = block("greeting").replace("name=Ann", "name=5")
        assert json.loads(run(number, tmp_path, server.port))["error"]["code"] == 101
        text = block("greeting").replace("name=Ann", "name=%225%22")
        answer = json.loads(run(text, tmp_path, server.port))
        assert answer["data"]["greeting"] == "Hello, 5"
    finally:
        for name in ("Hello.so", "QELO.Hello.World.lib"):
            (DESCRIPTIONS / name).unlink(missing_ok=True)


def test_Download_IsBuiltAndSendsTheFile(server, alice, tmp_path):
    (tmp_path / "Download.cpp").write_text(block("download-library", DOWNLOADS))
    (tmp_path / "QELO.Hello.Download.lib").write_text(block("download-description", DOWNLOADS))
    shutil.copytree(SOURCE / "include", tmp_path / "include")
    preamble = f"URL=http://{PORT}/webapi/entry.cgi\nSID={alice['sid']}\n"
    call = block("download-call", DOWNLOADS)
    try:
        run(block("download-build", DOWNLOADS), tmp_path, server.port)
        run(preamble + call, tmp_path, server.port)
        assert (tmp_path / "hostname").read_bytes() == Path("/etc/hostname").read_bytes()
        absent = call.replace("/etc/hostname", "/no/such/file")
        run(preamble + absent, tmp_path, server.port)
        assert json.loads((tmp_path / "hostname").read_text())["error"]["code"] == 400
    finally:
        for name in ("Download.so", "QELO.Hello.Download.lib"):
            (DESCRIPTIONS / name).unlink(missing_ok=True)


def test_CheckedParameters_AreBuiltAndRefused(client, describe, tmp_path):
    table = """
#include <webapi/APIRequest.h>
#include <webapi/APIResponse.h>
#include <webapi/APITable.h>
%s
extern "C" QELO::_tag_API_TABLE* GetAPITable() {
  static QELO::_tag_API_TABLE table[] = {{"QELO.Test.Checks", 1, "connect", connect},
                                         {nullptr, 0, nullptr, nullptr}};
  return table;
}
"""
    (tmp_path / "Checks.cpp").write_text(table % block("checks", PARAMETERS))
    run("g++ -std=c++20 -Wall -Wextra -Werror -shared -fPIC -Wl,--no-undefined "
        f"-I{SOURCE}/include -I/usr/include/jsoncpp Checks.cpp -o Checks.so "
        f"{next(BUILD.rglob('libwebapi-ARDO5.so'))} -ljsoncpp", tmp_path, 0)
    describe("QELO.Test.Checks", methods={"1": ["connect"]}, lib=str(tmp_path / "Checks.so"))
    tmp_path.chmod(0o755)

    def connect(query):
        return client.get(f"api=QELO.Test.Checks&version=1&method=connect&{query}")

    assert connect("host=nas.example").data == {
        "target": "nas.example:443", "mode": "pull", "privileged": True}
    assert connect("host=%222001:db8::1%22&port=8080&mode=push").data == {
        "target": "2001:db8::1:8080", "mode": "push", "privileged": False}
    for query in ("", "host=", "host=null", "host=nas_1", "host=10.1", "host=%22nas%5Cu0000x%22",
                  "host=nas&port=65536", "host=nas&port=%22x%22", "host=nas&mode=both",
                  "host=nas&mode=null"):
        assert connect(query).code == 101, query


def test_Commands_AndLinks_Exist():
    for command in re.findall(r"^\./(\w+)", README, re.MULTILINE):
        assert (SOURCE / command).exists(), command
    folders = ("docs", "apis")
    documents = [path for folder in folders for path in (SOURCE / folder).rglob("*.md")]
    assert broken_links([*SOURCE.glob("*.md"), *sorted(documents)]) == []
