"""Who may include whom. The folders are layers; each names only what it is built on."""

import re

import pytest

from sources import SOURCE, cpp_files, files, includes, name, run

# The JSON type with its helpers, and the mark of what is exported, belong to everybody.
COMMON = {"webapi/JsonHelper.h", "webapi/Export.h"}

PUBLIC = "include/webapi"
# Folder: folders whose headers it may name, beside its own.
ALLOWED = {
    "include/webapi": set(),
    "webapi/json": {PUBLIC},
    "webapi/platform": {PUBLIC},
    "webapi/model": {PUBLIC, "webapi/platform"},
    "webapi/runner": {PUBLIC, "webapi/json", "webapi/platform", "webapi/model"},
    "webapi/batch": {PUBLIC, "webapi/platform", "webapi/model", "webapi/runner"},
    "webapi/transfer": {PUBLIC, "webapi/platform", "webapi/model", "webapi/runner"},
    "webapi/entry": {PUBLIC, "webapi/platform", "webapi/model", "webapi/runner", "webapi/batch",
                     "webapi/transfer"},
    "platform": {"webapi/platform"},
    "programs": {PUBLIC, "webapi/platform"},
    "apis": {PUBLIC},
    "tests/plugins": {PUBLIC},
}
# A file that steps out of its layer, and why.
EXCEPTIONS = {
    ("programs/webapi-token-commands.cpp", "platform"):
        "the administrators' program for the token database, which is the embedded platform's own",
}


def folder_of(path):
    """The layer that a file belongs to."""
    parts = name(path).split("/")
    if parts[0] in ("platform", "programs", "apis"):
        return parts[0]
    return "/".join(parts[:2])


def target_of(header):
    """The layer that a header as written in an #include belongs to; None when it is not ours."""
    if header in COMMON:
        return None
    if header.startswith("webapi/"):
        if (SOURCE / "include" / header).exists():
            return PUBLIC
        assert (SOURCE / header).exists(), header
        return "/".join(header.split("/")[:2])
    if header.startswith("platform/"):
        return "platform"
    return None


def test_Includes_KeepToTheLayers():
    wrong = []
    for path in cpp_files():
        folder = folder_of(path)
        if folder not in ALLOWED:
            continue
        for number, header in includes(path):
            target = target_of(header)
            if target in (None, folder) or target in ALLOWED[folder]:
                continue
            if (name(path), target) not in EXCEPTIONS:
                wrong.append(f"{name(path)}:{number}: {folder} may not include {header}")
    assert wrong == []


def test_Exceptions_AreStillNeeded():
    needed = {
        (name(path), target_of(header))
        for path in cpp_files()
        for _, header in includes(path)
        if folder_of(path) in ALLOWED
    }
    assert set(EXCEPTIONS) - needed == set()


def test_Layers_AreTheFoldersThatThereAre():
    folders = {folder_of(path) for path in files("*.cpp", "*.h")}
    folders = {folder for folder in folders if folder.split("/")[0] not in ("tests", "bench", "fuzz")}
    assert folders - set(ALLOWED) == set()


def test_SharedLibraries_OfTheCommonRoad_IncludeNoHeavyLibrary():
    """What costs start-up time stays in loadable modules, or in the API library that is loaded for
    its own calls."""
    heavy = re.compile(r"^(openssl|curl|security)/|^sqlite3\.h$")
    wrong = [
        f"{name(path)}:{number}: {header}"
        for path in cpp_files()
        if not name(path).startswith(("platform/modules/", "apis/", "tests/", "bench/"))
        for number, header in includes(path)
        if heavy.match(header)
    ]
    assert wrong == []


@pytest.mark.parametrize("header", files("include/webapi/*.h"), ids=name)
def test_ExportedHeader_StandsAlone(header, tmp_path):
    flags = run("pkg-config", "--cflags", "jsoncpp").stdout.split()
    source = tmp_path / "alone.cpp"
    source.write_text(f"#include <webapi/{header.name}>\n#include <webapi/{header.name}>\n")
    result = run(
        "g++", "-std=c++20", "-Wall", "-Wextra", "-Wpedantic", "-Werror", "-fsyntax-only",
        f"-I{SOURCE}/include", *flags, str(source),
    )
    assert result.returncode == 0, result.stderr


def test_SeamHeaders_DeclareOnly():
    """The seam promises; it does not do."""
    assert files("webapi/platform/*.h")
    assert files("webapi/platform/*.cpp") == []
