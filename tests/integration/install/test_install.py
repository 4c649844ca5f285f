"""What is installed on a host serves, and API libraries are built against it outside of this tree."""

import ctypes
import grp
import json
import os
import re
import subprocess

import pytest

from conftest import BUILD, SOURCE, answer_of, needs_root
from documents import broken_links
from installed import OVERLAYS, prefix, run, stage, step  # noqa: F401 (fixtures)
from webserver import free_port

PLUGINS = SOURCE / "tests" / "plugins"
DESCRIPTION = """
{"QELO.Test.Good": {"lib": "./outside.so", "minVersion": 1, "maxVersion": 1, "authLevel": 0,
                    "runAs": "nobody", "methods": {"1": ["echo"]}}}
"""
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

GUIDE = (SOURCE / "docs" / "installing.md").read_text()
PROJECT_GUIDE = (SOURCE / "docs" / "api-library.md").read_text()
@pytest.fixture
def outside(tmp_path):
    """A directory with an API library's source."""
    header = (PLUGINS / "PluginTable.h").read_text().replace("#pragma once", "")
    source = (PLUGINS / "good.cpp").read_text().replace('#include "PluginTable.h"\n', "")
    (tmp_path / "outside.cpp").write_text(header + source)
    return tmp_path


def library_dir(prefix):
    return next(prefix.rglob("libwebapi-ARDO5.so")).parent


def build_with_cmake(prefix, directory):
    (directory / "CMakeLists.txt").write_text(PROJECT)
    build = directory / "build"
    run("cmake", "-S", directory, "-B", build, f"-DCMAKE_PREFIX_PATH={prefix}")
    run("cmake", "--build", build)
    return build / "outside.so"


def build_with_pkg_config(prefix, directory):
    paths = {**os.environ, "PKG_CONFIG_PATH": str(library_dir(prefix) / "pkgconfig")}
    flags = run("pkg-config", "--cflags", "--libs", "webapi-ARDO5", env=paths).split()
    library = directory / "outside.so"
    run("g++", "-std=c++20", "-fPIC", "-shared", directory / "outside.cpp", "-o", library, *flags)
    return library


def test_Install_HoldsEveryHeader(prefix):
    def headers(directory):
        return {str(path.relative_to(directory)) for path in directory.rglob("*.h")}

    names = headers(SOURCE / "include" / "webapi")
    assert {"APIRequest.h", "method/Call.h", "testing/TestHost.h"} <= names
    assert headers(prefix / "include" / "webapi") == names


def test_Install_HoldsLibraryProgramsAndDescriptions(stage, prefix):
    libraries = library_dir(prefix)
    assert os.readlink(libraries / "libwebapi-ARDO5.so") == "libwebapi-ARDO5.so.0"
    dynamic = run("readelf", "-d", libraries / "libwebapi-ARDO5.so")
    assert re.search(r"SONAME.*\[libwebapi-ARDO5\.so\.0\]", dynamic)
    assert os.access(prefix / "libexec" / "webapi" / "entry.cgi", os.X_OK)
    assert {path.name for path in (prefix / "share" / "man").rglob("*.[18]")} == {
        path.name for path in (SOURCE / "packaging" / "man").iterdir()}
    completions = prefix / "share" / "bash-completion" / "completions"
    assert {path.name for path in completions.iterdir()} == {"webapi", "webapi-exec"}
    apis = {path.name for path in (libraries / "webapi" / "apis").iterdir()}
    beside = {"QELO.Files.Archive.so", "QELO.Files.Digest.so"}  # loaded by an API's own calls
    assert apis - beside == {
        path.name + ".so" for path in (SOURCE / "apis").glob("QELO.*") if path.is_dir()}
    assert beside <= apis
    assert (stage / "etc" / "webapi" / "shares.json").read_text().count('"shares": [') == 1
    modules = {path.name for path in (libraries / "webapi" / "modules").iterdir()}
    assert {"password_pam.so", "tasks.so", "tokens.so"} <= modules
    assert "password_crypt.so" in modules  # links have passwords of their own; accounts' are PAM's
    descriptions = {path.name for path in (stage / "usr/qelo/qeloman/webapi").iterdir()}
    assert {"lib.def", "QELO.Entry.Request.lib", "QELO.Access.Session.lib"} <= descriptions


def test_InstalledDocuments_LeadToEachOther(prefix):
    documents = prefix / "share" / "doc" / "webapi-ARDO5"
    names = {str(path.relative_to(documents)) for path in documents.rglob("*") if path.is_file()}
    assert {"README.md", "docs/description.md", "apis/QELO.Host.Info/README.md"} <= names
    assert broken_links(sorted(documents.rglob("*.md"))) == []


def test_Install_BelowAnotherPrefix_IsRefusedAndWritesNothing(stage, tmp_path):
    """What is built names the configured prefix."""
    result = subprocess.run(
        ["cmake", "--install", BUILD / "host", "--prefix", tmp_path / "elsewhere"],
        env={**os.environ, "DESTDIR": str(tmp_path / "stage")},
        capture_output=True, text=True, check=False,
    )
    assert result.returncode != 0
    assert "-DCMAKE_INSTALL_PREFIX=" in result.stderr
    assert list(tmp_path.iterdir()) == []


