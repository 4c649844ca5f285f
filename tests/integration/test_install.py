"""What is installed serves API libraries that are built outside of this project."""

import os
import re
import subprocess

import pytest

from conftest import BUILD, SOURCE, answer_of, run_entry

PLUGIN = SOURCE / "tests" / "plugins" / "good.cpp"

PROJECT = """
cmake_minimum_required(VERSION 3.25)
project(outside LANGUAGES CXX)
set(CMAKE_CXX_STANDARD 20)
find_package(webapi REQUIRED)
add_library(outside MODULE outside.cpp)
set_target_properties(outside PROPERTIES PREFIX "")
target_link_libraries(outside PRIVATE webapi::webapi)
target_link_options(outside PRIVATE -Wl,--no-undefined)
"""


def run(*command, **options):
    result = subprocess.run(
        [str(word) for word in command], capture_output=True, text=True, check=False, **options
    )
    assert result.returncode == 0, result.stdout + result.stderr
    return result.stdout


@pytest.fixture(scope="module")
def stage(root, tmp_path_factory):
    """The directory that stands for the root of the installed system."""
    stage = tmp_path_factory.mktemp("stage")
    run("cmake", "--install", BUILD, env={**os.environ, "DESTDIR": str(stage)})
    return stage


@pytest.fixture(scope="module")
def prefix(stage):
    return stage / "usr" / "local"


@pytest.fixture
def outside(tmp_path):
    """A directory with an API library's source, table header included."""
    source = PLUGIN.read_text().replace('#include "PluginTable.h"\n', "")
    (tmp_path / "outside.cpp").write_text(
        (PLUGIN.parent / "PluginTable.h").read_text().replace("#pragma once", "") + source
    )
    return tmp_path


def library_dir(prefix):
    return next(prefix.rglob("libwebapi-ARDO5.so")).parent


def check_it_serves(library, describe):
    describe("QELO.Test.Good", methods={"1": ["echo"]}, lib=str(library))
    library.chmod(0o755)
    answer = answer_of(run_entry("api=QELO.Test.Good&version=1&method=echo&x=5"))
    assert answer["data"]["x"] == 5


def test_Install_HoldsEveryHeader(prefix):
    names = {path.name for path in (SOURCE / "include" / "webapi").glob("*.h")}
    assert names
    assert {path.name for path in (prefix / "include" / "webapi").glob("*.h")} == names


def test_Install_HoldsLibraryProgramsAndDescriptions(stage, prefix):
    libraries = library_dir(prefix)
    assert os.readlink(libraries / "libwebapi-ARDO5.so") == "libwebapi-ARDO5.so.0"
    dynamic = run("readelf", "-d", libraries / "libwebapi-ARDO5.so")
    assert re.search(r"SONAME.*\[libwebapi-ARDO5\.so\.0\]", dynamic)
    assert os.access(prefix / "libexec" / "webapi" / "entry.cgi", os.X_OK)
    apis = {path.name for path in (libraries / "webapi" / "apis").iterdir()}
    assert apis == {f"QELO.{name}.so" for name in ("Access.Session", "Catalog.API", "Host.Info")}
    descriptions = {path.name for path in stage.rglob("qeloman/webapi/*")}
    assert {"lib.def", "QELO.Entry.Request.lib", "QELO.Access.Session.lib"} <= descriptions
    assert (libraries / "webapi" / "modules").is_dir()
    assert next(prefix.rglob("QELO.Host.Info.md"))


def test_Library_ExportsOnlyWhatIsMarked(prefix):
    symbols = run("nm", "-D", "-C", "--defined-only", library_dir(prefix) / "libwebapi-ARDO5.so")
    hidden = re.compile(r"QELO::(APIBase|APIRequestPrivate|APIResponsePrivate|UsageCounter)\b")
    assert "QELO::APIRequest::GetParam(" in symbols
    assert [line for line in symbols.splitlines() if hidden.search(line)] == []


def test_FindPackage_BuildsAnApiLibraryThatServes(prefix, outside, describe):
    (outside / "CMakeLists.txt").write_text(PROJECT)
    build = outside / "build"
    run("cmake", "-S", outside, "-B", build, f"-DCMAKE_PREFIX_PATH={prefix}")
    run("cmake", "--build", build)
    check_it_serves(build / "outside.so", describe)


def test_PkgConfig_BuildsAnApiLibraryThatServes(prefix, outside, describe):
    directory = library_dir(prefix) / "pkgconfig"
    paths = {**os.environ, "PKG_CONFIG_PATH": str(directory)}
    flags = run("pkg-config", "--cflags", "--libs", "webapi-ARDO5", env=paths).split()
    library = outside / "outside.so"
    run("g++", "-std=c++20", "-fPIC", "-shared", outside / "outside.cpp", "-o", library, *flags)
    check_it_serves(library, describe)


def test_InstalledPrograms_NameTheirLibrariesByAbsolutePaths(prefix):
    """A set-user-id program may not look for its libraries in relative places."""
    for program in (prefix / "libexec" / "webapi").iterdir():
        runpath = re.findall(r"RUNPATH.*\[(.*)\]", run("readelf", "-d", program))
        assert all(path.startswith("/") for paths in runpath for path in paths.split(":"))
