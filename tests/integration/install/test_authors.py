"""An author's way from an empty folder to an API that answers, by the installed package alone."""

import json
import os
import subprocess

import pytest

from author_program import webapi
from conftest import SOURCE, needs_root
from installed import OVERLAYS, prefix, run, stage, step  # noqa: F401 (fixtures)

AUTHORS = (SOURCE / "docs" / "authors.md").read_text()
INSTALLING = (SOURCE / "docs" / "installing.md").read_text()
NAME = "QELO.Photo.Album"


@needs_root
def test_FiveCommands_EndWithAnAnswer(stage, tmp_path):
    """As they stand in the document, where nothing but the installed files is new."""
    work = tmp_path / "work"
    work.mkdir()
    overlays = OVERLAYS.format(work=work)
    if subprocess.run(["unshare", "-m", "sh", "-c", overlays], capture_output=True).returncode != 0:
        pytest.skip("files cannot be laid over the host's here: no overlay mount")
    commands = step(AUTHORS, "five").strip().splitlines()
    assert len(commands) <= 5
    script = "\n".join([
        overlays, "{ userdel -f system; groupdel administrators; } > /dev/null 2>&1 || true",
        step(INSTALLING, "accounts"),
        f"{{\n{step(INSTALLING, 'install')}\n}} > /dev/null",
        f"mkdir {tmp_path}/empty && cd {tmp_path}/empty",
        *commands,
        f"webapi call --api {NAME} --method count --param total=1 --follow",
        f"webapi check /usr/qelo/qeloman/webapi/{NAME}.lib && echo good",
    ])
    lines = run("unshare", "-m", "bash", "-c", script, cwd=SOURCE).splitlines()
    answer, ended, good = lines[-3:]
    assert json.loads(answer)["data"] == {"greeting": "Hello, Ann"}
    assert json.loads(ended)["data"]["steps"] == {"done": 1, "total": 1}
    assert good == "good"
    assert any("100% tests passed, 0 tests failed out of 1" in line for line in lines)


@pytest.fixture(scope="module")
def project(stage, prefix, tmp_path_factory):
    """A new project, configured against the staged package."""
    directory = tmp_path_factory.mktemp("new") / "album"
    assert webapi("new", directory, NAME).returncode == 0
    run("cmake", "-S", directory, "-B", directory / "build", f"-DCMAKE_PREFIX_PATH={prefix}",
        "-DCMAKE_BUILD_TYPE=Debug")
    return directory


@pytest.fixture
def build(project, prefix):
    libraries = next(prefix.rglob("libwebapi-ARDO5.so")).parent
    environment = {**os.environ, "LD_LIBRARY_PATH": str(libraries)}

    def build(*arguments):
        return subprocess.run(["cmake", "--build", project / "build", *arguments], env=environment,
                              capture_output=True, text=True, check=False)

    return build


def test_Build_FailsWithThePlace_WhenTheDescriptionIsWrong(project, build):
    """And installs both files where calls look, when it is right."""
    description = project / f"{NAME}.lib.in"
    good = description.read_text()
    description.write_text(good.replace("grantByUser", "grantByUsr", 1).replace('"count"', '"cuont"'))
    result = build()
    assert result.returncode != 0
    told = result.stdout + result.stderr
    assert f'{NAME}.lib:15:20: error: there is no "grantByUsr" in a method; did you mean "grantByUser"?' in told
    assert 'the library\'s table has no "cuont"' in told
    description.write_text(good)
    result = build("--target", "check")
    assert result.returncode == 0, result.stdout + result.stderr
    target = project / "stage"
    run("cmake", "--install", project / "build", env={**os.environ, "DESTDIR": str(target)})
    installed = json.loads("".join(line for line in (target / f"usr/qelo/qeloman/webapi/{NAME}.lib")
                                   .read_text().splitlines() if "//" not in line))
    assert (target / installed[NAME]["lib"].lstrip("/")).exists()
    assert installed[NAME]["lib"].endswith(f"/lib/webapi/apis/{NAME}.so")


def test_Build_FailsWhenAFunctionIsMissing(project, build):
    source = project / "Methods.cpp"
    good = source.read_text()
    try:
        source.write_text(good.replace("Greeting greet(", "}  // namespace\nvoid elsewhere();\nnamespace {\nGreeting greet(")
                          .replace('  return {"Hello', '  elsewhere();\n  return {"Hello', 1))
        result = build("--target", NAME)
        assert result.returncode != 0
        assert "undefined reference" in result.stdout + result.stderr
    finally:
        source.write_text(good)
