"""What the README shows works as it stands there."""

import json
import re
import shutil
import subprocess

from conftest import DESCRIPTIONS, SOURCE

README = (SOURCE / "README.md").read_text()
PORT = "127.0.0.1:8080"


def block(name, text=README):
    """The code blocks that are marked for a test, joined."""
    found = re.findall(rf"<!-- test: {name} -->\n```\w+\n(.*?)```", text, re.DOTALL)
    assert found, name
    return "".join(found)


def run(script, directory, port):
    script = "set -e\n" + script.replace(PORT, f"127.0.0.1:{port}")
    script = script.replace("build/dev/root/usr/qelo/qeloman/webapi", str(DESCRIPTIONS))
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
        output = output[end:]
    login, current, catalogue = answers
    assert set(login) == {"sid", "token", "user"}
    assert current["user"] == "alice"
    assert "QELO.Catalog.API" in {api["api"] for api in catalogue["apis"]}


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
    finally:
        for name in ("Hello.so", "QELO.Hello.World.lib"):
            (DESCRIPTIONS / name).unlink(missing_ok=True)


def test_Commands_AndLinks_Exist():
    for command in re.findall(r"^\./(\w+)", README, re.MULTILINE):
        assert (SOURCE / command).exists(), command
    for link in re.findall(r"\]\(([^)#]+)\)", README):
        assert link.startswith("http") or (SOURCE / link).exists(), link