def test_Install_MakesTheDirectoryOfTaskRecords(stage):
    """Everybody may add to it, nobody take away another's."""
    assert (stage / "var/lib/webapi/tasks").stat().st_mode & 0o7777 == 0o1733


def install_below(stage):
    return run("cmake", "--install", BUILD / "host", env={**os.environ, "DESTDIR": str(stage)})


def test_Install_Again_KeepsWhatAnAdministratorChanged(stage, tmp_path):
    install_below(tmp_path)
    descriptions = tmp_path / "usr/qelo/qeloman/webapi"
    shipped = library_dir(tmp_path / "usr/local") / "webapi" / "descriptions"
    names = {file.name for file in descriptions.iterdir()}
    assert {file.name for file in shipped.iterdir()} == names
    new = (descriptions / "lib.def").read_text()
    (descriptions / "lib.def").write_text("{}")
    removed = descriptions / "QELO.Work.Checksum.lib"
    removed.unlink()
    # As an older version shipped it, and nobody changed it.
    for folder in (descriptions, shipped):
        (folder / "QELO.Host.Info.lib").write_text('{"old": {}}')
    told = install_below(tmp_path)
    assert (descriptions / "lib.def").read_text() == "{}"
    assert (descriptions / "lib.def.new").read_text() == new
    assert str(descriptions / "lib.def.new") in told
    assert not removed.exists()
    assert "old" not in (descriptions / "QELO.Host.Info.lib").read_text()
    assert {file.name for file in descriptions.iterdir()} == names - {removed.name} | {"lib.def.new"}


@needs_root
def test_Install_SetsTheRightsOfTheCgiProgram(stage, tmp_path):
    """By the configured group; without one, what the program had stays."""
    program = tmp_path / "usr/local/libexec/webapi/entry.cgi"
    rights = lambda: (program.stat().st_gid, program.stat().st_mode & 0o7777)
    assert "-DWEBAPI_CGI_GROUP" in install_below(tmp_path)
    assert rights()[1] == 0o755
    try:
        run("cmake", "-S", SOURCE, "-B", BUILD / "host", "-DWEBAPI_CGI_GROUP=www-data")
        install_below(tmp_path)
    finally:
        run("cmake", "-S", SOURCE, "-B", BUILD / "host", "-DWEBAPI_CGI_GROUP=")
    group = grp.getgrnam("www-data").gr_gid
    assert rights() == (group, 0o4750)
    program.unlink()
    install_below(tmp_path)
    os.chown(program, 0, group)
    program.chmod(0o4750)
    os.utime(program, (0, 0))  # another one than is to be installed
    install_below(tmp_path)
    assert rights() == (group, 0o4750)


def test_Install_NamesNoPathOfTheBuild(stage):
    texts = [*stage.rglob("*.pc"), *stage.rglob("*.cmake"), *stage.rglob("*.lib")]
    assert texts
    assert [path for path in texts if str(SOURCE) in path.read_text()] == []


def test_Library_ExportsOnlyWhatIsMarked(prefix):
    symbols = run("nm", "-D", "-C", "--defined-only", library_dir(prefix) / "libwebapi-ARDO5.so")
    hidden = re.compile(r"QELO::(APIBase|APIRequestPrivate|APIResponsePrivate|UsageCounter)\b")
    assert "QELO::APIRequest::GetParam(" in symbols
    assert [line for line in symbols.splitlines() if hidden.search(line)] == []


def test_InstalledPrograms_NameTheirLibrariesByAbsolutePaths(prefix):
    """A set-user-id program may not look for its libraries in relative places."""
    programs = [*(prefix / "libexec" / "webapi").iterdir(), *(prefix / "sbin").iterdir()]
    for program in programs:
        runpath = re.findall(r"RUNPATH.*\[(.*)\]", run("readelf", "-d", program))
        assert all(path.startswith("/") for paths in runpath for path in paths.split(":"))


def test_Install_IsHardened(prefix):
    """On the host, where the program has root's rights, without being asked to."""
    libraries = library_dir(prefix)
    files = [prefix / "libexec/webapi/entry.cgi", libraries / "libwebapi-ARDO5.so",
             *libraries.glob("webapi/*/*.so")]
    assert len(files) > 5
    for file in files:
        assert re.search(r"\bNOW\b", run("readelf", "-d", file)), file
        assert "GNU_RELRO" in run("readelf", "-l", file), file
    assert "__stack_chk_fail" in run("nm", "-D", libraries / "libwebapi-ARDO5.so")
    flags = (BUILD / "host" / "CMakeCache.txt").read_text()
    assert "WEBAPI_HARDENED:BOOL=ON" in flags


@pytest.mark.parametrize("build", [build_with_cmake, build_with_pkg_config])
def test_ApiLibrary_BuiltOutside_HasItsTable(prefix, outside, build):
    library = build(prefix, outside)
    ctypes.CDLL(str(library_dir(prefix) / "libwebapi-ARDO5.so.0"), mode=ctypes.RTLD_GLOBAL)
    function = ctypes.CDLL(str(library)).GetAPITable
    function.restype = ctypes.POINTER(ctypes.c_char_p)
    assert function()[0] == b"QELO.Test.Good"


@needs_root
def test_InstalledEntry_ServesAnApiLibraryBuiltOutside(stage, prefix, outside):
    """In a mount namespace of its own, where the installed files stand in their places."""
    descriptions = stage / "usr/qelo/qeloman/webapi"
    library = build_with_cmake(prefix, outside)
    (descriptions / "outside.so").write_bytes(library.read_bytes())
    (descriptions / "QELO.Test.Good.lib").write_text(DESCRIPTION)
    mount = f"mount -t overlay overlay -o lowerdir={stage}/usr:/usr /usr"
    if subprocess.run(["unshare", "-m", "sh", "-c", mount], capture_output=True).returncode != 0:
        pytest.skip("files cannot be laid over the host's here: no overlay mount")
    query = "api=QELO.Test.Good&version=1&method=echo&x=5"
    result = subprocess.run(
        ["unshare", "-m", "sh", "-c", f"{mount} && exec /usr/local/libexec/webapi/entry.cgi"],
        env={"REQUEST_METHOD": "GET", "QUERY_STRING": query, "REMOTE_ADDR": "127.0.0.1",
             "PATH": os.environ["PATH"]},
        stdin=subprocess.DEVNULL,
        capture_output=True,
        check=True,
    )
    assert answer_of(result.stdout)["data"]["x"] == 5


@pytest.fixture
def project(tmp_path):
    """The guide's project of an API library outside of this tree."""
    directory = tmp_path / "visits"
    directory.mkdir()
    (directory / "CMakeLists.txt").write_text(step(PROJECT_GUIDE, "project"))
    (directory / "QELO.Example.Visits.lib.in").write_text(step(PROJECT_GUIDE, "description"))
    (directory / "Visits.cpp").write_text(step(PROJECT_GUIDE, "library"))
    return directory


def as_tina(text, port):
    text = text.replace("127.0.0.1/", f"127.0.0.1:{port}/")
    return text.replace("NAME", "tina").replace("PASSWORD", "one 2 three")


@needs_root
def test_Guides_EndWithALogin_AndCallsOfAnApiOfOnesOwn(stage, tmp_path, project):
    """Their commands as they stand, by accounts of the host and PAM, the program set-user-id."""
    work = tmp_path / "work"
    work.mkdir()
    overlays = OVERLAYS.format(work=work)
    if subprocess.run(["unshare", "-m", "sh", "-c", overlays], capture_output=True).returncode != 0:
        pytest.skip("files cannot be laid over the host's here: no overlay mount")
    port = free_port()
    configuration = step(GUIDE, "lighttpd").replace("server.port = 80", f"server.port = {port}")
    script = "\n".join([
        overlays,
        "{",
        "{ userdel -f tina; userdel -f system; groupdel administrators; } 2> /dev/null || true",
        "useradd --create-home --home-dir /var/tina tina && echo 'tina:one 2 three' | chpasswd",
        step(GUIDE, "accounts"), step(GUIDE, "install"), step(GUIDE, "pam"), step(GUIDE, "rights"),
        f"cd {project}", step(PROJECT_GUIDE, "build"),
        "mkdir -p /var/www/html /var/log/lighttpd /var/cache/lighttpd/uploads",
        "chown -R www-data: /var/log/lighttpd /var/cache/lighttpd",
        f"cat > /etc/lighttpd/lighttpd.conf << 'END'\n{configuration}END",
        "} > /dev/null",
        "/usr/sbin/lighttpd -D -f /etc/lighttpd/lighttpd.conf & server=$!",
        "trap 'kill $server' EXIT",
        f"for i in $(seq 100); do (: > /dev/tcp/127.0.0.1/{port}) 2> /dev/null && break",
        "  sleep 0.05; done",
        as_tina(step(GUIDE, "call"), port),
        as_tina(step(PROJECT_GUIDE, "call"), port),
        as_tina(step(PROJECT_GUIDE, "call"), port),
        "stat -c '%U %a' /var/tina/.webapi /var/tina/.webapi/visits.json",
        # A host as the guide makes it lacks nothing, but perhaps a log, as a container does.
        "webapi doctor > doctor.txt || true; grep -v -e /dev/log -e ^note doctor.txt | grep ^wrong || grep -c ^ok doctor.txt",
    ])
    lines = run("unshare", "-m", "bash", "-c", script, cwd=SOURCE).splitlines()
    login, first, second = map(json.loads, lines[:3])
    assert login["data"]["user"] == "tina"
    assert (first["data"], second["data"]) == ({"visits": 1}, {"visits": 2})
    assert lines[3:5] == ["tina 700", "tina 600"]
    assert int(lines[5]) > 15, lines[5:]
